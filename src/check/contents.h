// What lies in the directories of a data set.
#pragma once

#include <filesystem>
#include <optional>
#include <string>
#include <vector>

#include "check/canary.h"

// The files below `directory`, by their paths from there, in order; also what links lead to. Adds a
// reason for each entry that not everybody may read, that is no file, directory or link, and for
// each link that leads out of `directory`. (The zone files of some systems have a link to the local
// zone, which may.) Throws std::invalid_argument when there are too many files, and
// std::filesystem::filesystem_error for a directory that cannot be listed although everybody may.
// Prints nothing.
[[nodiscard]] std::vector<std::string> list_contents(const std::filesystem::path& directory,
                                                     const listener& add_reason);

// What the file `path` holds; none where not everybody may read it, nor can this process. Throws
// std::runtime_error where it cannot although everybody may, and std::invalid_argument when it is
// larger than any file of a data set. Prints nothing.
[[nodiscard]] std::optional<std::string> read_file(const std::filesystem::path& path);
