#include "boot/boot.h"

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <optional>
#include <string>
#include <vector>

#include "dataset/olm_dataset.h"
#include "dataset/olm_icu.h"
#include "dataset/olm_zoneinfo.h"
#include "driver/localtime.h"
#include "driver/start.h"
#include "fs/device.h"
#include "fs/file_operations.h"

namespace {

// Where the ICU data lie that belong to the zoneinfo link; empty for the system partition. None
// where that link names no data set.
std::optional<std::string> find_own_icu_directory() {
  auto path = find_dataset_path(fs::peek_symlink(zoneinfo_link));
  if (path && !path->empty()) *path += update_icu_directory;
  return path;
}

// Whether `target`, which the ICU link holds, is below the updates' directory, or leads there.
bool is_of_update(const std::string& target) {
  const std::string place = fs::simplify_path(icutz_link, true) + '/';
  return fs::simplify_path(target, false).starts_with(update_area) ||
         place.starts_with(fs::simplify_path(update_area, true) + '/');
}

void mend_icutz_link() {
  if (do_halves_fit()) return;
  const std::string own = find_own_icu_directory().value_or("");
  const std::string target = fs::peek_symlink(icutz_link);
  if (!own.empty()) {
    if (fs::replace_symlink(own, icutz_link)) {
      device::warn("Correcting ICU link to %s", own.c_str());
    } else {
      device::warn("Could not correct ICU link to %s", own.c_str());
    }
  } else if (device::unlink(icutz_link) == 0) {
    device::warn("Removing ICU link to %s", target.c_str());
  } else {
    device::warn("Could not remove ICU link to %s", target.c_str());
  }
}

// Whether `zone`, a path within a data set's zone files, exists in each data set that a start can
// end with: the system partition's, the current one and the latest.
bool exists_everywhere(const std::string& zone) {
  std::vector<std::string> directories = {system_zoneinfo_directory};
  const std::string current = fs::peek_symlink(zoneinfo_link);
  if (find_dataset_path(current)) directories.push_back(current);
  const std::string latest = fs::peek_symlink(latest_link);
  if (latest.starts_with(update_area)) directories.push_back(latest + update_zoneinfo_directory);
  return std::all_of(directories.begin(), directories.end(),
                     [&](const std::string& directory) { return fs::exists(directory + zone); });
}

// A start removes the local-time link before it makes the corrected one; a kill between the two
// would lose the zone. So the link is corrected here, in one step, where each outcome of the start
// would do the same. Elsewhere a spare keeps the zone until the start is over.
void keep_zone() {
  const std::string target = fs::peek_symlink(localtime_link);
  const std::string corrected = correct_localtime_target(target);
  if (corrected.empty()) return;
  if (!exists_everywhere(corrected.substr(std::strlen(zoneinfo_link)))) {
    const std::string spare = fs::get_spare_path(localtime_link);
    static_cast<void>(device::symlink(target.c_str(), spare.c_str()));
  } else if (fs::replace_symlink(corrected, localtime_link)) {
    announce_correction(corrected);
  }
}

// Puts the spare in the place of a local-time link that is lost; else removes it.
void settle_zone() {
  const std::string spare = fs::get_spare_path(localtime_link);
  const bool is_lost = fs::peek_symlink(localtime_link).empty() && errno == ENOENT;
  const std::string target = is_lost ? fs::peek_symlink(spare) : "";
  if (target.empty()) {
    device::remove(spare.c_str());
  } else if (device::rename(spare.c_str(), localtime_link) == 0) {
    device::warn("Restoring localtime link to %s", target.c_str());
  }
}

}  // namespace

bool do_halves_fit() {
  const auto own = find_own_icu_directory();
  const std::string target = fs::peek_symlink(icutz_link);
  if (!own) return true;
  if (own->empty()) return target.empty() || !is_of_update(target);
  if (target == *own) return true;
  // The name of another update is wrong, even if that leads to this one for now.
  const auto named = find_dataset_path(fs::simplify_path(target, false));
  if (named && *named + update_icu_directory != fs::simplify_path(*own, false)) return false;
  return !target.empty() && fs::simplify_path(icutz_link, true) == fs::simplify_path(*own, true);
}

int run_boot() {
  try {
    settle_zone();
    device::remove(fs::get_spare_path(icutz_link).c_str());
    keep_zone();
  } catch (...) {
  }  // the start sees to what it can by itself
  const int status = run_start();
  try {
    settle_zone();
    mend_icutz_link();
  } catch (...) {
  }  // the next boot mends it
  return status;
}
