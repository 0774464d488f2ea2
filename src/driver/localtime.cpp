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

void repair_localtime_link() {
  try {
    std::string target = fs::read_symlink(localtime_link);
    if (target.starts_with(zoneinfo_link)) return;
    if (!target.starts_with(system_prefix)) throw -1;
    target.replace(0, std::strlen(system_prefix), zoneinfo_link);
    device::warn("Correcting localtime link to %s", target.c_str());
    if (!fs::exists(target)) throw -1;
    replace_localtime_link(target);
  } catch (...) {
    device::warn("localtime link invalid; resetting to %s", default_zone);
    replace_localtime_link(default_target);
  }
}
