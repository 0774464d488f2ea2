// The table of whole starts; it stands in start_test.cpp.
#pragma once

#include "device.h"

struct whole_start {
  std::string name;
  entries before;        // what stands on the device
  report says = {};      // the warnings, in order
  entries changes = {};  // what stands there otherwise afterwards; all else is as it was
  std::string ends = "exit 0";
  std::vector<std::string> tracing = {};  // options for strace, to have a call fail
};

extern const std::vector<whole_start> starts;
