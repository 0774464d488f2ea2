// Opening what is in a directory that may have been made to mislead: no link is followed.
#pragma once

#include <memory>
#include <string>

#include "fs/olm_descriptor.h"

// Opens `name` in the directory that is open on `directory`, with `flags`, in a way that never
// waits. What is made may be read by everybody. Throws std::system_error where that fails, and
// prints nothing.
[[nodiscard]] olm_descriptor open_entry(int directory, const std::string& name, int flags);

// Opens the directory `path` below the one that is open on `directory`, name by name; an empty path
// is that one. Throws and prints what open_entry does.
[[nodiscard]] std::unique_ptr<olm_descriptor> open_steps(int directory, const std::string& path);

// The path of the directory that `name` stands in; empty at the top.
[[nodiscard]] std::string get_directory(const std::string& name);

// What follows the last slash in `path`.
[[nodiscard]] std::string get_name(const std::string& path);
