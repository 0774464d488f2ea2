// The device that a private root shows: laying one out, looking at it, starting the program on it.
#pragma once

#include <map>
#include <string>
#include <utility>
#include <vector>

// The device's paths.
namespace at {
inline const std::string system_zoneinfo = "/usr/share/zoneinfo.default";
inline const std::string version = system_zoneinfo + "/+VERSION";
inline const std::string schema = "/usr/share/icu/icutzformat.txt";
inline const std::string base = "/var/db/timezone/";
inline const std::string updates = base + "tz/";
inline const std::string latest = base + "tz_latest";
inline const std::string zoneinfo = base + "zoneinfo";
inline const std::string icutz = base + "icutz";
inline const std::string zone = base + "localtime";
inline const std::string marker = base + "needs_cleanup";
inline const std::string record = base + "TZVersionDiffRecord";
inline const std::string legacy_icutz = "/var/db/icutz";
}  // namespace at

// What stands at which paths: entries, each in place of what an earlier one put there.
using entries = std::vector<std::pair<std::string, std::string>>;

entries file(const std::string& path, const std::string& words);
entries link_to(const std::string& path, const std::string& target);
entries folder(const std::string& path);
entries gone(const std::string& path);  // nothing

// One list after the other.
template <typename element>
std::vector<element> operator+(std::vector<element> first, const std::vector<element>& then) {
  first.insert(first.end(), then.begin(), then.end());
  return first;
}

// What stands at each path below /var/db and /usr/share that is no directory with something in it.
using device = std::map<std::string, std::string>;

// `before` with each of `changes`, in order, in place of what stood at its path and below.
device change(device before, const entries& changes);

// Puts a new device with `contents` in place of the one that was there; nothing is deleted for it.
// Its ICU data files are of a size and a time that 32 bits do not hold, and count as empty.
// Throws std::logic_error outside a private root, std::system_error when the kernel refuses.
void lay_out(const entries& contents);

// The device as it is.
device look();

// What a program said, and then how it ended, such as "exit 0" or "signal 11".
using report = std::vector<std::string>;

// Runs the built tzdata-select with the rights that the unit has, under strace if there are
// `tracing` options for it. The environment may name another directory of programs
// (TZDATA_PROGRAMS), and the emulator that these need (TZDATA_EMULATOR). Gives its warnings,
// without the program's name and the text of errno; a line that lacks the name belongs to the
// warning before it.
report start(const report& tracing = {});

// The same for tzdata-boot, without what it says of confining itself.
report boot(const report& tracing = {});

// Runs a command with an empty environment. Gives its lines.
report hear(const report& command);

// Asks the built tzdata-status, or another program of that kind, under strace if there are
// `tracing` options. Gives its lines.
report ask(const report& arguments, const report& tracing = {},
           const std::string& program = "tzdata-status");

// What those two write while they run.
inline const std::string output = "/var/output";
