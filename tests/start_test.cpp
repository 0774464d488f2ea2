// Whole starts of the built program.
#include <gtest/gtest.h>
#include <unistd.h>

#include <array>
#include <fstream>

#include "testbed/device.h"
#include "testbed/start_table.h"

namespace {

TEST(start, each_case) {
  const start_table table(STARTS);
  ASSERT_FALSE(table.cases.empty());
  for (const auto& [name, device, heard, after] : table.cases) {
    SCOPED_TRACE(name);
    new_device(device);
    const auto inputs = look_at_inputs();
    EXPECT_EQ(start(), heard);
    EXPECT_EQ(look(), list(after));
    EXPECT_EQ(look_at_inputs(), inputs);
  }
}

TEST(start, crowded_update) {
  const std::string directory = "/var/db/timezone/tz/2020a.1.0/icutz/";
  start_table table(STARTS);
  new_device(table.states["on system"]);
  for (int i = 0; i < 100'000; ++i) std::ofstream(directory + std::to_string(i));
  EXPECT_EQ(start(), report{"exit 0"});
  EXPECT_TRUE(look().contains("TZVersionDiffRecord = 2019c.1.0_2020a.1.0"));
}

// The first warning meets a pipe that nobody reads any more, the record a limit.
TEST(start, writes_in_vain) {
  constexpr int write_end = 9;
  std::array<int, 2> ends{};
  ASSERT_EQ(pipe(ends.data()), 0);
  close(ends[0]);
  dup2(ends[1], write_end);
  start_table table(STARTS);
  new_device(table.states["on system"] + "zoneinfo -\n");
  EXPECT_EQ(start("exec", "2>&9"), report{"exit 0"});
  close(write_end);
  close(ends[1]);
  new_device(table.states["on system"]);
  // The limit must not meet what a build that counts lines writes at its end.
  EXPECT_EQ(start("ulimit -f 0; exec env GCOV_PREFIX=/tmp"), report{"exit 0"});
  EXPECT_EQ(look(),
            list(table.states["latest links"] + table.states["zone"] + "TZVersionDiffRecord ="));
}

}  // namespace
