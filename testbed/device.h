// The device that a private root shows: laying one out, looking at it, and starting the program.
#pragma once

#include <functional>
#include <set>
#include <string>
#include <vector>

// What stands on a device is written one entry a line:
//   PATH > TARGET    a link             PATH = CONTENT   a file
//   PATH /           a directory        PATH -           nothing
// A path is below /var/db/timezone/ unless it begins with a slash. \n stands for a newline.

// Lays out entries, each in place of what was there; missing directories above an entry are made.
// Throws std::filesystem::filesystem_error, and std::logic_error outside a private root.
void lay_out(const std::string& entries);

// The same on a new, empty device; throws what private_root::renew_device does as well.
void new_device(const std::string& entries);

// The entries directly in /var/db/timezone and /var/db, but for the updates and the link to the
// latest: those that are the program's to change.
std::set<std::string> look();

// The rest, with paths from the root: the updates, the link to the latest and the system partition.
std::set<std::string> look_at_inputs();

// The lines of a text, to compare with those.
std::set<std::string> list(const std::string& entries);

// What came of an action: its warnings, without the program's name and, unless they report a failed
// call, without the text of errno; last, how it ended. A line that lacks the name belongs to the
// warning before it, behind \n.
using report = std::vector<std::string>;

// Runs `action` in this process, which must go by the program's name; ends with what it threw, such
// as "int 17", or with "done".
report hear(const std::function<void()>& action);

// Starts the built program; ends with its status, such as "exit 0", or with "signal 11". A shell
// does it, to which `before` and `after` the program's path may say more: by default, that nothing
// is in its environment. Throws std::logic_error outside a private root.
report start(const std::string& before = "exec env -i", const std::string& after = "");
