#include "update/adopt.h"

#include <dirent.h>
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <array>
#include <climits>
#include <memory>
#include <vector>

#include "fs/olm_descriptor.h"
#include "update/failure.h"
#include "update/steps.h"

namespace {

using std::string;
using kind = update_entry::kind;

struct directory_closer {
  void operator()(DIR* directory) const { closedir(directory); }
};

// `path` is for messages.
void protect(const olm_descriptor& opened, mode_t mode, const string& path) {
  if (fchown(opened.get(), 0, 0) != 0 || fchmod(opened.get(), mode) != 0) fail(path);
}

string read_target(int directory, const string& name, const string& path) {
  std::array<char, PATH_MAX> target{};
  const ssize_t length = readlinkat(directory, name.c_str(), target.data(), target.size());
  if (length < 0) fail(path);
  return {target.data(), static_cast<std::size_t>(length)};
}

std::vector<string> list_names(const olm_descriptor& directory, const string& path) {
  const int listed = open_entry(directory.get(), ".", O_RDONLY | O_DIRECTORY).release();
  const std::unique_ptr<DIR, directory_closer> names(fdopendir(listed));
  if (!names) fail(path);
  const auto read_next = [&] {
    errno = 0;
    return readdir(names.get());
  };
  std::vector<string> found;
  for (const dirent* next = read_next(); next != nullptr; next = read_next()) {
    const string name = &next->d_name[0];
    if (name != "." && name != "..") found.push_back(name);
  }
  if (errno != 0) fail(path);
  return found;
}

// Gives what it is.
update_entry adopt_entry(int directory, const string& name, const string& path) {
  constexpr mode_t readable = 0644;
  struct stat status {};
  if (fstatat(directory, name.c_str(), &status, AT_SYMLINK_NOFOLLOW) != 0) fail(path);
  if (S_ISDIR(status.st_mode)) return {.type = kind::directory};
  if (S_ISREG(status.st_mode)) {
    protect(open_entry(directory, name, O_RDONLY), readable, path);
    return {.type = kind::file};
  }
  if (!S_ISLNK(status.st_mode)) throw olm_refusal({path + " is no file, directory or link"});
  if (fchownat(directory, name.c_str(), 0, 0, AT_SYMLINK_NOFOLLOW) != 0) fail(path);
  return {.type = kind::symbolic_link, .target = read_target(directory, name, path)};
}

}  // namespace

olm_contents adopt(const string& update) {
  constexpr mode_t open_to_all = 0755;
  const olm_descriptor root = open_entry(AT_FDCWD, update, O_RDONLY | O_DIRECTORY);
  olm_contents contents;
  // Each directory is protected before anything in it is looked at, so that nobody else can change
  // that meanwhile.
  std::vector<string> directories = {""};
  while (!directories.empty()) {
    const string path = directories.back();
    directories.pop_back();
    const auto directory = open_steps(root.get(), path);
    protect(*directory, open_to_all, path);
    const string prefix = path.empty() ? path : path + '/';
    for (const string& name : list_names(*directory, path)) {
      const string entry_path = prefix + name;
      const update_entry entry = adopt_entry(directory->get(), name, entry_path);
      contents.add(entry_path, entry);
      if (entry.type == kind::directory) directories.push_back(entry_path);
    }
  }
  contents.require_whole();
  return contents;
}
