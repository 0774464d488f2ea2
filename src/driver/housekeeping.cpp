#include "driver/housekeeping.h"

#include <sys/stat.h>

#include "dataset/olm_dataset.h"
#include "dataset/olm_icu.h"
#include "fs/data_protection.h"
#include "fs/device.h"
#include "fs/file_operations.h"
#include "fs/olm_descriptor.h"

void protect_directory(const std::string& directory) {
  device::set_protection_class(directory.c_str(), PROTECTION_CLASS_D);
}

void protect_directories() {
  protect_directory(state_directory);
  protect_directory(update_area);
}

void migrate_icutz_link() {
  if (fs::exists(legacy_icutz_link) && !fs::exists(icutz_link)) {
    try {
      fs::create_symlink(fs::read_symlink(legacy_icutz_link), icutz_link);
    } catch (...) {
      device::warn("Could not migrate /var/db/icutz to /var/db/timezone/icutz");
    }
  }
  if (fs::exists(legacy_icutz_link)) {
    try {
      fs::remove(legacy_icutz_link);
    } catch (...) {
      device::warn("Could not remove /var/db/icutz");
    }
  }
}

void touch_needs_cleanup() {
  constexpr mode_t anyone_may_read_and_write = 0666;
  olm_descriptor marker(
      device::create_file(needs_cleanup_marker, PROTECTION_CLASS_D, anyone_may_read_and_write));
  struct stat status {};
  if (marker.is_open() && fstat(marker.get(), &status) == 0 && marker.close() == 0) return;
  device::warn("Cannot touch file %s", needs_cleanup_marker);
}
