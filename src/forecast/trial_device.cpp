// The second implementation of fs/device.h: the calls go to the innermost trial.
#include <fcntl.h>

#include <algorithm>
#include <cerrno>
#include <cstdarg>
#include <cstdio>
#include <string>

#include "forecast/olm_trial.h"
#include "fs/device.h"

namespace {

// What a system call gives that ends with `error`.
int give(int error) {
  if (error == 0) return 0;
  errno = error;
  return -1;
}

}  // namespace

namespace device {

int access(const char* path) { return give(olm_trial::get().find(path, true).error); }

int unlink(const char* path) { return give(olm_trial::get().unlink(path)); }

ssize_t readlink(const char* path, char* target, std::size_t size) {
  const olm_entry entry = olm_trial::get().find(path);
  if (entry.error == 0 && !entry.is(S_IFLNK)) return give(EINVAL);
  if (entry.error != 0) return give(entry.error);
  return static_cast<ssize_t>(entry.target.copy(target, size));
}

int symlink(const char* target, const char* link_path) {
  return give(olm_trial::get().symlink(target, link_path));
}

int rename(const char* path, const char* new_path) {
  return give(olm_trial::get().rename(path, new_path));
}

int remove(const char* path) { return give(olm_trial::get().remove(path)); }

void set_protection_class(const char* /*directory*/, int /*protection_class*/) {}

int create_file(const char* path, int /*protection_class*/, mode_t /*mode*/) {
  const int error = olm_trial::get().write(path, true);
  return error == 0 ? open("/", O_PATH | O_CLOEXEC) : give(error);
}

std::string read_first_word(const std::string& path) {
  return olm_trial::get().read_first_word(path);
}

std::ofstream open_to_write(const std::string& path) {
  static_cast<void>(olm_trial::get().write(path, false));
  return {};
}

bool walk(const std::string& directory, const file_visitor& visit) {
  const auto entries = olm_trial::get().list(directory);
  static_cast<void>(std::any_of(entries.begin(), entries.end(), [&](const olm_entry& entry) {
    const char* name = &entry.place[entry.place.rfind('/') + 1];
    return entry.is(S_IFREG) && visit(name, entry.status.stx_mode);
  }));
  return true;
}

// NOLINTBEGIN(cert-dcl50-cpp,cppcoreguidelines-pro-bounds-array-to-pointer-decay): as in C
void warn(const char* format, ...) {
  std::va_list arguments;
  va_start(arguments, format);
  std::va_list again;
  va_copy(again, arguments);
  std::string message(static_cast<std::size_t>(std::vsnprintf(nullptr, 0, format, arguments)), ' ');
  static_cast<void>(std::vsnprintf(message.data(), message.size() + 1, format, again));
  va_end(again);
  va_end(arguments);
  olm_trial::get().warn(message);
}
// NOLINTEND(cert-dcl50-cpp,cppcoreguidelines-pro-bounds-array-to-pointer-decay)

}  // namespace device
