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
#include "driver/housekeeping.h"
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

// The place that the ICU link names with `target`, without regard to other links.
std::string get_named_place(const std::string& target) {
  return fs::simplify_path(target.starts_with('/') ? target : state_directory + target, false);
}

// Whether `target`, which the ICU link holds, is below the updates' directory, or leads there.
bool is_of_update(const std::string& target) {
  const std::string updates = fs::simplify_path(update_area, true) + '/';
  return get_named_place(target).starts_with(update_area) ||
         fs::simplify_path(icutz_link, true).starts_with(updates);
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
  const std::string current = fs::peek_symlink(zoneinfo_link);
  if (!find_dataset_path(current) || !zone.starts_with('/')) return false;
  std::vector<std::string> directories = {system_zoneinfo_directory, current};
  const std::string latest = fs::peek_symlink(latest_link);
  if (latest.starts_with(update_area)) directories.push_back(latest + update_zoneinfo_directory);
  return std::all_of(directories.begin(), directories.end(),
                     [&](const std::string& directory) { return fs::exists(directory + zone); });
}

// A start removes a link before it makes the new one, and settles the links one by one. A boot that
// was killed meanwhile may have left what tells the next one too little: no zone, or the system
// partition in use, which an update of the same version does not replace. So where a start may do
// that, a spare keeps what a link held until the start is over.
void keep_spare(const char* link, const std::string& target) {
  static_cast<void>(device::symlink(target.c_str(), fs::get_spare_path(link).c_str()));
}

void keep_zoneinfo() {
  const std::string target = fs::peek_symlink(zoneinfo_link);
  const std::string latest = fs::peek_symlink(latest_link);
  const auto path = find_dataset_path(target);
  const bool has_icutz = !fs::peek_symlink(icutz_link).empty() || errno != ENOENT;
  const bool is_current = latest.empty() || latest == path;
  const bool is_settled = path && (path->empty() ? !has_icutz : is_current && do_halves_fit());
  // A link that cannot be understood is as good as none.
  if (!is_settled && (has_icutz || !target.empty()))
    keep_spare(zoneinfo_link, target.empty() ? "none" : target);
}

// Better than a spare is to correct the link here, in one step, where each outcome of the start
// would do the same.
void keep_zone() {
  const std::string target = fs::peek_symlink(localtime_link);
  const std::string corrected = correct_localtime_target(target);
  if (corrected.empty()) return;
  if (!exists_everywhere(corrected.substr(std::strlen(zoneinfo_link)))) {
    keep_spare(localtime_link, target);
  } else if (fs::replace_symlink(corrected, localtime_link)) {
    announce_correction(corrected);
  }
}

void remove_spare(const char* link) { device::remove(fs::get_spare_path(link).c_str()); }

// Makes a link lead where its spare does: where it led before the start that was killed, or where
// whoever goes back from an update wants it.
void restore(const char* link) {
  const std::string spare = fs::get_spare_path(link);
  const std::string target = fs::peek_symlink(spare);
  if (target.empty() || target == fs::peek_symlink(link)) {
    remove_spare(link);
  } else if (device::rename(spare.c_str(), link) == 0) {
    device::warn("Restoring link %s to %s", link, target.c_str());
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
  const auto named = find_dataset_path(get_named_place(target));
  if (named && *named + update_icu_directory != fs::simplify_path(*own, false)) return false;
  return !target.empty() && fs::simplify_path(icutz_link, true) == fs::simplify_path(*own, true);
}

int run_boot() {
  try {
    restore(zoneinfo_link);
    restore(localtime_link);
    remove_spare(icutz_link);
    keep_zone();
    keep_zoneinfo();
  } catch (...) {
  }  // the start sees to what it can by itself
  errno = 0;
  const int status = run_start();
  try {
    remove_spare(localtime_link);
    remove_spare(zoneinfo_link);
    mend_icutz_link();
  } catch (...) {
  }  // the next boot mends it
  return status;
}
