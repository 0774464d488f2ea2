#include "driver/process.h"

#include <array>
#include <csignal>
#include <cstdio>

void prepare_warnings() {
  // A warning that fits is one write, so that what others write cannot come between its parts.
  static std::array<char, BUFSIZ> warning;
  static_cast<void>(std::setvbuf(stderr, warning.data(), _IOLBF, warning.size()));
  // A write that fails must not end a start: the warnings' reader may be gone, and files may have a
  // limit.
  static_cast<void>(std::signal(SIGPIPE, SIG_IGN));
  static_cast<void>(std::signal(SIGXFSZ, SIG_IGN));
}
