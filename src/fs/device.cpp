#include "fs/device.h"

#include <err.h>
#include <fts.h>
#include <sys/stat.h>
#include <unistd.h>

#include <array>
#include <cstdarg>
#include <cstdio>
#include <memory>

#include "fs/data_protection.h"
#include "fs/olm_descriptor.h"

namespace {

struct walk_closer {
  void operator()(FTS* walk) const { fts_close(walk); }
};

bool is_file_in_root(const FTSENT& entry) {
  return entry.fts_errno == 0 && entry.fts_level == 1 && entry.fts_namelen != 0 &&
         entry.fts_info == FTS_F;
}

}  // namespace

namespace device {

int access(const char* path) { return ::access(path, F_OK); }

int unlink(const char* path) { return ::unlink(path); }

ssize_t readlink(const char* path, char* target, std::size_t size) {
  return ::readlink(path, target, size);
}

int symlink(const char* target, const char* link_path) { return ::symlink(target, link_path); }

int rename(const char* path, const char* new_path) { return std::rename(path, new_path); }

int remove(const char* path) { return std::remove(path); }

void set_protection_class(const char* directory, int protection_class) {
  const olm_descriptor opened(open(directory, O_RDONLY | O_CLOEXEC));
  if (opened.is_open()) fcntl(opened.get(), F_SETPROTECTIONCLASS, protection_class);
}

int create_file(const char* path, int protection_class, mode_t mode) {
  return open_dprotected_np(path, O_CREAT | O_RDWR, protection_class, 0, mode);
}

std::string read_first_word(const std::string& path) {
  std::string word;
  std::ifstream file(path);
  file >> word;
  return word;
}

std::ofstream open_to_write(const std::string& path) { return std::ofstream(path); }

bool walk(const std::string& directory, const file_visitor& visit) {
  std::string root = directory;
  const std::array<char*, 2> roots = {root.data(), nullptr};
  const std::unique_ptr<FTS, walk_closer> entries(
      fts_open(roots.data(), FTS_COMFOLLOW | FTS_PHYSICAL | FTS_XDEV, nullptr));
  if (!entries) return false;
  while (const FTSENT* entry = fts_read(entries.get())) {
    if (is_file_in_root(*entry) && visit(&entry->fts_name[0], entry->fts_statp->st_mode)) break;
  }
  return true;
}

// NOLINTBEGIN(cert-dcl50-cpp,cppcoreguidelines-pro-bounds-array-to-pointer-decay): as in C
void warn(const char* format, ...) {
  std::va_list arguments;
  va_start(arguments, format);
  vwarn(format, arguments);
  va_end(arguments);
}
// NOLINTEND(cert-dcl50-cpp,cppcoreguidelines-pro-bounds-array-to-pointer-decay)

}  // namespace device
