// What there is on a device, as a start would find it: read with the rights of a boot.
#pragma once

#include <optional>
#include <string>
#include <vector>

#include "dataset/olm_dataset.h"
#include "dataset/olm_icu.h"
#include "forecast/forecast.h"

// One of the data sets that a start compares.
struct dataset_facts {
  std::string path;                    // empty for the system partition
  std::optional<olm_dataset> data;     // none if there is none, or if it cannot be used
  std::string problem;                 // why it cannot be used; empty if it can, or is missing
  std::vector<std::string> obstacles;  // what a start may not read of it
  suppositions supposed;               // with which it was read
};

struct update_facts {
  std::string name;
  std::string state;  // current, waiting, refused or unused
};

struct device_facts {
  start_forecast start;
  dataset_facts system;
  dataset_facts current;
  dataset_facts
      weighed;  // what a start finds in use, for a boot may first restore the zoneinfo link
  dataset_facts latest;
  std::vector<update_facts> updates;  // all on the device, in the order of their names' numbers
};

// The facts of this device, with links as `supposed`.
// Prints nothing. Throws std::runtime_error, with the reason as its text, when the user of this
// program may not look at something that a start looks at.
[[nodiscard]] device_facts gather_facts(const suppositions& supposed = {});

// The format of the data set's ICU data. Prints nothing.
[[nodiscard]] const std::string& get_schema(const olm_dataset& data);
