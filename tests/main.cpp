#include <err.h>
#include <gtest/gtest.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>
#include <span>
#include <vector>

// Runs the tests where they can harm nothing, whoever starts them and from where.
int main(int count, char* arguments[]) {
  static std::string script = PRIVATE_ROOT;
  static std::string name = "tzdata-select";
  if (access("/var/private-root", F_OK) != 0) {
    std::vector<char*> command(arguments, arguments + count + 1);
    command.insert(command.begin(), script.data());
    execv(script.c_str(), command.data());
    err(EXIT_FAILURE, "%s", script.c_str());
  }
  program_invocation_short_name = name.data();
  testing::InitGoogleTest(&count, arguments);
  return RUN_ALL_TESTS();
}
