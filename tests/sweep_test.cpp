// Kills starts before each of their system calls on the device's files, and fails each such call.
#include <gtest/gtest.h>

#include <algorithm>
#include <cstdio>
#include <fstream>

#include "fs/file_operations.h"
#include "starts.h"

namespace {

// One for each start, so that they run side by side.
class sweep : public testing::TestWithParam<std::string> {};

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
                                [](const auto& one) { return one.name == GetParam(); });
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
        // What stays wrong is known: a kill between two steps that belong together.
        found["kills leave the ICU link wrong"] += healed.icutz != undisturbed.icutz ? 1 : 0;
        found["kills lose the zone"] += healed.zone != undisturbed.zone ? 1 : 0;
        EXPECT_TRUE(healed.icutz == undisturbed.icutz || left.zoneinfo == undisturbed.zoneinfo);
        EXPECT_TRUE(healed.zone == undisturbed.zone || left.zone.empty());
        continue;
      }
      ++found["faults"];
      EXPECT_TRUE(left.lead_to_whole_data_set());
      EXPECT_EQ(heard.back(), left.zone.empty() ? "exit 1" : "exit 0");
      found["faults have a lasting effect"] += healed != undisturbed ? 1 : 0;
      const bool is_apart = left.icutz != left.own_icutz() && left.icutz != undisturbed.icutz;
      found["faults leave the ICU link wrong"] += is_apart ? 1 : 0;
      EXPECT_TRUE(!is_apart || has(call, "unlink(\"/var/db/timezone/icutz\""));
    }
  }
  for (const auto& [what, times] : found) std::printf("sweep: %d %s\n", times, what.c_str());
}

INSTANTIATE_TEST_SUITE_P(starts, sweep,
                         testing::Values("a first update", "the next update",
                                         "nothing new, and the marker of the last start",
                                         "a system upgraded past the update",
                                         "an incompatible update", "no links",
                                         "an ICU link of earlier systems",
                                         "a zone among the system's own"));

}  // namespace
