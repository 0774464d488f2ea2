#include "update/steps.h"

#include <fcntl.h>

#include "fs/file_operations.h"
#include "update/failure.h"

namespace {

constexpr int directory_flags = O_RDONLY | O_DIRECTORY;

olm_descriptor open_no_link(int directory, const std::string& name, int flags,
                            const std::string& path) {
  constexpr mode_t readable = 0644;
  constexpr int always = O_NOFOLLOW | O_NONBLOCK | O_NOCTTY | O_CLOEXEC;
  const int opened = openat(directory, name.c_str(), flags | always, readable);
  if (opened == -1) fail(path);
  return olm_descriptor(opened);
}

}  // namespace

olm_directory open_top(const std::string& path) {
  return {open_no_link(AT_FDCWD, path, directory_flags, path), path};
}

olm_descriptor open_entry(const olm_directory& directory, const std::string& name, int flags) {
  return open_no_link(directory.opened.get(), name, flags, directory.path + '/' + name);
}

olm_directory open_steps(const olm_directory& top, const std::string& path) {
  olm_directory reached = {open_no_link(top.opened.get(), ".", directory_flags, top.path),
                           top.path};
  std::string rest = path;
  for (std::string name = fs::take_name(rest); !name.empty(); name = fs::take_name(rest)) {
    reached.opened = open_entry(reached, name, directory_flags);
    reached.path += '/' + name;
  }
  return reached;
}

std::string get_directory(const std::string& name) {
  const std::size_t slash = name.rfind('/');
  return slash == std::string::npos ? "" : name.substr(0, slash);
}

std::string get_name(const std::string& path) { return path.substr(path.rfind('/') + 1); }
