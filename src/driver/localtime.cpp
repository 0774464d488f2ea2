#include "driver/localtime.h"

#include <cstring>
#include <string>

#include "dataset/olm_zoneinfo.h"
#include "fs/device.h"
#include "fs/file_operations.h"

namespace {

// How a link into the system's own zone files begins. Matches longer names too.
constexpr const char* system_prefix = "/usr/share/zoneinfo";

constexpr const char* default_zone = "America/Los_Angeles";
constexpr const char* default_target = "/var/db/timezone/zoneinfo/America/Los_Angeles";

void replace_localtime_link(const std::string& target) {
  device::remove(localtime_link);
  fs::create_symlink(target, localtime_link);
}

}  // namespace

std::string correct_localtime_target(const std::string& target) {
  const bool is_system_zone = target.starts_with(system_prefix);
  return is_system_zone ? zoneinfo_link + target.substr(std::strlen(system_prefix)) : "";
}

void announce_correction(const std::string& target) {
  device::warn("Correcting localtime link to %s", target.c_str());
}

void repair_localtime_link() {
  try {
    const std::string target = fs::read_symlink(localtime_link);
    if (target.starts_with(zoneinfo_link)) return;
    const std::string corrected = correct_localtime_target(target);
    if (corrected.empty()) throw -1;
    announce_correction(corrected);
    if (!fs::exists(corrected)) throw -1;
    replace_localtime_link(corrected);
  } catch (...) {
    device::warn("localtime link invalid; resetting to %s", default_zone);
    replace_localtime_link(default_target);
  }
}
