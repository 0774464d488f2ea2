// Kills starts before each of their system calls on the device's files, and fails each such call.
#include <gtest/gtest.h>

#include <algorithm>
#include <cstdio>
#include <fstream>
#include <ostream>

#include "fs/file_operations.h"
#include "starts.h"

namespace {

// A start, and how often its kills and faults leave a link wrong that no later start heals.
struct swept_start {
  std::string name;
  int icu_wrong_by_kill = 0;
  int zone_lost_by_kill = 0;
  int icu_wrong_by_fault = 0;
};

// How CTest names it.
std::ostream& operator<<(std::ostream& out, const swept_start& start) { return out << start.name; }

// One for each start, so that they run side by side.
class sweep : public testing::TestWithParam<swept_start> {};

// The links as they are.
struct link_targets {
  std::string zoneinfo = fs::read_symlink(at::zoneinfo);
  std::string icutz = fs::read_symlink(at::icutz);
  std::string zone = fs::read_symlink(at::zone);

  bool operator==(const link_targets&) const = default;

  // Where the ICU link belongs, with these zone files: nowhere with the system partition's.
  [[nodiscard]] std::string own_icutz() const {
    const bool on_system = zoneinfo == at::system_zoneinfo;
    return on_system ? "" : zoneinfo.substr(0, zoneinfo.rfind('/')) + "/icutz";
  }
  [[nodiscard]] bool lead_to_whole_data_set() const {
    return fs::exists(zoneinfo + "/+VERSION") &&
           (own_icutz().empty() || fs::exists(own_icutz() + "/icutz44l.dat"));
  }
};

// The links after an undisturbed start on what another one left.
link_targets heal() {
  EXPECT_EQ(start().back(), "exit 0");
  return {};
}

bool has(const std::string& in, const char* text) { return in.find(text) != std::string::npos; }

// The calls on the device's files that a start makes, as strace prints them, each with what
// strace needs to find it again. No call of a start closes what is not open.
std::vector<std::pair<std::string, std::string>> trace_start() {
  start({"-y", "-o", "/var/calls"});
  std::vector<std::pair<std::string, std::string>> calls;
  std::map<std::string, int> numbers;
  std::ifstream lines("/var/calls");
  for (std::string line; std::getline(lines, line);) {
    const std::string name = line.substr(0, line.find('('));
    const std::string number = std::to_string(++numbers[name]);
    EXPECT_FALSE(has(line, "EBADF")) << line;
    if (line.starts_with("write(2")) continue;  // a warning about a file
    if (has(line, "/var/db") || has(line, "/usr/share"))
      calls.emplace_back(line, "inject=" + name + ":when=" + number + ":");
  }
  EXPECT_FALSE(calls.empty()) << "is strace there?";
  return calls;
}

TEST_P(sweep, leaves_a_whole_data_set) {
  const auto row = std::find_if(starts.begin(), starts.end(),
                                [](const auto& one) { return one.name == GetParam().name; });
  ASSERT_NE(row, starts.end());
  lay_out(row->before);
  const auto calls = trace_start();
  const link_targets undisturbed;
  std::map<std::string, int> found;
  for (const auto& [call, injection] : calls) {
    for (const std::string what :
         {"signal=KILL", "error=EIO", "error=EACCES", "error=ENOSPC", "error=EROFS"}) {
      SCOPED_TRACE(what + " at " + call);
      lay_out(row->before);
      const report heard = start({"-e", injection + what});
      const link_targets left;
      const link_targets healed = heal();
      EXPECT_TRUE(healed.lead_to_whole_data_set());
      if (what == "signal=KILL") {
        ++found["kills"];
        EXPECT_EQ(heard.back(), "signal 9");
        EXPECT_EQ(healed.zoneinfo, undisturbed.zoneinfo);
        EXPECT_EQ(heal(), healed);
        if (healed.icutz != undisturbed.icutz) {
          ++found["kills leave the ICU link wrong"];
          EXPECT_EQ(left.zoneinfo, undisturbed.zoneinfo);
        }
        if (healed.zone != undisturbed.zone) {
          ++found["kills lose the zone"];
          EXPECT_EQ(left.zone, "");
        }
        continue;
      }
      ++found["faults"];
      EXPECT_TRUE(left.lead_to_whole_data_set());
      EXPECT_EQ(heard.back(), left.zone.empty() ? "exit 1" : "exit 0");
      if (healed != undisturbed) ++found["faults have a lasting effect"];
      const bool same = left.zoneinfo == undisturbed.zoneinfo && left.icutz == undisturbed.icutz;
      if (!same && left.icutz != left.own_icutz()) {
        ++found["faults leave the ICU link wrong"];
        EXPECT_TRUE(has(call, "unlink") && has(call, "\"/var/db/timezone/icutz\""));
        EXPECT_EQ(healed.icutz, left.icutz);
      }
    }
  }
  for (const auto& [what, times] : found) std::printf("sweep: %d %s\n", times, what.c_str());
  EXPECT_EQ(found["kills leave the ICU link wrong"], GetParam().icu_wrong_by_kill);
  EXPECT_EQ(found["kills lose the zone"], GetParam().zone_lost_by_kill);
  EXPECT_EQ(found["faults leave the ICU link wrong"], GetParam().icu_wrong_by_fault);
}

INSTANTIATE_TEST_SUITE_P(
    starts, sweep,
    testing::Values(swept_start{"a first update", 3}, swept_start{"the next update", 3},
                    swept_start{"nothing new, and the marker of the last start"},
                    swept_start{"a system upgraded past the update", 1, 0, 4},
                    swept_start{"an incompatible update"}, swept_start{"no links", 3},
                    swept_start{"an ICU link of earlier systems"},
                    swept_start{"a zone among the system's own", 0, 1}));

}  // namespace
