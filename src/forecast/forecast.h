// What the next start of a device will do: what a boot runs, gone through in a trial.
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
  link_forecast zoneinfo;
  link_forecast icutz;
  link_forecast localtime;
  // What a boot first points the zoneinfo link back at; empty where it leaves that alone.
  std::string restored;
  bool installs = false;  // it takes the latest update into use
  bool fit_now = false;   // what do_halves_fit gives before and after it
  bool fit_next = false;
  bool zone_exists = false;  // after it, the local-time link leads to a file
  trial_record record;
};

// Forecasts the next start, with links as `supposed`.
// Prints nothing. Throws std::runtime_error, with the reason as its text, when the outcome depends
// on what the user of this program may not look at.
[[nodiscard]] start_forecast forecast_start(const suppositions& supposed = {});
