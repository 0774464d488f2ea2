// Watching a start's system calls with strace, and interfering with one of them.
#pragma once

#include <string>
#include <vector>

// One call of a start: its line as strace prints it, and its number among those of its name,
// from 1.
struct traced_call {
  std::string text;
  std::string name;
  int number;
};

// The calls on the device's files that a start on a new device with `entries` makes, in order; none
// where strace is missing. Throws what new_device does.
std::vector<traced_call> trace_start(const std::string& entries);

// How such a start ends when strace does something at one of its calls, such as "signal=KILL"
// before it or "error=EIO" in its place. The device keeps what comes of it. Throws what new_device
// does.
std::string start_with(const std::string& injection, const traced_call& at,
                       const std::string& entries);
