// private-root COMMAND [ARGUMENT ...]: runs a command in a private root with an empty device.
// Exit status: the command's, or 125 where there is no command or no private root.
#include <err.h>
#include <unistd.h>

#include <exception>
#include <span>

#include "testbed/private_root.h"

int main(int count, char* arguments[]) {
  constexpr int own_failure = 125;
  if (count < 2) errx(own_failure, "usage: private-root COMMAND [ARGUMENT ...]");
  try {
    private_root::enter();
  } catch (const std::exception& failure) {
    errx(own_failure, "%s", failure.what());
  }
  const auto command = std::span(arguments, static_cast<std::size_t>(count)).subspan(1);
  execvp(command.front(), command.data());
  err(own_failure, "%s", command.front());
}
