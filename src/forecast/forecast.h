// What the next start of a device will do: the start itself, gone through in a trial.
#pragma once

#include <optional>
#include <string>
#include <vector>

#include "forecast/olm_trial.h"

// A link as it is, and as the start leaves it.
struct link_forecast {
  olm_entry now;
  olm_entry next;
};

struct start_forecast {
  std::optional<int> status;  // the exit status; none where the start does not end by itself
  std::string endless;        // the file at which it then waits, or runs out of memory
  link_forecast zoneinfo;
  link_forecast icutz;
  link_forecast localtime;
  bool installs = false;               // it takes the latest update into use
  bool zone_exists = false;            // after it, the local-time link leads to a file
  std::vector<std::string> warnings;   // what it prints, without its name and the text of errno
  std::vector<std::string> obstacles;  // what the device or the unit's rights do not allow it
};

// Forecasts the next start. `latest`, if not empty, stands for what tz_latest holds.
// Prints nothing. Throws std::runtime_error, with the reason as its text, when the outcome depends
// on what the user of this program may not look at.
[[nodiscard]] start_forecast forecast_start(const std::string& latest);
