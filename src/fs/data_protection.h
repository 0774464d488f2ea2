// Data-protection classes on a platform that has none.
//
// The device's own platform keeps a protection class with each file. Where its calls exist
// (F_SETPROTECTIONCLASS is defined) they are used and this layer vanishes. Elsewhere the layer
// gives the same names and records the class as its letter in the extended attribute
// "user.protection_class". A record is all it is: it protects nothing, and a file system without
// such attributes is no failure.
#pragma once

#include <fcntl.h>

#ifndef F_SETPROTECTIONCLASS

// A type of its own, so that this command can reach only the overload of fcntl below.
enum class protection_command { set_class };
// NOLINTBEGIN(readability-identifier-naming): the platform's names
inline constexpr protection_command F_SETPROTECTIONCLASS = protection_command::set_class;
inline constexpr int PROTECTION_CLASS_D = 4;  // files that can be read at any time
// NOLINTEND(readability-identifier-naming)

// Opens `path` as open does, following links; `flags` without O_EXCL. A file that the call creates
// gets `mode` and the class; an existing one keeps its class, contents and times. `dpflags` must
// be 0. Gives a descriptor that the caller owns, or -1 with the errno of the failed open; errno is
// left alone on success. Throws and prints nothing.
[[nodiscard]] int open_dprotected_np(const char* path, int flags, int protection_class, int dpflags,
                                     mode_t mode);

// Sets the class of the file or directory that is open on `descriptor`. Gives 0, with errno left
// alone, or -1 with errno set. Throws and prints nothing.
int fcntl(int descriptor, protection_command command, int protection_class);

#endif
