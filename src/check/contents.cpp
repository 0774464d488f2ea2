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
    add_directory({root_}, "");
    while (!directories_.empty()) {
      const found_directory next = directories_.back();
      directories_.pop_back();
      list_directory(next);
    }
    std::sort(files_.begin(), files_.end());
    return files_;
  }

 private:
  struct found_directory {
    std::vector<path> way;  // its real path, after those of the directories above
    path name;              // the path from the root, by which it was found
  };

  void list_directory(const found_directory& listed) {
    std::error_code error;
    for (const auto& entry : filesystem::directory_iterator(listed.way.back(), error)) {
      constexpr int most_entries = 100'000;
      if (++entries_ > most_entries) throw std::invalid_argument("there are too many files");
      add(listed.way, entry.path(), listed.name / entry.path().filename());
    }
    if (error && is_open(listed.way.back()))
      throw filesystem::filesystem_error("cannot be listed", listed.way.back(), error);
  }

  void add(std::vector<path> way, const path& place, const path& name) {
    const filesystem::file_status status = filesystem::symlink_status(place);
    if (filesystem::is_directory(status)) {
      way.push_back(place);
      add_directory(way, name);
    } else if (filesystem::is_symlink(status)) {
      add_link(way, place, name);
    } else if (filesystem::is_regular_file(status)) {
      if (!may_everybody(perms::others_read, place)) refuse(name, "may not be read by everybody");
      files_.push_back(name);
    } else {
      refuse(name, "is no file, directory or link");
    }
  }

  void add_directory(const std::vector<path>& way, const path& name) {
    if (!is_open(way.back())) refuse(name, "may not be listed by everybody");
    directories_.push_back({way, name});
  }

  void add_link(std::vector<path> way, const path& place, const path& name) {
    std::error_code error;
    const path target = filesystem::canonical(place, error);
    if (error || !is_within(target, root_)) {
      if (name.filename() != "localtime")
        refuse(name, error ? "is a link that leads nowhere" : "is a link that leads elsewhere");
    } else if (filesystem::is_regular_file(target)) {
      files_.push_back(name);
    } else if (filesystem::is_directory(target) &&
               std::find(way.begin(), way.end(), target) == way.end()) {
      // One that leads up again has nothing new.
      way.push_back(target);
      add_directory(way, name);
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
  std::vector<found_directory> directories_;
  std::vector<std::string> files_;
  int entries_ = 0;
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
