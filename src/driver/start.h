#pragma once

// Holds the names of the data set that was last replaced by an update and of that update.
inline constexpr const char* version_record = "/var/db/timezone/TZVersionDiffRecord";

// One start of a device, from its first step to its last: decides which time-zone data set the
// device uses, and makes the links say so. Gives the program's exit status: EXIT_FAILURE when not
// even a fall-back to the system partition, or the link to the default zone, could be put in place.
// Touches what fs/device.h reaches, prints the start's warnings, and throws nothing.
[[nodiscard]] int run_start();
