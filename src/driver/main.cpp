// One start: decides which time-zone data set the device uses and makes the links say so.
#include <err.h>

#include <array>
#include <csignal>
#include <cstdio>
#include <cstdlib>
#include <fstream>
#include <string>

#include "dataset/olm_dataset.h"
#include "driver/housekeeping.h"
#include "driver/localtime.h"

namespace {

// Points the links at the system partition. Prints and throws what building a data set and
// install_links do.
void reset_to_system_partition() { olm_dataset().install_links(); }

// The path of the data set that the links designate. Links that cannot be understood are reset,
// with a warning; throws only if that fails.
std::string read_current_path() {
  try {
    return current_dataset_path();
  } catch (...) {
    warn("Invalid current symlinks; resetting to system partition");
    reset_to_system_partition();
    return {};
  }
}

// Leaves the names of the data set that was in use and of the update that took over from it, for
// whoever asks later. A record that cannot be written is done without.
void write_version_record(const olm_dataset& before, const olm_dataset& after) {
  std::ofstream record("/var/db/timezone/TZVersionDiffRecord", std::ios::out | std::ios::trunc);
  record << before.get_name() + "_" + after.get_name();
}

// Keeps the current data set while it is fit to stand in for the system partition's, then installs
// the latest update if it is fit and newer. Throws whatever building or installing one throws.
void settle_data_set() {
  const olm_dataset system;
  const std::string latest_path = latest_dataset_path();
  const std::string current_path = read_current_path();
  const olm_dataset current(current_path);

  const bool current_is_unfit = !current.compatible_with(system) || system > current;
  if (current_is_unfit) {
    warn("Symlink points at data incompatible with installed system");
    reset_to_system_partition();
    touch_needs_cleanup();
  }
  const olm_dataset& in_use = current_is_unfit ? system : current;

  if (latest_path.empty()) return;
  const olm_dataset latest(latest_path);
  // Against the current data set, even if that has just been given up.
  if (latest.compatible_with(system) && latest > current) {
    latest.install_links();
    if (!in_use.same_path(system)) touch_needs_cleanup();
    write_version_record(in_use, latest);
  } else {
    warn("New update not compatible or older version: %s vs. %s", latest.get_name().c_str(),
         current.get_name().c_str());
  }
}

}  // namespace

int main() {
  // A warning that fits is one write, so that what others write cannot come between its parts.
  static std::array<char, BUFSIZ> warning;
  static_cast<void>(std::setvbuf(stderr, warning.data(), _IOLBF, warning.size()));
  // A write that fails must not end a start halfway: the warnings' reader may be gone, and files
  // may have a limit.
  static_cast<void>(std::signal(SIGPIPE, SIG_IGN));
  static_cast<void>(std::signal(SIGXFSZ, SIG_IGN));
  try {
    protect_directories();
    migrate_icutz_link();
    static_cast<void>(std::remove(needs_cleanup_marker));
    static_cast<void>(std::remove("/var/db/icu"));
    try {
      settle_data_set();
    } catch (...) {
      warn("Unable to locate data; resetting to system partition");
      reset_to_system_partition();
    }
    repair_localtime_link();
    return EXIT_SUCCESS;
  } catch (...) {
    // Nothing is left to fall back to, and every failure has been reported where it happened.
    return EXIT_FAILURE;
  }
}
