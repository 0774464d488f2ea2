#include "forecast/olm_trial.h"

#include <dirent.h>
#include <fcntl.h>
#include <sys/statvfs.h>
#include <sys/xattr.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <climits>
#include <cstdio>
#include <filesystem>
#include <memory>
#include <stdexcept>
#include <system_error>
#include <utility>

#include "boot/confine.h"
#include "fs/file_operations.h"
#include "fs/olm_descriptor.h"

namespace {

constexpr int most_links = 40;  // that the kernel follows on the way to one entry

// With a version that is somewhat longer, a start needs more than the 64 MB that the unit allows
// it.
constexpr std::size_t longest_word = 4 << 20;

constexpr const char* white_space = " \t\n\v\f\r";

const char* get_path(const std::string& place) { return place.empty() ? "/" : place.c_str(); }

bool has_attribute(const olm_entry& entry, unsigned attributes) {
  return (entry.status.stx_attributes & attributes) != 0;
}

std::string describe_rights(const olm_entry& entry) {
  std::array<char, sizeof "7777"> mode{};
  static_cast<void>(
      std::snprintf(mode.data(), mode.size(), "%o", entry.status.stx_mode & ALLPERMS));
  return " (owner: user " + std::to_string(entry.status.stx_uid) + ", mode " + mode.data() + ")";
}

struct directory_closer {
  void operator()(DIR* directory) const { closedir(directory); }
};

}  // namespace

std::string get_parent(const std::string& path) { return path.substr(0, path.rfind('/')); }

bool olm_entry::equals(const olm_entry& other) const {
  constexpr unsigned kind = S_IFMT;
  return (status.stx_mode & kind) == (other.status.stx_mode & kind) && target == other.target;
}

olm_trial*& olm_trial::get_current() {
  // NOLINTNEXTLINE(cppcoreguidelines-avoid-non-const-global-variables): for functions of the C kind
  static olm_trial* current = nullptr;
  return current;
}

olm_trial::olm_trial(const suppositions& supposed) {
  get_current() = this;
  try {
    is_for_user_ = true;
    for (const supposed_link& link : supposed) suppose(link);
    is_for_user_ = false;
    confine();
  } catch (const std::runtime_error&) {
  }  // whoever uses the trial hears of it
  is_for_user_ = false;
  record_.obstacles.clear();
}

olm_trial::~olm_trial() { get_current() = nullptr; }

olm_trial& olm_trial::get() {
  olm_trial& current = *get_current();
  current.require_told();
  const std::string& end = current.record_.endless;
  if (!end.empty() && !current.is_for_user_) throw std::runtime_error(end);
  return current;
}

void olm_trial::require_told() const {
  if (!untold_.empty()) throw std::runtime_error(untold_);
}

void olm_trial::leave_untold(const std::string& why) {
  untold_ = why;
  throw std::runtime_error(why);
}

void olm_trial::end_at(const std::string& place) {
  record_.endless = place;
  throw std::runtime_error(place);
}

void olm_trial::note(const std::string& obstacle) {
  auto& all = record_.obstacles;
  if (std::find(all.begin(), all.end(), obstacle) == all.end()) all.push_back(obstacle);
}

// What stands at `place`.
olm_entry olm_trial::look_up(const std::string& place) {
  if (place.size() >= PATH_MAX) leave_untold("a path is too long: " + place);
  const auto changed = changes_.find(place);
  if (changed != changes_.end()) return changed->second;
  olm_entry entry{.error = 0, .place = place};
  if (statx(AT_FDCWD, get_path(place), AT_SYMLINK_NOFOLLOW | AT_NO_AUTOMOUNT, STATX_BASIC_STATS,
            &entry.status) != 0) {
    if (errno == EACCES) leave_untold("you may not look at " + place);
    entry.error = errno;
  }
  if (entry.is(S_IFLNK)) {
    std::array<char, PATH_MAX> target{};
    const ssize_t length = ::readlink(place.c_str(), target.data(), target.size());
    if (length > 0) entry.target.assign(target.data(), static_cast<std::size_t>(length));
  }
  return entry;
}

// The directory that `entry` stands in.
olm_entry olm_trial::look_up_directory(const olm_entry& entry) {
  return look_up(get_parent(entry.place));
}

// What stands in `directory` under `name`.
olm_entry olm_trial::look_up_in(const olm_entry& directory, const std::string& name) {
  if (name == ".") return directory;
  return name == ".." ? look_up_directory(directory) : look_up(directory.place + '/' + name);
}

void olm_trial::confine() {
  if (!can_confine()) return;
  for (const allowed_directory& directory : allowed_directories) {
    const olm_entry entry = find(directory.path, true);
    if (entry.is(S_IFDIR)) {
      allowed_[entry.place] |= directory.may_write;
    } else if (entry.error != 0 && !is_no_directory(entry.error)) {
      return;
    }
  }
  is_confined_ = true;
}

