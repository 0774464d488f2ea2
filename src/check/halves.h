// Whether the zone files of a data set and ICU's files say the same.
#pragma once

#include <map>
#include <memory>
#include <string>

#include "check/canary.h"
#include "check/olm_zone_file.h"

struct halves {
  // The zone files by the names of their zones; null where one is damaged.
  std::map<std::string, std::shared_ptr<const olm_zone_file>> zones;
  std::string version;        // the zone files' own; empty where they have none
  std::string icu_directory;  // its real path
  int since = 0;              // the year from which on both must agree
};

// The work for a canary: has ICU read all its files, and looks whether each zone that one half has
// is in the other, and has the same time there from the year `since` to 2100.
void compare_halves(const halves& halves, const canary_report& report);
