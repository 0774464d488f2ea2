// Whole starts of the built program.
#include <gtest/gtest.h>
#include <unistd.h>

#include <array>

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

TEST(start, words_of_any_length) {
  start_table table(STARTS);
  const std::string version_file = "/usr/share/zoneinfo.default/+VERSION = ";
  const std::string schema_file = "/usr/share/icu/icutzformat.txt = ";
  const std::string no_record = "TZVersionDiffRecord /\n";
  const std::size_t length = 8U << 20U;
  const std::pair<std::string, const char*> rows[] = {
      {version_file + std::string(length, '1'), "latest links"},
      {version_file + std::string(length, 'a'), "latest links"},
      {version_file + "2019" + std::string(length, 'a'), "latest links"},
      {schema_file + std::string(length, '4'), "system links"},
  };
  for (const auto& [file, links] : rows) {
    new_device(table.states["on first"] + no_record + file);
    EXPECT_EQ(start().back(), "exit 0");
    EXPECT_EQ(look(),
              list(table.states[links] + table.states["zone"] + no_record + "needs_cleanup ="));
  }
}

// The first warning meets a pipe that nobody reads any more.
TEST(start, warnings_to_nobody) {
  constexpr int write_end = 9;
  std::array<int, 2> ends{};
  ASSERT_EQ(pipe(ends.data()), 0);
  close(ends[0]);
  dup2(ends[1], write_end);
  new_device(start_table(STARTS).states["on system"] + "zoneinfo -\n");
  EXPECT_EQ(start(" 2>&9"), report{"exit 0"});
  close(write_end);
  close(ends[1]);
}

}  // namespace