bool olm_trial::is_allowed(const std::string& place, bool writes) const {
  return std::any_of(allowed_.begin(), allowed_.end(), [&](const auto& allowed) {
    return (place + '/').starts_with(allowed.first + '/') && (allowed.second || !writes);
  });
}

bool olm_trial::may(const olm_entry& entry, unsigned rights) {
  if (is_for_user_) return true;  // what he may not, fails by itself
  const bool is_roots = entry.status.stx_uid == 0;
  const bool has_list =
      !is_roots && lgetxattr(get_path(entry.place), "system.posix_acl_access", nullptr, 0) > 0;
  if (has_list) leave_untold(entry.place + " has an access control list");
  const unsigned shift = is_roots ? 6 : entry.status.stx_gid == 0 ? 3 : 0;
  const bool writes = (rights & change) != 0;
  const std::string place = get_path(entry.place);
  if ((entry.status.stx_mode >> shift & rights) == rights) {
    if (rights == search || !is_confined_ || is_allowed(entry.place, writes)) return true;
    note(place + " lies where a boot may not " + (writes ? "write" : "read"));
    return false;
  }
  note(writes ? "nothing can be changed in " + place + describe_rights(entry)
              : place + " is closed to a start" + describe_rights(entry));
  return false;
}

olm_entry olm_trial::find(const std::string& path, bool follows) {
  std::string rest = path;
  olm_entry at = look_up("");
  for (int links = 0;;) {
    const std::string name = fs::take_name(rest);
    if (name.empty()) return at;
    if (!may(at, search)) return {.error = EACCES};
    olm_entry entry = look_up_in(at, name);
    const bool is_last = rest.empty();
    if (entry.is(S_IFLNK) && (follows || !is_last)) {
      if (++links > most_links) return {.error = ELOOP};
      rest.insert(0, entry.target);
      if (rest.starts_with('/')) at = look_up("");
    } else if (is_last) {
      return entry;
    } else if (entry.is(S_IFDIR)) {
      at = std::move(entry);
    } else {
      return {.error = entry.error == 0 ? ENOTDIR : entry.error};
    }
  }
}

std::vector<olm_entry> olm_trial::list(const std::string& directory) {
  const olm_entry at = find(directory, true);
  std::vector<olm_entry> entries;
  if (!at.is(S_IFDIR) || !may(at, look_into | search)) return entries;
  const std::unique_ptr<DIR, directory_closer> names(opendir(get_path(at.place)));
  if (!names && errno == EACCES) leave_untold("you may not read " + at.place);
  while (const dirent* next = names ? readdir(names.get()) : nullptr) {
    const std::string name = &next->d_name[0];
    if (name != "." && name != "..") entries.push_back(look_up(at.place + '/' + name));
  }
  return entries;
}

void olm_trial::put(const std::string& place, mode_t type, const std::string& target) {
  olm_entry& entry = changes_[place];
  entry = {.error = type == 0 ? ENOENT : 0, .place = place, .target = target, .is_new = true};
  entry.status.stx_mode = static_cast<decltype(entry.status.stx_mode)>(type | ACCESSPERMS);
}

void olm_trial::suppose(const supposed_link& link) {
  const olm_entry entry = find(link.path);
  if (!entry.place.empty()) put(entry.place, link.target.empty() ? 0 : S_IFLNK, link.target);
}

// Why nothing can be written in the directory of `entry`, whatever the rights.
int olm_trial::refuse_writing(const olm_entry& entry) {
  if (entry.place.empty()) return entry.error;
  struct statvfs system {};
  const std::string directory = get_parent(entry.place);
  if (statvfs(get_path(directory), &system) != 0 || (system.f_flag & ST_RDONLY) == 0) return 0;
  note(get_path(directory) + std::string(" can only be read"));
  return EROFS;
}

int olm_trial::refuse_making(const olm_entry& entry) {
  if (entry.error == 0) return EEXIST;
  if (entry.error != ENOENT) return entry.error;
  if (const int error = refuse_writing(entry); error != 0) return error;
  const olm_entry directory = look_up_directory(entry);
  if (!may(directory, change | search)) return EACCES;
  const bool is_fixed = has_attribute(directory, STATX_ATTR_IMMUTABLE);
  if (is_fixed) note("nothing can be made in " + directory.place);
  return is_fixed ? EPERM : 0;
}

int olm_trial::refuse_removing(const olm_entry& entry) {
  if (const int error = refuse_writing(entry); error != 0) return error;
  if (entry.error != 0) return entry.error;
  const olm_entry directory = look_up_directory(entry);
  if (!may(directory, change | search)) return EACCES;
  // In a sticky directory, only the owner of the entry or of the directory may remove it.
  const bool is_others = (directory.status.stx_mode & S_ISVTX) != 0 &&
                         directory.status.stx_uid != 0 && entry.status.stx_uid != 0;
  constexpr unsigned fixed = STATX_ATTR_IMMUTABLE | STATX_ATTR_APPEND;
  if (is_others || has_attribute(directory, fixed) ||
      has_attribute(entry, fixed | STATX_ATTR_MOUNT_ROOT)) {
    note(entry.place + " cannot be removed");
    return EPERM;
  }
  return 0;
}

