// The four operations on one directory entry that everything else is built from, and with them the
// program's way of reporting a failure that the caller must hear of: one warning on the standard
// error stream, ended by the text of errno, then that errno thrown as a bare int.
//
// Paths are byte strings. They reach the system as they are: nothing is normalised or resolved.
// Calls name the namespace, because an unqualified remove("...") would pick the C library's.
#pragma once

#include <string>

namespace fs {

// True when `path` leads to something; a link whose target is missing does not.
// Throws and prints nothing.
[[nodiscard]] bool exists(const std::string& path);

// Removes the entry `path`, never what a link leads to. A missing entry is a success.
// Any other failure: prints "remove: could not remove ..." and throws errno.
void remove(const std::string& path);

// The text stored in the link `path`, cut to its first 1024 bytes; empty when there is no such
// entry. Any other failure: prints "read_symlink: ..." and throws errno.
[[nodiscard]] std::string read_symlink(const std::string& path);

// Makes `link_path` a link that holds `target`, which need not exist. Replaces nothing.
// Any failure, an existing entry included: prints "create_symlink: from ... to ..." (the link
// first) and throws errno.
void create_symlink(const std::string& target, const std::string& link_path);

}  // namespace fs
