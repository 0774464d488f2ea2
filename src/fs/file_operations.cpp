#include "fs/file_operations.h"

#include <array>
#include <cerrno>
#include <cstddef>

#include "fs/device.h"

namespace fs {

bool exists(const std::string& path) { return device::access(path.c_str()) == 0; }

void remove(const std::string& path) {
  if (device::unlink(path.c_str()) == 0 || errno == ENOENT) return;
  device::warn("remove: could not remove %s", path.c_str());
  throw errno;
}

std::string read_symlink(const std::string& path) {
  constexpr std::size_t longest_target = 1024;
  std::array<char, longest_target> target{};
  const ssize_t length = device::readlink(path.c_str(), target.data(), target.size());
  if (length >= 0) return {target.data(), static_cast<std::size_t>(length)};
  if (errno == ENOENT) return {};
  device::warn("read_symlink: %s", path.c_str());
  throw errno;
}

void create_symlink(const std::string& target, const std::string& link_path) {
  if (device::symlink(target.c_str(), link_path.c_str()) == 0) return;
  device::warn("create_symlink: from %s to %s", link_path.c_str(), target.c_str());
  throw errno;
}

}  // namespace fs
