// Kills a start before each of its system calls on the device's files, and fails each such call.
#include <gtest/gtest.h>

#include <algorithm>
#include <cctype>
#include <cstdio>
#include <map>

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

// The link that a kill before call `at` may leave wrong: the ICU link, once the zoneinfo link of
// the same data set is made and it is not, and the zone's, while it is gone.
std::string find_open_window(const std::vector<traced_call>& calls, std::size_t at) {
  bool zoneinfo_is_made = false;
  bool zone_is_gone = false;
  std::string still_to_change;
  for (std::size_t i = 0; i < calls.size(); ++i) {
    const auto does = [&](const std::string& what, const std::string& link) {
      return calls[i].name == what && calls[i].text.ends_with("/" + link + "\") = 0");
    };
    if (i < at && does("symlink", "zoneinfo")) zoneinfo_is_made = true;
    if (i < at && does("unlink", "localtime")) zone_is_gone = true;
    if (i >= at && (does("symlink", "icutz") || does("unlink", "icutz")))
      still_to_change += "icutz";
    if (i >= at && does("symlink", "localtime")) still_to_change += "localtime";
  }
  if (zoneinfo_is_made && still_to_change.starts_with("icutz")) return "icutz";
  return zone_is_gone ? still_to_change : "";
}

// One for each start, so that they run side by side.
class sweep : public testing::TestWithParam<std::string> {};

TEST_P(sweep, kills_and_faults) {
  const start_table table(STARTS);
  const auto swept = std::find_if(table.cases.begin(), table.cases.end(),
                                  [](const auto& one) { return one.name == GetParam(); });
  ASSERT_NE(swept, table.cases.end());
  const std::string& device = swept->device;
  const std::vector<traced_call> calls = trace_start(device);
  ASSERT_FALSE(calls.empty()) << "is strace there?";
  const auto undisturbed = read_links();
  std::map<std::string, int> outcomes;  // by the link that stays wrong
  int faults = 0;
  for (std::size_t i = 0; i < calls.size(); ++i) {
    SCOPED_TRACE(calls[i].text);
    EXPECT_EQ(start_with("signal=KILL", calls[i], device), "signal 9");
    EXPECT_EQ(start().back(), "exit 0");
    const auto links = read_links();
    EXPECT_TRUE(leads_to_whole_data_set(links.at("zoneinfo")));
    std::string wrong;
    for (const auto& [link, target] : undisturbed) wrong += links.at(link) == target ? "" : link;
    EXPECT_TRUE(wrong.empty() || wrong == find_open_window(calls, i)) << wrong;
    EXPECT_EQ(start().back(), "exit 0");
    EXPECT_EQ(read_links(), links);
    ++outcomes[wrong];
    for (const char* error : {"EIO", "EACCES", "ENOSPC", "EROFS"}) {
      const std::string end = start_with(std::string("error=") + error, calls[i], device);
      EXPECT_TRUE(end == "exit 0" || end == "exit 1") << error << ": " << end;
      EXPECT_EQ(start().back(), "exit 0") << error;
      EXPECT_TRUE(leads_to_whole_data_set(read_links().at("zoneinfo"))) << error;
      ++faults;
    }
  }
  std::printf("sweep: %zu kill points, %d healed, %d ICU link wrong, %d zone lost, %d faults: %s\n",
              calls.size(), outcomes[""], outcomes["icutz"], outcomes["localtime"], faults,
              GetParam().c_str());
}

INSTANTIATE_TEST_SUITE_P(
    starts, sweep,
    testing::Values("a first update", "the next update",
                    "nothing new, and the marker of the last start",
                    "a system upgraded past the update", "an incompatible update", "no links",
                    "an ICU link of earlier systems", "a zone among the system's own"),
    [](const auto& start) {
      std::string name = start.param;
      std::replace_if(
          name.begin(), name.end(), [](char c) { return std::isalnum(c) == 0; }, '_');
      return name;
    });

}  // namespace
