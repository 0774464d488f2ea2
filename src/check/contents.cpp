#include "check/contents.h"

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <fstream>
#include <iterator>
#include <stdexcept>
#include <utility>

namespace {

namespace filesystem = std::filesystem;
using filesystem::path;
using filesystem::perms;

bool may_everybody(perms wanted, const path& path) {
  return (filesystem::status(path).permissions() & wanted) == wanted;
}

bool is_within(const path& inner, const path& outer) {
  return std::mismatch(outer.begin(), outer.end(), inner.begin(), inner.end()).first == outer.end();
}

class olm_listing {
 public:
  olm_listing(const path& directory, const listener& add_reason)
      : root_(filesystem::canonical(directory)), add_reason_(add_reason) {}

  std::vector<std::string> list() {
    add_directory(root_, "");
    while (!directories_.empty()) {
      const auto [directory, name] = directories_.back();
      directories_.pop_back();
      list_directory(directory, name);
    }
    std::sort(files_.begin(), files_.end());
    return files_;
  }

 private:
  void list_directory(const path& directory, const path& name) {
    std::error_code error;
    for (const auto& entry : filesystem::directory_iterator(directory, error))
      add(entry.path(), name / entry.path().filename());
    if (error && is_open(directory))
      throw filesystem::filesystem_error("cannot be listed", directory, error);
  }

  // `name` is the path from the root, by which it was found.
  void add(const path& place, const path& name) {
    const filesystem::file_status status = filesystem::symlink_status(place);
    if (filesystem::is_directory(status)) {
      add_directory(place, name);
    } else if (filesystem::is_symlink(status)) {
      add_link(place, name);
    } else if (filesystem::is_regular_file(status)) {
      if (!may_everybody(perms::others_read, place)) refuse(name, "may not be read by everybody");
      files_.push_back(name);
    } else {
      refuse(name, "is no file, directory or link");
    }
  }

  void add_directory(const path& place, const path& name) {
    constexpr auto most_names = 16;
    if (!is_open(place)) refuse(name, "may not be listed by everybody");
    if (std::distance(name.begin(), name.end()) > most_names) {
      refuse(name, "is too far below");
    } else {
      directories_.emplace_back(place, name);
    }
  }

  void add_link(const path& place, const path& name) {
    std::error_code error;
    const path target = filesystem::canonical(place, error);
    if (error || !is_within(target, root_)) {
      if (name.filename() != "localtime")
        refuse(name, error ? "is a link that leads nowhere" : "is a link that leads elsewhere");
    } else if (!filesystem::is_directory(target)) {
      files_.push_back(name);
    } else if (!is_within(place, target)) {  // one that leads up has nothing new
      add_directory(target, name);
    }
  }

  static bool is_open(const path& directory) {
    return may_everybody(perms::others_read | perms::others_exec, directory);
  }

  void refuse(const path& name, const char* reason) const {
    add_reason_((name.empty() ? root_ : name).string() + ' ' + reason);
  }

  path root_;
  const listener& add_reason_;
  std::vector<std::pair<path, path>> directories_;  // their places and names
  std::vector<std::string> files_;
};

}  // namespace

std::vector<std::string> list_contents(const path& directory, const listener& add_reason) {
  return olm_listing(directory, add_reason).list();
}

std::optional<std::string> read_file(const path& path) {
  constexpr std::uintmax_t most_bytes = std::uintmax_t{1} << 24;
  const auto size = filesystem::file_size(path);
  if (size > most_bytes)
    throw std::invalid_argument("is " + std::to_string(size) + " bytes long, which is too much");
  std::ifstream file(path, std::ios::binary);
  if (!file) {
    if (!may_everybody(perms::others_read, path)) return {};
    throw std::runtime_error(path.string() + " cannot be read: " + std::strerror(errno));
  }
  return std::string(std::istreambuf_iterator<char>(file), {});
}