int olm_trial::unlink(const std::string& path) {
  const olm_entry entry = find(path);
  if (const int error = refuse_removing(entry); error != 0) return error;
  if (entry.is(S_IFDIR)) {
    note("a directory is in the place of " + path);
    return EISDIR;
  }
  put(entry.place, 0, "");
  return 0;
}

int olm_trial::remove(const std::string& path) {
  const olm_entry entry = find(path);
  const std::vector<std::string> before = record_.obstacles;
  int error = refuse_removing(entry);
  if (error == 0 && entry.is(S_IFDIR)) {
    std::error_code failure;
    if (!std::filesystem::is_empty(entry.place, failure)) error = ENOTEMPTY;
    if (failure) leave_untold("you may not read " + entry.place);
  }
  if (error == 0) put(entry.place, 0, "");
  record_.obstacles = before;  // nobody hears of this failure
  return error;
}

int olm_trial::symlink(const std::string& target, const std::string& path) {
  const olm_entry entry = find(path);
  const int error = refuse_making(entry);
  if (error == ENOENT || error == ENOTDIR) note("there is no directory for " + path);
  if (entry.is(S_IFDIR)) note("a directory is in the place of " + path);
  if (error == 0) put(entry.place, S_IFLNK, target);
  return error;
}

int olm_trial::rename(const std::string& path, const std::string& new_path) {
  const olm_entry entry = find(path);
  const olm_entry replaced = find(new_path);
  int error = refuse_removing(entry);
  if (error == 0 && replaced.error == 0) error = refuse_removing(replaced);
  if (error == 0 && replaced.is(S_IFDIR)) error = EISDIR;
  if (error != 0) return error;
  put(replaced.place, S_IFLNK, entry.target);
  put(entry.place, 0, "");
  return 0;
}

int olm_trial::write(const std::string& path, bool reads_too) {
  if (!reads_too) record_.written.push_back(path);
  const olm_entry entry = find(path, true);
  if (entry.error != 0) {
    const int error = refuse_making(entry);
    if (error == 0) put(entry.place, S_IFREG, "");
    return error;
  }
  if (entry.is(S_IFDIR)) return EISDIR;
  if (entry.is(S_IFSOCK)) return ENXIO;
  if (!may(entry, reads_too ? look_into | change : change)) return EACCES;
  if (entry.is(S_IFIFO) && !reads_too) end_at(entry.place);
  if (has_attribute(entry, STATX_ATTR_IMMUTABLE | STATX_ATTR_APPEND)) return EPERM;
  return entry.is(S_IFREG) ? refuse_writing(entry) : 0;
}

// The first word in the regular file at `place`, read in a way that never waits.
std::string olm_trial::read_word_in(const std::string& place) {
  const olm_descriptor file(open(place.c_str(), O_RDONLY | O_NONBLOCK | O_NOCTTY | O_CLOEXEC));
  if (!file.is_open() && errno == EACCES) leave_untold("you may not read " + place);
  struct stat status {};
  // Another has a lease on it, or has put something else there by now.
  if ((!file.is_open() && errno == EAGAIN) ||
      (fstat(file.get(), &status) == 0 && !S_ISREG(status.st_mode)))
    end_at(place);
  std::array<char, BUFSIZ> part{};
  std::string text;
  for (ssize_t length = 0; (length = read(file.get(), part.data(), part.size())) > 0;) {
    const std::size_t known = text.size();
    text.append(part.data(), static_cast<std::size_t>(length));
    if (known == 0) text.erase(0, text.find_first_not_of(white_space));
    const std::size_t end = text.find_first_of(white_space, known);
    if (end != std::string::npos) return text.substr(0, end);
    if (text.size() >= longest_word) end_at(place);
  }
  return text;
}

std::string olm_trial::read_first_word(const std::string& path) {
  const olm_entry entry = find(path, true);
  if (entry.error != 0 || entry.is(S_IFDIR) || entry.is(S_IFSOCK) || !may(entry, look_into))
    return {};
  const bool is_null =
      entry.is(S_IFCHR) && entry.status.stx_rdev_major == 1 && entry.status.stx_rdev_minor == 3;
  // The system's own files have no size. Reading some of them waits, or uses up what they tell.
  const bool is_empty = entry.is(S_IFREG) && entry.status.stx_size == 0;
  if (is_null || is_empty) return {};
  if (!entry.is(S_IFREG)) end_at(entry.place);
  return read_word_in(entry.place);
}
