#include <gtest/gtest.h>

#include <array>

#include "dataset/olm_version.h"
#include "device.h"

namespace {

std::string describe(const olm_version& version) {
  return std::to_string(version.year) + ' ' + version.letters + ' ' +
         std::to_string(version.major) + ' ' + std::to_string(version.minor);
}

TEST(olm_version, parse) {
  // The text, its version, and how its parsing ends.
  const std::array<std::string, 3> accepted[] = {
      {"2019c.1.0", "2019 c 1 0", "done"},
      {"2019c.1", "2019 c 1 -1", "done"},
      {"02019cc.007", "2019 cc 7 -1", "done"},
      {"2147483647z.0.2147483647", "2147483647 z 0 2147483647", "done"},
      // The fields before the number that does not fit are set, the others are as they were.
      {"2147483648c", "7 x 8 9", "out_of_range"},
      {"2019c.99999999999", "2019 c 8 9", "out_of_range"},
      {"2019c.1.99999999999", "2019 c 1 9", "out_of_range"},
  };
  for (const auto& [text, expected, end] : accepted) {
    SCOPED_TRACE(text);
    olm_version version("7x.8.9");
    EXPECT_EQ(hear([&, name = text] { version.parse(name); }), report{end});
    EXPECT_EQ(describe(version), expected);
  }
  for (const std::string rejected :
       {"2019", "2019C.1.0", "2019c.", "2019c-1.0", "2019c.1-0", "2019c.1.0.0", "2019c.1.0/",
        "c2019", " 2019c", "2019c ", "", "2019c.-1", "2019\xE9", "%s%n"}) {
    olm_version version("7x.8.9");
    const std::string warning = "Cannot parse version string " + rejected;
    EXPECT_EQ(hear([&] { version.parse(rejected); }),
              (report{warning + ", results.size() = 0", warning, "done"}));
    EXPECT_EQ(describe(version), "-1  -1 -1") << rejected;
  }
}

TEST(olm_version, order) {
  const std::vector<std::string> newest_first = {"2020a",      "2019z",   "2019d",     "2019cc",
                                                 "2019c.10.1", "2019c.2", "2019c.1.9", "2019c.1.0",
                                                 "2019c.1",    "2019c",   "0a",        "unknown"};
  for (const auto& one : newest_first) {
    for (const auto& other : newest_first) {
      EXPECT_EQ(olm_version(one) > olm_version(other), &one < &other) << one << " > " << other;
      EXPECT_EQ(olm_version(one) == olm_version(other), &one == &other) << one << " == " << other;
    }
  }
}

}  // namespace
