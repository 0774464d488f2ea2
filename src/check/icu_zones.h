// What ICU makes of the files in a directory. Nothing else calls ICU. Damaged files can make ICU
// crash, hang and eat memory, so all of this belongs into a canary. Each function throws
// std::invalid_argument where ICU finds that it cannot go on; none prints.
#pragma once

#include <memory>
#include <string>
#include <vector>

#include "check/olm_clocks.h"

// Has ICU look for its four files in `directory` first, which becomes the working directory: ICU
// takes a colon in a path for the end of one. It must be called before all others. Throws
// std::runtime_error where that fails.
void set_icu_directory(const std::string& directory);

// Reads all that is in the file `name`, such as zoneinfo64. False where ICU does not take it.
[[nodiscard]] bool walk_icu_file(const std::string& name);

// Whether ICU has read `file`, which is there, and not data of its own.
[[nodiscard]] bool has_read(const std::string& file);

// The release of the time-zone database that ICU says it has.
[[nodiscard]] std::string get_icu_version();

// The names of all its zones.
[[nodiscard]] std::vector<std::string> list_icu_zones();

// The clocks of the zone `name` as ICU has them; their times have no names. Null if it has none.
[[nodiscard]] std::unique_ptr<const olm_clocks> find_icu_zone(const std::string& name);

// Asks whatever else programs ask about the zone `name`: its region, its equals, what it was called
// over time. Gives what is wrong with the answers, or nothing.
[[nodiscard]] std::string ask_about_zone(const std::string& name);
