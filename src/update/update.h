// What becomes of an update: it is proven, and then the next start is told of it.
//
// Each function gives a line that says what data the next start uses. Each throws olm_refusal where
// that stays as it was, for the reasons in there, and std::runtime_error or std::system_error where
// a call fails. Killed at any moment, the device is as before, or as after; another call removes
// what was left. `allows_older`: a newer update that waits may be replaced.
// All that they print are warnings, where the update lacks the device's zone, or one that is not
// needed any more cannot be removed.
#pragma once

#include <string>

// Takes the update in `archive`, NAME.tar, with the sum of its bytes beside it in NAME.sha256:
// below /var/db/timezone/tz it becomes NAME, to which tz_latest then leads. Removes those that such
// calls have put there and nothing needs any more.
[[nodiscard]] std::string take_archive(const std::string& archive, bool allows_older);

// The same with a directory that stands in /var/db/timezone/tz already. First makes all in it
// root's and readable.
[[nodiscard]] std::string take_directory(const std::string& directory, bool allows_older);

// Takes back the last step. Where an update waits, the data set in use is kept. Otherwise the next
// start uses the update before it, or the system partition.
[[nodiscard]] std::string go_back();
