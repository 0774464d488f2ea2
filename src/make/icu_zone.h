// A zone as ICU has it.
#pragma once

#include <array>
#include <cstdint>
#include <optional>
#include <vector>

#include "check/olm_zone_file.h"

// What clocks show: standard time's offset from UTC in seconds, and what daylight saving time adds.
struct icu_time {
  std::int32_t standard = 0;
  std::int32_t saving = 0;

  [[nodiscard]] bool operator==(const icu_time& other) const = default;
};

struct icu_change {
  instant when = 0;
  icu_time after;

  [[nodiscard]] bool operator==(const icu_change& other) const = default;
};

// When daylight saving time begins and ends each year, and what it adds, as ICU's files have it:
// month, day, day of the week, time of day and which clocks tell it, twice, and seconds.
using icu_rule = std::array<std::int32_t, 11>;

struct icu_zone {
  icu_time first;                   // before all changes
  std::vector<icu_change> changes;  // in order; those before `rule_year` if there is a rule
  std::optional<icu_rule> rule;     // none where the last change holds for ever
  int rule_year = 0;                // the year from which on the rule holds
  std::int32_t rule_standard = 0;   // and standard time's offset then
  bool is_cut = false;  // ICU has no rule for this: the changes go on for 400 years, and end there
};

// Converts a zone file. The names of its times must be those that the sources were marked with:
// three letters, which stand for standard time's offset (see decode_mark). Where daylight saving
// time is behind standard time, that becomes ICU's daylight saving time.
// Throws std::invalid_argument where a name is no mark. Prints nothing.
[[nodiscard]] icu_zone make_icu_zone(const olm_zone_file& file);

// The number of seconds that a mark stands for: 70000 less than its letters make, as the digits A
// to Z and a to z of a number. Throws std::invalid_argument where it is none. Prints nothing.
[[nodiscard]] std::int32_t decode_mark(const std::string& mark);
