// A child process, in which a library reads files that may do it harm.
#pragma once

#include <functional>
#include <string>

// Takes a line of text.
using listener = std::function<void(const std::string&)>;

// What the work in the child is to call.
struct canary_report {
  listener add_reason;  // one more reason why the data set is not sound
  listener begin_step;  // what comes next, for which there are ten seconds of the processor's time
};

// Runs `work` in a child process with bounds for time and memory, and hands on to `report` what it
// reports. If the work ends with a crash, std::invalid_argument or std::bad_alloc, that is one
// reason more. Throws std::runtime_error when there can be no child, or the work throws that.
// Prints nothing.
void run_canary(const std::function<void(const canary_report&)>& work, const canary_report& report);
