#include "update/steps.h"

#include <fcntl.h>

#include "fs/file_operations.h"
#include "update/failure.h"

olm_descriptor open_entry(int directory, const std::string& name, int flags) {
  constexpr mode_t readable = 0644;
  constexpr int always = O_NOFOLLOW | O_NONBLOCK | O_NOCTTY | O_CLOEXEC;
  const int opened = openat(directory, name.c_str(), flags | always, readable);
  if (opened == -1) fail(name);
  return olm_descriptor(opened);
}

std::unique_ptr<olm_descriptor> open_steps(int directory, const std::string& path) {
  constexpr int flags = O_RDONLY | O_DIRECTORY;
  auto opened = std::make_unique<olm_descriptor>(open_entry(directory, ".", flags).release());
  std::string rest = path;
  for (std::string name = fs::take_name(rest); !name.empty(); name = fs::take_name(rest))
    opened = std::make_unique<olm_descriptor>(open_entry(opened->get(), name, flags).release());
  return opened;
}

std::string get_directory(const std::string& name) {
  const std::size_t slash = name.rfind('/');
  return slash == std::string::npos ? "" : name.substr(0, slash);
}

std::string get_name(const std::string& path) { return path.substr(path.rfind('/') + 1); }
