#include <array>
#include <cerrno>

#include "boot/boot.h"
#include "boot/confine.h"
#include "driver/process.h"

int main() {
  prepare_warnings();
  confine_process();
  // From here on it speaks as the start.
  static auto name = std::to_array("tzdata-select");
  program_invocation_short_name = name.data();
  return run_boot();
}
