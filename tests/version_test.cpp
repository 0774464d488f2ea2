#include <gtest/gtest.h>

#include "dataset/olm_version.h"
#include "testbed/device.h"

namespace {

std::string describe(const olm_version& version) {
  return std::to_string(version.year) + ' ' + version.letters + ' ' +
         std::to_string(version.major) + ' ' + std::to_string(version.minor);
}

TEST(olm_version, parse) {
  // More than any matcher could recurse for.
  const std::string digits(8U << 20U, '1');
  const std::string letters(8U << 20U, 'a');
  const std::string unknown = "-1  -1 -1";
  struct row {
    std::string text;
    std::string version;
    std::string end = "done";
  };
  const row rows[] = {
      {"2019c", "2019 c -1 -1"},
      {"2019c.1.0", "2019 c 1 0"},
      {"2019c.1", "2019 c 1 -1"},
      {"02019cc.007", "2019 cc 7 -1"},
      {"2147483647z.0.2147483647", "2147483647 z 0 2147483647"},
      {"2019" + letters + ".1", "2019 " + letters + " 1 -1"},
      {"2019", unknown},
      {"2019C.1.0", unknown},
      {"2019c.", unknown},
      {"2019c.1.0.0", unknown},
      {"2019c.1.0/", unknown},
      {"c2019", unknown},
      {" 2019c", unknown},
      {"2019c ", unknown},
      {"", unknown},
      {"2019c.-1", unknown},
      {"2019\xE9", unknown},
      {"%s%n", unknown},
      // The fields before the number that does not fit are set, the others are as they were.
      {"2147483648c", "7 x 8 9", "out_of_range"},
      {digits + "c", "7 x 8 9", "out_of_range"},
      {"2019c.99999999999", "2019 c 8 9", "out_of_range"},
      {"2019c.1.99999999999", "2019 c 1 9", "out_of_range"},
  };
  for (const auto& [text, expected, end] : rows) {
    SCOPED_TRACE(text.substr(0, 99));
    olm_version version("7x.8.9");
    const std::string warning = "Cannot parse version string " + text;
    report heard = {end};
    if (expected == unknown) heard = {warning + ", results.size() = 0", warning, end};
    EXPECT_EQ(hear([&, name = text] { version.parse(name); }), heard);
    EXPECT_EQ(describe(version), expected);
  }
}

TEST(olm_version, order) {
  std::vector<olm_version> newest_first;
  for (const char* text : {"2020a", "2019z", "2019d", "2019cc", "2019c.10.1", "2019c.2",
                           "2019c.1.9", "2019c.1.0", "2019c.1", "2019c", "0a"}) {
    newest_first.emplace_back(text);
  }
  newest_first.emplace_back();
  for (const auto& one : newest_first) {
    for (const auto& other : newest_first) {
      EXPECT_EQ(one > other, &one < &other) << describe(one) << " > " << describe(other);
      EXPECT_EQ(one == other, &one == &other) << describe(one) << " == " << describe(other);
    }
  }
}

}  // namespace
