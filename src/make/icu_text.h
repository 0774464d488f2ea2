// ICU's files as the text from which genrb makes them.
#pragma once

#include <map>
#include <string>
#include <vector>

#include "make/icu_zone.h"

// What is taken over from the ICU files that there are: those of ICU's library, or others in the
// directory that set_icu_directory was called with.
struct icu_base {
  std::string release;                           // of the time-zone database
  std::map<std::string, std::string> regions;    // of each zone that it has
  std::map<std::string, std::string> own_zones;  // the texts of ICU's own zones with own rules
  std::string own_rules;                         // the texts of the rules that these have
};

// Reads the base. Throws std::runtime_error where ICU cannot; prints nothing.
[[nodiscard]] icu_base read_icu_base();

// The text of the file `name`, such as metaZones, with all that is in it. Throws std::runtime_error
// where ICU cannot read it; prints nothing.
[[nodiscard]] std::string print_icu_file(const std::string& name);

// What stands for a zone's name in ICU's file.
struct zone_entry {
  std::string target;  // the zone that it is a link to, which is no link; else empty, and
  std::string text;    // what the zone has
  std::string region;
};

// The text of what `zone` has. Its rule, if it has one, is added to `rules`. Prints and throws
// nothing.
[[nodiscard]] std::string print_zone(const icu_zone& zone, std::vector<icu_rule>& rules);

// The text of zoneinfo64, which has all `zones` by their names. Each target is among them. Prints
// nothing.
[[nodiscard]] std::string print_zones(const std::string& release,
                                      const std::map<std::string, zone_entry>& zones,
                                      const std::vector<icu_rule>& rules,
                                      const std::string& own_rules);
