#include <err.h>
#include <gtest/gtest.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>
#include <string>
#include <vector>

// Runs the tests where they can harm nothing, whoever starts them and from where.
int main(int count, char* arguments[]) {
  if (access("/var/private-root", F_OK) != 0) {
    std::string script = PRIVATE_ROOT;
    std::vector<char*> command(arguments, arguments + count + 1);
    command.insert(command.begin(), script.data());
    execv(command.front(), command.data());
    err(EXIT_FAILURE, PRIVATE_ROOT);
  }
  static std::string name = "tzdata-select";
  program_invocation_short_name = name.data();
  testing::InitGoogleTest(&count, arguments);
  return RUN_ALL_TESTS();
}
