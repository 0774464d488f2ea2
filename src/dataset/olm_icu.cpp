#include "dataset/olm_icu.h"

#include <sys/stat.h>

#include <cerrno>
#include <cstring>
#include <regex>

#include "dataset/pattern.h"
#include "fs/device.h"
#include "fs/file_operations.h"

namespace {

// The schema in the name of the first ICU data file in `directory` that others may read, or
// nothing. Prints and throws errno when the walk cannot be started.
std::string find_schema(const std::string& directory) {
  std::string schema;
  const bool is_walked = device::walk(directory, [&](const char* name, mode_t mode) {
    if ((mode & S_IROTH) != 0) schema = read_schema(name);
    return !schema.empty();
  });
  if (is_walked) return schema;
  device::warn("tz_icu::initialize: fts_open of %s failed, %s", directory.c_str(),
               std::strerror(errno));
  throw errno;
}

}  // namespace

std::string read_schema(const char* name) {
  static const olm_pattern pattern = compile_pattern(R"(icutz([0-9]+[lbe])\.dat)");
  std::cmatch match;
  return std::regex_match(name, match, pattern) ? match[1] : std::string();
}

bool is_schema(const std::string& text) {
  return read_schema(("icutz" + text + ".dat").c_str()) == text;
}

olm_icu::olm_icu() : olm_icu(std::string()) {}

olm_icu::olm_icu(const std::string& path)
    : olm_dataset_component(path),
      directory(path.empty() ? system_icu_directory : path + update_icu_directory) {
  initialize();
}

void olm_icu::initialize() {
  if (dataset_path.empty()) {
    schema = device::read_first_word(directory + schema_file);
    return;
  }
  schema = find_schema(directory);
  if (schema.empty()) device::warn("No ICU schema found for %s", dataset_path.c_str());
}

bool olm_icu::compatible_schema(const olm_dataset_component& other) const {
  const auto* other_icu = dynamic_cast<const olm_icu*>(&other);
  if (other_icu == nullptr) {
    device::warn("olm_icu::compatible_schema: could not dynamic_cast other component");
    return false;
  }
  return schema == other_icu->schema;
}

void olm_icu::install_link() const {
  try {
    fs::remove(icutz_link);
    fs::remove(legacy_icutz_link);
  } catch (...) {
    device::warn("unlink of ICU softlink failed");
  }
  if (!dataset_path.empty()) fs::create_symlink(directory, icutz_link);
}
