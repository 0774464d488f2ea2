// What ICU makes of the files in a directory. Damaged files can make ICU crash, hang and eat
// memory, so all of this belongs into a canary. Each function throws std::invalid_argument where
// ICU finds that it cannot go on; none prints.
#pragma once

#include <memory>
#include <string>
#include <vector>

#include "check/olm_clocks.h"

// Reads all that is in the file `name`, such as zoneinfo64. False where ICU does not take it.
[[nodiscard]] bool walk_icu_file(const std::string& name);

// The names of all its zones.
[[nodiscard]] std::vector<std::string> list_icu_zones();

// The clocks of the zone `name` as ICU has them; their times have no names. Null if it has none.
[[nodiscard]] std::unique_ptr<const olm_clocks> find_icu_zone(const std::string& name);

// Asks whatever else programs ask about the zone `name`: its region, its equals, what it was called
// over time. Gives what is wrong with the answers, or nothing.
[[nodiscard]] std::string ask_about_zone(const std::string& name);
