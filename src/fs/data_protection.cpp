#include "fs/data_protection.h"

#ifndef F_SETPROTECTIONCLASS

#include <sys/xattr.h>

#include <cerrno>

int open_dprotected_np(const char* path, int flags, int protection_class, int /*dpflags*/,
                       mode_t mode) {
  const int errno_before = errno;
  // An open that may not create tells an existing file from a new one, also through a link.
  const int existing = open(path, flags & ~O_CREAT);
  if (existing != -1 || errno != ENOENT || (flags & O_CREAT) == 0) return existing;
  const int created = open(path, flags, mode);
  if (created == -1) return created;
  fcntl(created, F_SETPROTECTIONCLASS, protection_class);
  errno = errno_before;
  return created;
}

int fcntl(int descriptor, protection_command /*command*/, int protection_class) {
  const int errno_before = errno;
  const char letter = static_cast<char>('A' + protection_class - 1);
  if (fsetxattr(descriptor, "user.protection_class", &letter, sizeof letter, 0) == 0) return 0;
  if (errno != ENOTSUP) return -1;
  errno = errno_before;
  return 0;
}

#endif
