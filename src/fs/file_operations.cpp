#include "fs/file_operations.h"

#include <err.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <cstddef>

namespace fs {

bool exists(const std::string& path) { return access(path.c_str(), F_OK) == 0; }

void remove(const std::string& path) {
  if (unlink(path.c_str()) == 0 || errno == ENOENT) return;
  warn("remove: could not remove %s", path.c_str());
  throw errno;
}

std::string read_symlink(const std::string& path) {
  constexpr std::size_t longest_target = 1024;
  std::array<char, longest_target> target{};
  const ssize_t length = readlink(path.c_str(), target.data(), target.size());
  if (length >= 0) return {target.data(), static_cast<std::size_t>(length)};
  if (errno == ENOENT) return {};
  warn("read_symlink: %s", path.c_str());
  throw errno;
}

void create_symlink(const std::string& target, const std::string& link_path) {
  if (symlink(target.c_str(), link_path.c_str()) == 0) return;
  warn("create_symlink: from %s to %s", link_path.c_str(), target.c_str());
  throw errno;
}

}  // namespace fs
