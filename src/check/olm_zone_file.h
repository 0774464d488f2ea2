#pragma once

#include <cstdint>
#include <optional>
#include <string_view>
#include <vector>

#include "check/olm_clocks.h"
#include "check/olm_zone_rule.h"

// A compiled zone file, of the format that RFC 9636 describes, versions 1 to 4. It holds a table of
// changes and, from version 2 on, the rule that goes on after it. For readers that know only 32
// bits, what these can tell comes first in the same file, or nothing does.
class olm_zone_file final : public olm_clocks {
 public:
  // Reads `data`, the whole file, and believes none of it: not a byte beyond its end is looked at.
  // Throws std::invalid_argument where anything is not as the format has it, or the file
  // contradicts itself; the text goes on after the file's name. Prints nothing.
  explicit olm_zone_file(std::string_view data);

  [[nodiscard]] local_time find(instant when) const override;
  void list_changes(instant from, instant to, std::vector<instant>& changes) const override;

  // Whether the clocks are ever set back for daylight saving time after `since`. ICU has only time
  // that they are set forward for.
  [[nodiscard]] bool has_negative_dst(instant since) const;

  // The last change of its table, after which the rule holds; 1970 where it has none. Prints
  // nothing.
  [[nodiscard]] instant get_last_change() const {
    return table_.changes.empty() ? 0 : table_.changes.back();
  }

  [[nodiscard]] bool has_leap_seconds() const { return has_leap_seconds_; }

 private:
  struct numbers;

  // One of a file's two tables.
  struct table {
    std::vector<instant> changes;
    std::vector<std::uint8_t> kinds;  // which of the times follows each change
    std::vector<local_time> times;    // the first of them precedes all changes

    [[nodiscard]] const local_time& find(instant when) const;
  };

  table read_table(std::string_view data, const numbers& counts, char version);
  void read_rule(std::string_view text);
  void compare_tables(const table& short_table) const;
  void compare_rule() const;

  table table_;
  std::optional<olm_zone_rule> rule_;
  bool has_leap_seconds_ = false;
};
