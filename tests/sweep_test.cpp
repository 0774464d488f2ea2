// Kills boots and updates before each of their system calls on the device's files, and fails each
// such call.
#include <gtest/gtest.h>

#include <algorithm>
#include <array>
#include <cstdio>
#include <fstream>

#include "archives.h"
#include "fs/file_operations.h"

namespace {

// One for each start, so that they run side by side.
class sweep : public testing::TestWithParam<std::string> {};

// Whether both links lead to the halves of one data set. With the system partition's zone files, an
// ICU link is none of an update.
bool are_halves_of_one() {
  const std::string zoneinfo = fs::read_symlink(at::zoneinfo);
  const std::string icutz = fs::read_symlink(at::icutz);
  if (!fs::exists(zoneinfo + "/+VERSION")) return false;
  if (zoneinfo == at::system_zoneinfo) return !icutz.starts_with(at::updates);
  return icutz == zoneinfo.substr(0, zoneinfo.rfind('/')) + "/icutz" &&
         fs::exists(icutz + "/icutz44l.dat");
}

// The device after an undisturbed boot, without what is made for those who ask later.
device heal() {
  EXPECT_EQ(boot().back(), "exit 0");
  return change(look(), gone(at::marker) + gone(at::record));
}

bool has(const std::string& in, const char* text) { return in.find(text) != std::string::npos; }

// The calls on the device's files that a program makes when `run` with options for strace, as that
// prints them, each with what strace needs to find it again. No call closes what is not open.
std::vector<std::pair<std::string, std::string>> trace_calls(report (*run)(const report&)) {
  run({"-y", "-o", "/var/calls"});
  std::vector<std::pair<std::string, std::string>> calls;
  std::map<std::string, int> numbers;
  std::ifstream lines("/var/calls");
  for (std::string line; std::getline(lines, line);) {
    const std::string name = line.substr(0, line.find('('));
    const std::string number = std::to_string(++numbers[name]);
    EXPECT_FALSE(has(line, "EBADF")) << line;
    // A warning about a file; and the program's own start, with a path among its arguments.
    if (line.starts_with("write(2") || line.starts_with("execve(")) continue;
    if (has(line, "/var/db") || has(line, "/usr/share"))
      calls.emplace_back(line, "inject=" + name + ":when=" + number + ":");
  }
  EXPECT_FALSE(calls.empty()) << "is strace there?";
  return calls;
}

// After a kill, the next boot ends as it would have without; after a failed call, with both halves
// of one data set.
TEST_P(sweep, is_healed_by_the_next_boot) {
  const auto row = std::find_if(starts.begin(), starts.end(),
                                [](const auto& one) { return one.name == GetParam(); });
  ASSERT_NE(row, starts.end());
  lay_out(row->before);
  const auto calls = trace_calls(boot);
  const device undisturbed = heal();
  std::map<std::string, int> found;
  for (const auto& [call, injection] : calls) {
    for (const std::string what :
         {"signal=KILL", "error=EIO", "error=EACCES", "error=ENOSPC", "error=EROFS"}) {
      SCOPED_TRACE(what + " at " + call);
      lay_out(row->before);
      const report heard = boot({"-e", injection + what});
      const device healed = heal();
      EXPECT_TRUE(are_halves_of_one());
      if (what == "signal=KILL") {
        ++found["kills, all healed"];
        EXPECT_EQ(heard.back(), "signal 9");
        EXPECT_EQ(healed, undisturbed);
      } else {
        ++found["faults, all with both halves of one data set"];
        EXPECT_TRUE(heard.back().starts_with("exit ")) << heard.back();
        found["faults have a lasting effect"] += healed != undisturbed ? 1 : 0;
      }
    }
  }
  for (const auto& [what, times] : found) std::printf("sweep: %d %s\n", times, what.c_str());
}

INSTANTIATE_TEST_SUITE_P(
    starts, sweep,
    testing::Values("a first update", "the next update",
                    "nothing new, and the marker of the last start",
                    "a system upgraded past the update", "an incompatible update",
                    "a system upgraded to the version of the latest update", "no links",
                    "an ICU link of earlier systems", "a zone among the system's own",
                    "a zone that only the update in use has",
                    "a zone and an ICU link that were lost, and what else kills leave"));

const std::string published = "/var/2020b.1.0";
const std::string third = at::updates + "2020b.1.0";

struct update_sweep_case {
  std::string name;
  entries before;
  report (*run)(const report& tracing);
};

template <const char*... words>
report run_update(const report& tracing) {
  return ask({words...}, tracing, "tzdata-update");
}
constexpr char archive_path[] = "/var/2020b.1.0.tar";
constexpr char directory_path[] = "/var/db/timezone/tz/2020b.1.0";
constexpr char back[] = "--back";

const entries marked = file(first + "/.tzdata-update", "x") + file(second + "/.tzdata-update", "x");
const std::vector<update_sweep_case> update_sweep_cases = {
    {"archive", on_first + marked, run_update<archive_path>},
    {"directory", on_first + marked + update(third), run_update<directory_path>},
    {"back", on_second, run_update<back>},
};

class update_sweep : public testing::TestWithParam<std::string> {
 protected:
  void SetUp() override { make_program("tzdata-check", "exit 0"); }
};

// What a start would make the zoneinfo link.
std::string find_next() { return ask({"--query"}).at(9); }

// The next start is told of the update or it is not, and another run ends as if nothing had been.
TEST_P(update_sweep, is_finished_by_the_next_one) {
  const auto row = std::find_if(update_sweep_cases.begin(), update_sweep_cases.end(),
                                [](const auto& one) { return one.name == GetParam(); });
  const auto lay_out_anew = [&] {
    lay_out(row->before);
    publish(published, pack_all(good_update) + tar_end);
  };
  lay_out_anew();
  const bool is_back = row->run == run_update<back>;
  const std::string before = find_next();
  const auto calls = trace_calls(row->run);
  const std::string after = find_next();
  EXPECT_NE(after, before);
  const device undisturbed = look();
  std::map<std::string, int> found;
  std::map<std::string, int> seen;
  for (const auto& [call, injection] : calls) {
    const std::array looks = {"statx(", "newfstatat(", "statfs(", "readlink(",
                              "read(",  "getdents64(", "close(",  "openat("};
    const bool is_look = std::any_of(looks.begin(), looks.end(), [&line = call](const char* name) {
      return line.starts_with(name) && !has(line, "O_CREAT");
    });
    // Forecasts look at the same things again and again. Nothing is lost with one of these looks.
    if (is_look && seen[call.substr(0, call.rfind(" = "))]++ > 0) continue;
    for (const std::string& what :
         is_look ? report{"error=EIO"}
                 : report{"error=EIO", "error=ENOSPC", "error=EROFS", "signal=KILL"}) {
      SCOPED_TRACE(what + " at " + call);
      lay_out_anew();
      const std::string end = row->run({"-e", injection + what}).back();
      const std::string next = find_next();
      // Where it cannot be seen that the update before fits, the system partition is gone back to.
      const bool is_other =
          is_back && what != "signal=KILL" && next == "Next-Zoneinfo: " + at::system_zoneinfo;
      EXPECT_TRUE(next == before || next == after || is_other) << next;
      EXPECT_TRUE(end != "exit 0" || next != before || is_back);
      if (what == "signal=KILL") {
        ++found["kills of updates, all finished"];
        EXPECT_EQ(end, "signal 9");
      } else {
        ++found["faults in updates, all finished"];
        EXPECT_TRUE(end.starts_with("exit ")) << end;
      }
      EXPECT_EQ(row->run({}).back(), "exit 0");
      EXPECT_TRUE(is_other || look() == undisturbed);
    }
  }
  for (const auto& [what, times] : found) std::printf("sweep: %d %s\n", times, what.c_str());
}

INSTANTIATE_TEST_SUITE_P(update, update_sweep, testing::Values("archive", "directory", "back"));

}  // namespace
