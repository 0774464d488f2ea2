// The operations on one directory entry that everything else is built from. The first four are a
// start's, and have the program's way of reporting a failure that the caller must hear of: one
// warning on the standard error stream, ended by the text of errno, then that errno thrown as a
// bare int. The others print and throw nothing.
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

// What read_symlink gives of a link. Empty where there is none; errno then tells why.
[[nodiscard]] std::string peek_symlink(const std::string& path);

// What a new link is called until it takes its place, for whoever must be able to tell a link that
// is not there yet from one that is lost.
[[nodiscard]] std::string get_spare_path(const std::string& link_path);

// Makes `link_path` a link that holds `target`, in place of the link or file that is there, in one
// step: a kill leaves the old one or the new one, and perhaps the spare. False, with errno set,
// where that fails; the old one then stays.
[[nodiscard]] bool replace_symlink(const std::string& target, const std::string& link_path);

// Takes the first name off a path, and the slashes before it; empty at the path's end.
[[nodiscard]] std::string take_name(std::string& path);

// The absolute `path` without "." and "..", double slashes and one at its end. With `follows`,
// links are followed as far as there is something, those on the way and the last one.
[[nodiscard]] std::string simplify_path(const std::string& path, bool follows);

}  // namespace fs
