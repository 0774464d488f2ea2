#include "check/halves.h"

#include <algorithm>
#include <array>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <optional>
#include <set>
#include <vector>

#include "check/icu_bundle.h"
#include "check/icu_file.h"
#include "check/icu_names.h"
#include "check/icu_zones.h"

namespace {

using std::string;
namespace chrono = std::chrono;

constexpr int last_year = 2100;
constexpr int first_year_of_own_zones = 1970;

string print_date(instant when) {
  const auto day = chrono::floor<chrono::days>(chrono::sys_seconds(chrono::seconds(when)));
  const chrono::year_month_day date(day);
  std::array<char, 16> text{};
  static_cast<void>(
      std::snprintf(text.data(), text.size(), "%d-%02u-%02u", static_cast<int>(date.year()),
                    static_cast<unsigned>(date.month()), static_cast<unsigned>(date.day())));
  return text.data();
}

string print_offset(std::int32_t offset) {
  const std::int32_t seconds = std::abs(offset);
  std::array<char, 16> text{};
  const char* const format = seconds % 60 == 0 ? "%c%02d:%02d" : "%c%02d:%02d:%02d";
  static_cast<void>(std::snprintf(text.data(), text.size(), format, offset < 0 ? '-' : '+',
                                  seconds / 3600, seconds / 60 % 60, seconds % 60));
  return text.data();
}

// What ICU has to agree with.
struct expectation {
  const olm_clocks& clocks;
  string owners;     // what to call them
  bool has_icu_dst;  // whether daylight saving time is the same to both
};

// All instants around which one of both may change, from `from` to the end, in order.
std::vector<instant> list_instants(const olm_clocks& one, const olm_clocks& other, instant from) {
  const instant to = find_begin(last_year + 1);
  std::vector<instant> changes;
  one.list_changes(from, to, changes);
  other.list_changes(from, to, changes);
  std::vector<instant> instants = {from};
  for (const instant change : changes) instants.insert(instants.end(), {change - 1, change});
  std::sort(instants.begin(), instants.end());
  return instants;
}

// The first difference in their offsets, or else in daylight saving time, from `from` on; empty if
// there is none.
string find_difference(const expectation& expected, const olm_clocks& icu, instant from) {
  string difference;
  for (const instant when : list_instants(expected.clocks, icu, from)) {
    const local_time one = expected.clocks.find(when);
    const local_time other = icu.find(when);
    const bool has_same_dst = !expected.has_icu_dst || one.is_dst == other.is_dst;
    if (one.offset == other.offset && (has_same_dst || !difference.empty())) continue;
    const string begin = "from " + print_date(when == from ? from : when + one.offset) + ' ' +
                         expected.owners + " have ";
    if (one.offset != other.offset)
      return begin + print_offset(one.offset) + ", ICU's " + print_offset(other.offset);
    difference = begin + (one.is_dst ? "" : "no ") + "daylight saving time, ICU's do" +
                 (other.is_dst ? "" : " not");
  }
  return difference;
}

// As above, for the zone `name`.
string find_difference(const halves& halves, const string& name, const olm_clocks& icu) {
  const instant since = find_begin(halves.since);
  const auto compare_with = [&](const string& zone, const string& owners) -> string {
    const auto found = halves.zones.find(zone);
    if (found == halves.zones.end() || found->second == nullptr) return "";
    const olm_zone_file& file = *found->second;
    if (file.has_leap_seconds()) return "the zone files count leap seconds, which ICU does not";
    return find_difference({file, owners, !file.has_negative_dst(since)}, icu, since);
  };
  if (halves.zones.contains(name)) return compare_with(name, "the zone files");
  if (const string other = find_namesake(name); !other.empty())
    return compare_with(other, "the zone files of " + other);
  if (const auto own = make_own_zone(name); own != nullptr) {
    const instant from = std::max(since, find_begin(first_year_of_own_zones));
    return find_difference({*own, "its rules", true}, icu, from);
  }
  return "ICU has such a zone, the zone files do not";
}

void compare_zone(const halves& halves, const string& name, const canary_report& report) {
  const auto icu = find_icu_zone(name);
  string reason = halves.zones.contains(name) ? "the zone files have such a zone, ICU does not"
                                              : "ICU lists it, but does not find it";
  if (icu != nullptr) {
    reason = ask_about_zone(name);
    if (reason.empty()) reason = find_difference(halves, name, *icu);
  }
  if (!reason.empty()) report.add_reason(name + ": " + reason);
}

}  // namespace

void compare_halves(const halves& halves, const canary_report& report) {
  set_icu_directory(halves.icu_directory);
  bool is_read = true;
  for (const char* const name : icu_files) {
    const string file = string(name) + icu_file_ending;
    report.begin_step(file);
    if (walk_icu_file(name) && has_read(file)) continue;
    report.add_reason(file + ": ICU cannot read it");
    is_read = false;
  }
  if (!is_read) return;
  const string version = get_icu_version();
  if (!halves.version.empty() && version != halves.version) {
    report.add_reason("the zone files say that they are " + halves.version +
                      ", ICU's that they are " + version);
  }
  std::set<string> names;
  for (const auto& [name, file] : halves.zones) names.insert(name);
  for (const string& name : list_icu_zones()) names.insert(name);
  for (const string& name : names) {
    report.begin_step(name);
    compare_zone(halves, name, report);
  }
}
