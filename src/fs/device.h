// The calls through which a start looks at a device, changes it, and prints its warnings. Nothing
// above this header reaches the device in another way. Each call does what the system's own call of
// that name does: -1, with errno set, stands for a failure.
//
// There are two implementations, and a program is linked with one of them. fs/device.cpp makes the
// calls; they throw nothing but for want of memory. forecast/trial_device.cpp looks at the device
// but only remembers what is to be changed; there every call may throw std::runtime_error, and so
// may whatever makes it.
#pragma once

#include <sys/types.h>

#include <fstream>
#include <functional>
#include <string>

namespace device {

// 0 when `path` leads to something.
[[nodiscard]] int access(const char* path);

[[nodiscard]] int unlink(const char* path);
[[nodiscard]] ssize_t readlink(const char* path, char* target, std::size_t size);
[[nodiscard]] int symlink(const char* target, const char* link_path);

// Both paths are in one directory.
[[nodiscard]] int rename(const char* path, const char* new_path);

// As the C library's: removes a file, a link or an empty directory.
int remove(const char* path);

// Gives `directory` the data-protection class, if it can be opened. Prints and throws nothing.
void set_protection_class(const char* directory, int protection_class);

// Opens the file `path` to read and write it. One that the call creates gets the class and `mode`;
// an existing one stays as it is. Gives a descriptor that the caller owns.
[[nodiscard]] int create_file(const char* path, int protection_class, mode_t mode);

// The first word of the file `path`: white space is skipped, then bytes are taken up to the next
// white space (that of the "C" locale) or the end, however many they are. Empty when the file
// cannot be opened or holds no word. Where memory runs out or reading fails, the word ends there.
[[nodiscard]] std::string read_first_word(const std::string& path);

// A stream to the file `path`, which it empties or makes; it is not open where that fails.
[[nodiscard]] std::ofstream open_to_write(const std::string& path);

// Takes the name and the mode of a file; true to see no more of them.
using file_visitor = std::function<bool(const char* name, mode_t mode)>;

// Calls `visit` for each regular file directly in `directory`, which may be a link, in the
// directory's own order. Gives false, with errno set, when the walk cannot be started; a directory
// that is missing or closed has no files.
[[nodiscard]] bool walk(const std::string& directory, const file_visitor& visit);

// As the C library's: prints a line on the standard error stream, with the program's name in front
// and the text of errno at its end.
[[gnu::format(printf, 1, 2)]] void warn(const char* format, ...);

}  // namespace device
