// Opening what is in a directory that may have been made to mislead: no link is followed.
#pragma once

#include <string>

#include "fs/olm_descriptor.h"

// Each function throws std::system_error, with the whole path, where a call fails, and prints
// nothing.

struct olm_directory {
  olm_descriptor opened;
  std::string path;  // for messages
};

// Opens the directory `path`, which is no link.
[[nodiscard]] olm_directory open_top(const std::string& path);

// Opens `name` in `directory` with `flags`, in a way that never waits. What is made may be read by
// everybody.
[[nodiscard]] olm_descriptor open_entry(const olm_directory& directory, const std::string& name,
                                        int flags);

// Opens the directory `path` below `top`, name by name; an empty path is `top` once more.
[[nodiscard]] olm_directory open_steps(const olm_directory& top, const std::string& path);

// The path of the directory that `name` stands in; empty at the top.
[[nodiscard]] std::string get_directory(const std::string& name);

// What follows the last slash in `path`.
[[nodiscard]] std::string get_name(const std::string& path);
