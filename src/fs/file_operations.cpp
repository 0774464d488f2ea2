#include "fs/file_operations.h"

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstddef>
#include <optional>
#include <utility>

#include "fs/device.h"

namespace {

// Nothing, with errno set, where `path` is no link.
std::optional<std::string> find_target(const std::string& path) {
  constexpr std::size_t longest_target = 1024;
  std::array<char, longest_target> target{};
  const ssize_t length = device::readlink(path.c_str(), target.data(), target.size());
  if (length < 0) return {};
  return std::string(target.data(), static_cast<std::size_t>(length));
}

}  // namespace

namespace fs {

bool exists(const std::string& path) { return device::access(path.c_str()) == 0; }

void remove(const std::string& path) {
  if (device::unlink(path.c_str()) == 0 || errno == ENOENT) return;
  device::warn("remove: could not remove %s", path.c_str());
  throw errno;
}

std::string read_symlink(const std::string& path) {
  if (auto target = find_target(path)) return *std::move(target);
  if (errno == ENOENT) return {};
  device::warn("read_symlink: %s", path.c_str());
  throw errno;
}

void create_symlink(const std::string& target, const std::string& link_path) {
  if (device::symlink(target.c_str(), link_path.c_str()) == 0) return;
  device::warn("create_symlink: from %s to %s", link_path.c_str(), target.c_str());
  throw errno;
}

std::string peek_symlink(const std::string& path) { return find_target(path).value_or(""); }

std::string get_spare_path(const std::string& link_path) { return link_path + ".boot"; }

bool replace_symlink(const std::string& target, const std::string& link_path) {
  const std::string spare = get_spare_path(link_path);
  device::remove(spare.c_str());
  if (device::symlink(target.c_str(), spare.c_str()) == 0 &&
      device::rename(spare.c_str(), link_path.c_str()) == 0)
    return true;
  const int error = errno;
  device::remove(spare.c_str());
  errno = error;
  return false;
}

std::string take_name(std::string& path) {
  path.erase(0, path.find_first_not_of('/'));
  std::string name = path.substr(0, path.find('/'));
  path.erase(0, name.size());
  return name;
}

std::string simplify_path(const std::string& path, bool follows) {
  constexpr int most_links = 40;  // that the kernel follows on the way to one entry
  std::string place;
  std::string rest = path;
  int links = 0;
  for (std::string name = take_name(rest); !name.empty(); name = take_name(rest)) {
    if (name == ".") continue;
    if (name == "..") {
      place.erase(std::min(place.rfind('/'), place.size()));
      continue;
    }
    const bool is_open = follows && links < most_links;
    const std::string parent = place;
    place.append("/").append(name);
    const std::string target = is_open ? peek_symlink(place) : "";
    if (!target.empty()) {
      ++links;
      rest.insert(0, target + '/');
      place = target.starts_with('/') ? "" : parent;
    }
  }
  return place;
}

}  // namespace fs
