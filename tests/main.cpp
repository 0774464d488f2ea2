#include <err.h>
#include <gtest/gtest.h>

#include <cerrno>
#include <cstdlib>
#include <exception>
#include <string>

#include "testbed/private_root.h"

// Whatever case this process runs, it runs in a private root, or not at all.
class private_root_environment : public testing::Environment {
  void SetUp() override {
    try {
      private_root::enter();
    } catch (const std::exception& failure) {
      errx(EXIT_FAILURE, "%s", failure.what());
    }
    static std::string name = "tzdata-select";
    program_invocation_short_name = name.data();
  }
};

int main(int count, char* arguments[]) {
  testing::InitGoogleTest(&count, arguments);
  testing::AddGlobalTestEnvironment(new private_root_environment);
  return RUN_ALL_TESTS();
}
