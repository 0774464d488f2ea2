#include "check/icu_bundle.h"

#include <unicode/timezone.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <stdexcept>

void set_icu_directory(const std::string& directory) {
  if (chdir(directory.c_str()) != 0 || setenv("ICU_TIMEZONE_FILES_DIR", ".", 1) != 0)
    throw std::runtime_error(directory + ": " + std::strerror(errno));
}

bool has_read(const std::string& file) {
  std::string path = std::filesystem::canonical(file);
  for (std::size_t at = 0; (at = path.find('\n', at)) != std::string::npos;)
    path.replace(at, 1, "\\012");
  std::ifstream maps("/proc/self/maps");
  if (!maps) throw std::runtime_error("/proc/self/maps cannot be read");
  for (std::string line; std::getline(maps, line);)
    if (line.ends_with(' ' + path)) return true;
  return false;
}

std::string get_icu_version() {
  UErrorCode status = U_ZERO_ERROR;
  const char* const version = icu::TimeZone::getTZDataVersion(status);
  return U_FAILURE(status) != 0 ? "" : version;
}

bundle open_bundle(const std::string& name) {
  UErrorCode status = U_ZERO_ERROR;
  bundle opened(ures_openDirect(nullptr, name.c_str(), &status), &ures_close);
  if (U_FAILURE(status) != 0) opened.reset();
  return opened;
}

std::vector<bundle> list_inner(UResourceBundle* resource) {
  std::vector<bundle> found;
  const std::int32_t size = ures_getSize(resource);
  for (std::int32_t i = 0; i < size; ++i) {
    UErrorCode status = U_ZERO_ERROR;
    found.emplace_back(ures_getByIndex(resource, i, nullptr, &status), &ures_close);
    if (U_FAILURE(status) != 0) found.back().reset();
  }
  return found;
}
