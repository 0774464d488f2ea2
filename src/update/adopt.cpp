#include "update/adopt.h"

#include <dirent.h>
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <array>
#include <climits>
#include <map>
#include <memory>
#include <utility>
#include <vector>

#include "fs/olm_descriptor.h"
#include "update/failure.h"
#include "update/olm_contents.h"
#include "update/steps.h"

namespace {

using std::string;
using kind = update_entry::kind;

struct directory_closer {
  void operator()(DIR* directory) const { closedir(directory); }
};

void protect(const olm_descriptor& opened, mode_t mode, const string& path) {
  if (fchown(opened.get(), 0, 0) != 0 || fchmod(opened.get(), mode) != 0) fail(path);
}

string read_target(int directory, const string& name, const string& path) {
  std::array<char, PATH_MAX> target{};
  const ssize_t length = readlinkat(directory, name.c_str(), target.data(), target.size());
  if (length < 0) fail(path);
  return {target.data(), static_cast<std::size_t>(length)};
}

std::vector<string> list_names(const olm_directory& directory) {
  const int listed = open_entry(directory, ".", O_RDONLY | O_DIRECTORY).release();
  const std::unique_ptr<DIR, directory_closer> names(fdopendir(listed));
  if (!names) fail(directory.path);
  const auto read_next = [&] {
    errno = 0;
    return readdir(names.get());
  };
  std::vector<string> found;
  for (const dirent* next = read_next(); next != nullptr; next = read_next()) {
    const string name = &next->d_name[0];
    if (name != "." && name != "..") found.push_back(name);
  }
  if (errno != 0) fail(directory.path);
  return found;
}

// The files of an update, by what they are on the disk.
struct update_file {
  nlink_t names = 0;          // in all directories
  bool is_ready = false;      // its owner and mode need no change
  std::vector<string> paths;  // in the update
};
using update_files = std::map<std::pair<dev_t, ino_t>, update_file>;

constexpr mode_t all_bits = 07777;
constexpr mode_t readable = 0644;

// Gives what the entry `name` is, whose path in the update is `path`. A file is noted in `files`.
update_entry adopt_entry(const olm_directory& directory, const string& name, const string& path,
                         update_files& files) {
  const int opened = directory.opened.get();
  const string whole_path = directory.path + '/' + name;
  struct stat status {};
  if (fstatat(opened, name.c_str(), &status, AT_SYMLINK_NOFOLLOW) != 0) fail(whole_path);
  if (S_ISDIR(status.st_mode)) return {.type = kind::directory};
  if (S_ISREG(status.st_mode)) {
    update_file& file = files[{status.st_dev, status.st_ino}];
    file.names = status.st_nlink;
    file.is_ready =
        status.st_uid == 0 && status.st_gid == 0 && (status.st_mode & all_bits) == readable;
    file.paths.push_back(path);
    return {.type = kind::file};
  }
  if (!S_ISLNK(status.st_mode)) throw olm_refusal({path + " is no file, directory or link"});
  if (fchownat(opened, name.c_str(), 0, 0, AT_SYMLINK_NOFOLLOW) != 0) fail(whole_path);
  return {.type = kind::symbolic_link, .target = read_target(opened, name, whole_path)};
}

// Some programs link what did not change to the update before. But no file that stands elsewhere is
// changed.
void adopt_files(const olm_directory& top, const update_files& files) {
  for (const auto& [id, file] : files) {
    if (file.is_ready) continue;
    const string& path = file.paths.front();
    if (file.names != file.paths.size())
      throw olm_refusal({path + " has another name outside the update"});
    const olm_directory directory = open_steps(top, get_directory(path));
    protect(open_entry(directory, get_name(path), O_RDONLY), readable, top.path + '/' + path);
  }
}

}  // namespace

void adopt(const string& update) {
  constexpr mode_t open_to_all = 0755;
  const olm_directory top = open_top(update);
  olm_contents contents;
  update_files files;
  // Each directory is protected before anything in it is looked at, so that nobody else can change
  // that meanwhile.
  std::vector<string> directories = {""};
  while (!directories.empty()) {
    const string path = directories.back();
    directories.pop_back();
    const olm_directory directory = open_steps(top, path);
    protect(directory.opened, open_to_all, directory.path);
    const string prefix = path.empty() ? path : path + '/';
    for (const string& name : list_names(directory)) {
      const string entry_path = prefix + name;
      const update_entry entry = adopt_entry(directory, name, entry_path, files);
      contents.add(entry_path, entry);
      if (entry.type == kind::directory) directories.push_back(entry_path);
    }
  }
  contents.require_whole();
  adopt_files(top, files);
}
