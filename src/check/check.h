// Whether a data set is sound: each of its files whole, and both halves the same.
#pragma once

#include <string>

#include "check/canary.h"

struct check_request {
  std::string directory;  // of the data set; empty where its halves lie apart
  std::string zoneinfo;   // else the directory of its zone files,
  std::string icu;        // and that of its ICU data
  std::string replaced;   // another data set, or its zone files; none of its zones must be missing
  int since = 0;          // the year from which on both halves must agree
};

// Adds each reason why the data set is not sound, and each step on the way, to `report`. Throws
// std::exception where that cannot be told. Prints nothing.
void check_data_set(const check_request& request, const canary_report& report);
