// One start: decides which time-zone data set the device uses and makes the links say so.
#include <array>
#include <csignal>
#include <cstdio>
#include <cstdlib>
#include <fstream>
#include <string>

#include "dataset/olm_dataset.h"
#include "dataset/olm_selection.h"
#include "driver/housekeeping.h"
#include "driver/localtime.h"
#include "fs/device.h"

namespace {

// Points the links at the system partition. Prints and throws what building a data set and
// install_links do.
void reset_to_system_partition() { olm_dataset().install_links(); }

// Leaves the names of the data set that was in use and of the update that took over from it, for
// whoever asks later. A record that cannot be written is done without.
void write_version_record(const olm_dataset& before, const olm_dataset& after) {
  std::ofstream record = device::open_to_write("/var/db/timezone/TZVersionDiffRecord");
  record << before.get_name() + "_" + after.get_name();
}

// What a start does, and says, at each turn that the choice takes.
class olm_start final : public olm_selection {
  void reset_bad_link() override {
    device::warn("Invalid current symlinks; resetting to system partition");
    reset_to_system_partition();
  }

  void give_up(const olm_dataset& /*current*/, const olm_dataset& /*system*/) override {
    device::warn("Symlink points at data incompatible with installed system");
    reset_to_system_partition();
    touch_needs_cleanup();
  }

  void install(const olm_dataset& latest, const olm_dataset& in_use,
               const olm_dataset& system) override {
    latest.install_links();
    if (!in_use.same_path(system)) touch_needs_cleanup();
    write_version_record(in_use, latest);
  }

  void refuse(const olm_dataset& latest, const olm_dataset& current,
              const olm_dataset& /*system*/) override {
    device::warn("New update not compatible or older version: %s vs. %s", latest.get_name().c_str(),
                 current.get_name().c_str());
  }
};

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
    device::remove(needs_cleanup_marker);
    device::remove("/var/db/icu");
    try {
      olm_start().select();
    } catch (...) {
      device::warn("Unable to locate data; resetting to system partition");
      reset_to_system_partition();
    }
    repair_localtime_link();
    return EXIT_SUCCESS;
  } catch (...) {
    // Nothing is left to fall back to, and every failure has been reported where it happened.
    return EXIT_FAILURE;
  }
}
