// Kills a start before each of its system calls on the device's files, and fails each such call.
#include <gtest/gtest.h>

#include <algorithm>
#include <cctype>
#include <cstdio>
#include <map>
#include <ostream>

#include "fs/file_operations.h"
#include "testbed/device.h"
#include "testbed/start_table.h"
#include "testbed/tracer.h"

namespace {

std::map<std::string, std::string> read_links() {
  std::map<std::string, std::string> links;
  for (const std::string name : {"zoneinfo", "icutz", "localtime"})
    links[name] = fs::read_symlink("/var/db/timezone/" + name);
  return links;
}

bool leads_to_whole_data_set(const std::string& target) {
  const std::string update = target.substr(0, target.rfind('/'));
  return fs::exists(target + "/+VERSION") &&
         (target == "/usr/share/zoneinfo.default" || fs::exists(update + "/icutz/icutz44l.dat"));
}

// A start, and how many of its kill points leave a link wrong that the next start doesn't heal.
struct swept_start {
  std::string name;
  int icu_link_wrong;
  int zone_lost;
};

// How CTest names it.
std::ostream& operator<<(std::ostream& out, const swept_start& start) { return out << start.name; }

// One for each start, so that they run side by side.
class sweep : public testing::TestWithParam<swept_start> {
 public:
  void SetUp() override {
    const start_table table(STARTS);
    for (const auto& row : table.cases)
      if (row.name == GetParam().name) device = row.device;
    calls = trace_start(device);
    ASSERT_FALSE(calls.empty()) << "is strace there?";
    undisturbed = read_links();
  }

  // Starts undisturbed on what another start left. Gives the links that are not as they would be
  // without that other start.
  std::string heal() {
    EXPECT_EQ(start().back(), "exit 0");
    std::string wrong;
    const auto links = read_links();
    EXPECT_TRUE(leads_to_whole_data_set(links.at("zoneinfo")));
    for (const auto& [name, target] : undisturbed) wrong += links.at(name) == target ? "" : name;
    return wrong;
  }

  std::string device;
  std::vector<traced_call> calls;
  std::map<std::string, std::string> undisturbed;
};

TEST_P(sweep, kills) {
  std::map<std::string, int> points;  // by what stays wrong
  for (const auto& call : calls) {
    SCOPED_TRACE(call.text);
    EXPECT_EQ(start_with("signal=KILL", call, device), "signal 9");
    const auto torn = read_links();
    const std::string wrong = heal();
    ++points[wrong];
    const bool between_links = torn.at("zoneinfo") == undisturbed.at("zoneinfo") &&
                               torn.at("icutz") != undisturbed.at("icutz");
    EXPECT_TRUE(wrong.empty() || (wrong == "icutz" && between_links) ||
                (wrong == "localtime" && torn.at("localtime").empty()))
        << wrong;
    const auto healed = read_links();
    EXPECT_EQ(start().back(), "exit 0");
    EXPECT_EQ(read_links(), healed);
  }
  EXPECT_EQ(points["icutz"], GetParam().icu_link_wrong);
  EXPECT_EQ(points["localtime"], GetParam().zone_lost);
  std::printf("sweep: %zu kill points, %d healed, %d ICU link wrong, %d zone lost\n", calls.size(),
              points[""], points["icutz"], points["localtime"]);
}

TEST_P(sweep, faults) {
  int faults = 0;
  int lasting = 0;
  for (const auto& call : calls) {
    for (const char* error : {"EIO", "EACCES", "ENOSPC", "EROFS"}) {
      SCOPED_TRACE(call.text + " fails with " + error);
      const std::string end = start_with(std::string("error=") + error, call, device);
      const auto links = read_links();
      EXPECT_TRUE(end == "exit 1" || (end == "exit 0" && !links.at("localtime").empty())) << end;
      EXPECT_TRUE(leads_to_whole_data_set(links.at("zoneinfo")));
      ++faults;
      lasting += heal().empty() ? 0 : 1;
    }
  }
  std::printf("sweep: %d faults, %d lasting\n", faults, lasting);
}

INSTANTIATE_TEST_SUITE_P(
    starts, sweep,
    testing::Values(swept_start{"a first update", 3, 0}, swept_start{"the next update", 3, 0},
                    swept_start{"nothing new, and the marker of the last start", 0, 0},
                    swept_start{"a system upgraded past the update", 1, 0},
                    swept_start{"an incompatible update", 0, 0}, swept_start{"no links", 3, 0},
                    swept_start{"an ICU link of earlier systems", 0, 0},
                    swept_start{"a zone among the system's own", 0, 1}),
    [](const auto& start) {
      std::string name = start.param.name;
      std::replace_if(
          name.begin(), name.end(), [](char c) { return std::isalnum(c) == 0; }, '_');
      return name;
    });

}  // namespace
