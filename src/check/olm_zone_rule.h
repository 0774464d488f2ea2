#pragma once

#include <array>
#include <chrono>
#include <optional>
#include <string_view>
#include <vector>

#include "check/olm_clocks.h"

// The rule by which a zone's clocks change every year, as the last line of a zone file has it:
// CET-1CEST,M3.5.0,M10.5.0/3, for example.
class olm_zone_rule final : public olm_clocks {
 public:
  // Reads the whole of `text`. Throws std::invalid_argument when it is not such a rule; prints
  // nothing.
  explicit olm_zone_rule(std::string_view text);

  // `when` is within the years that std::chrono knows, as for all that is called here.
  [[nodiscard]] local_time find(instant when) const override;
  void list_changes(instant from, instant to, std::vector<instant>& changes) const override;

  // What they show outside of daylight saving time, and within; the same where there is none.
  [[nodiscard]] const local_time& get_standard() const { return standard_; }
  [[nodiscard]] const local_time& get_daylight() const { return daylight_; }

 private:
  // When in a year they change.
  struct yearly_date {
    char form = 'M';  // as M3.5.0; 'J' and '0' for a day of the year, without leap days or with
    unsigned month = 1;
    unsigned week = 1;  // 5 is the last one
    unsigned day = 0;   // of the week or year
    std::chrono::seconds time{};

    [[nodiscard]] std::chrono::sys_seconds find(std::chrono::year year) const;
  };

  static yearly_date read_date(std::string_view& text);
  [[nodiscard]] std::array<instant, 2> find_changes(std::chrono::year year) const;

  local_time standard_;
  local_time daylight_;
  yearly_date start_;
  yearly_date end_;
};
