#pragma once

#include <array>
#include <string_view>

// The files of a data set in which ICU has its time zones.
inline constexpr std::array<const char*, 4> icu_files = {"zoneinfo64", "timezoneTypes",
                                                         "windowsZones", "metaZones"};
inline constexpr const char* icu_file_ending = ".res";

// Looks whether `data`, the whole of such a file, has ICU's header for this machine and the length
// that it says it has, and whether all that is in it lies within. Throws std::invalid_argument
// where not; the text goes on after the file's name. Prints nothing.
void check_icu_file(std::string_view data);
