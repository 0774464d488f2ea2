// What a release of the time-zone database says beside its rules.
#pragma once

#include <map>
#include <string>

struct release_zone {
  std::string
      target;  // the zone that this one is a link to; empty for a zone with rules of its own
  std::string region;  // the code of its country, or its target's; empty where no table has one
};

// The zones and links of the release whose zone files, `tzdata.zi` and tables are in `directory`:
// from the tables zone.tab and zone1970.tab, as far as they are there. Of a link to a link, the
// target is where that ends.
// Throws std::runtime_error where tzdata.zi cannot be read, std::invalid_argument where a link
// leads nowhere. Prints nothing.
[[nodiscard]] std::map<std::string, release_zone> read_release(const std::string& directory);
