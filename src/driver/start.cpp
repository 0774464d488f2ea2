#include "driver/start.h"

#include <cstdlib>
#include <fstream>
#include <string>

#include "dataset/olm_dataset.h"
#include "driver/housekeeping.h"
#include "driver/localtime.h"
#include "fs/device.h"

namespace {

// Points the links at the system partition. Prints and throws what building a data set and
// install_links do.
void reset_to_system_partition() { olm_dataset().install_links(); }

// Leaves the names of the data set that was in use and of the update that took over from it, for
// whoever asks later. Where the record cannot be written, the start goes on without it.
void write_version_record(const olm_dataset& before, const olm_dataset& after) {
  std::ofstream record = device::open_to_write(version_record);
  record << before.get_name() + "_" + after.get_name();
}

// The path of the current data set. A zoneinfo link that cannot be understood is reset, and the
// system partition's data set is then the current one.
std::string settle_current_path() {
  try {
    return current_dataset_path();
  } catch (...) {
    device::warn("Invalid current symlinks; resetting to system partition");
    reset_to_system_partition();
    return {};
  }
}

// Decides which data set the links name.
void select_dataset() {
  const olm_dataset system;
  const std::string latest_path = latest_dataset_path();
  const olm_dataset current(settle_current_path());

  const bool current_stays = may_stay(current, system);
  if (!current_stays) {
    device::warn("Symlink points at data incompatible with installed system");
    reset_to_system_partition();
    touch_needs_cleanup();
  }
  const olm_dataset& in_use = current_stays ? current : system;

  if (latest_path.empty()) return;
  const olm_dataset latest(latest_path);
  if (takes_over(latest, current, system)) {
    latest.install_links();
    if (!in_use.same_path(system)) touch_needs_cleanup();
    write_version_record(in_use, latest);
  } else {
    device::warn("New update not compatible or older version: %s vs. %s", latest.get_name().c_str(),
                 current.get_name().c_str());
  }
}

}  // namespace

int run_start() {
  try {
    protect_directories();
    migrate_icutz_link();
    device::remove(needs_cleanup_marker);
    device::remove("/var/db/icu");
    try {
      select_dataset();
    } catch (...) {
      device::warn("Unable to locate data; resetting to system partition");
      reset_to_system_partition();
    }
    repair_localtime_link();
    return EXIT_SUCCESS;
  } catch (...) {
    return EXIT_FAILURE;  // nothing is left to fall back to
  }
}
