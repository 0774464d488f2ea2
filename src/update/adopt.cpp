#include "update/adopt.h"

#include <dirent.h>
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <array>
#include <climits>
#include <memory>

#include "fs/olm_descriptor.h"
#include "update/failure.h"

namespace {

using std::string;
using kind = update_entry::kind;

struct directory_closer {
  void operator()(DIR* directory) const { closedir(directory); }
};

// `path` is for messages.
void protect(int descriptor, mode_t mode, const string& path) {
  if (fchown(descriptor, 0, 0) != 0 || fchmod(descriptor, mode) != 0) fail(path);
}

string read_target(int directory, const char* name, const string& path) {
  std::array<char, PATH_MAX> target{};
  const ssize_t length = readlinkat(directory, name, target.data(), target.size());
  if (length < 0) fail(path);
  return {target.data(), static_cast<std::size_t>(length)};
}

// Each directory is protected before anything in it is looked at, so that nobody else can change
// that meanwhile.
class olm_adoption {
 public:
  explicit olm_adoption(olm_contents& contents) : contents_(contents) {}

  // Takes over the directory `name` in `parent`, whose own name in the update begins with `prefix`.
  void adopt_directory(int parent, const string& name, const string& prefix) {
    constexpr mode_t open_to_all = 0755;
    const int opened = open_entry(parent, name, O_DIRECTORY);
    const std::unique_ptr<DIR, directory_closer> listing(fdopendir(opened));
    if (!listing) fail(name);
    protect(opened, open_to_all, name);
    const auto read_next = [&] {
      errno = 0;
      return readdir(listing.get());
    };
    for (const dirent* next = read_next(); next != nullptr; next = read_next()) {
      const string entry = &next->d_name[0];
      if (entry != "." && entry != "..") adopt_entry(opened, entry, prefix + entry);
    }
    if (errno != 0) fail(name);
  }

 private:
  static int open_entry(int parent, const string& name, int flags) {
    const int opened = openat(parent, name.c_str(),
                              flags | O_RDONLY | O_NOFOLLOW | O_NONBLOCK | O_NOCTTY | O_CLOEXEC);
    if (opened == -1) fail(name);
    return opened;
  }

  void adopt_entry(int parent, const string& name, const string& path) {
    constexpr mode_t readable = 0644;
    struct stat status {};
    if (fstatat(parent, name.c_str(), &status, AT_SYMLINK_NOFOLLOW) != 0) fail(path);
    if (S_ISDIR(status.st_mode)) {
      contents_.add(path, {.type = kind::directory});
      adopt_directory(parent, name, path + '/');
    } else if (S_ISREG(status.st_mode)) {
      contents_.add(path, {.type = kind::file});
      const olm_descriptor file(open_entry(parent, name, 0));
      protect(file.get(), readable, path);
    } else if (S_ISLNK(status.st_mode)) {
      contents_.add(
          path, {.type = kind::symbolic_link, .target = read_target(parent, name.c_str(), path)});
      if (fchownat(parent, name.c_str(), 0, 0, AT_SYMLINK_NOFOLLOW) != 0) fail(path);
    } else {
      throw olm_refusal({path + " is no file, directory or link"});
    }
  }

  olm_contents& contents_;
};

}  // namespace

olm_contents adopt(const string& update) {
  olm_contents contents;
  olm_adoption(contents).adopt_directory(AT_FDCWD, update, "");
  contents.require_whole();
  return contents;
}
