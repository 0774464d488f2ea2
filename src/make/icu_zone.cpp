#include "make/icu_zone.h"

#include <algorithm>
#include <chrono>
#include <stdexcept>
#include <string>
#include <utility>

namespace {

namespace chrono = std::chrono;

// After so many years days of the week fall on the same dates again.
constexpr int years_of_cycle = 400;
constexpr instant seconds_of_day = 86400;
constexpr instant seconds_of_cycle = 146097 * seconds_of_day;
// In 1494, when no clock followed a zone.
constexpr instant long_ago = -15'000'000'000;

chrono::year_month_day get_date(instant when) {
  return chrono::floor<chrono::days>(chrono::sys_seconds(chrono::seconds(when)));
}

int get_year(instant when) { return static_cast<int>(get_date(when).year()); }

struct period {
  instant begin = long_ago;
  local_time time;
};

// What the zone's clocks show from the beginning to `to`, as long as each of it lasts.
std::vector<period> list_periods(const olm_zone_file& file, instant to) {
  std::vector<instant> changes;
  file.list_changes(long_ago, to, changes);
  std::sort(changes.begin(), changes.end());
  std::vector<period> periods = {{long_ago, file.find(long_ago)}};
  for (const instant change : changes) {
    const local_time time = file.find(change);
    if (time != periods.back().time) periods.push_back({change, time});
  }
  return periods;
}

// By how much daylight saving time is behind the standard time `of` in a period beside it, if there
// is one.
std::int32_t find_setback(const local_time& of, const std::vector<period>& periods,
                          std::size_t beside) {
  if (of.is_dst || beside >= periods.size()) return 0;
  const local_time& time = periods[beside].time;
  return time.is_dst && of.name == time.name ? std::max(0, of.offset - time.offset) : 0;
}

// To ICU, daylight saving time that is behind standard time is standard time, and what is between
// two such periods is daylight saving time.
icu_time split(const std::vector<period>& periods, std::size_t index) {
  const local_time& time = periods[index].time;
  std::int32_t standard = time.is_dst ? decode_mark(time.name) : time.offset;
  standard = std::min(standard, time.offset);
  standard -=
      std::min(find_setback(time, periods, index - 1), find_setback(time, periods, index + 1));
  return {standard, time.offset - standard};
}

// Which clocks tell the time of a rule's change.
enum class told_by { wall_clocks = 0, standard_time = 1, utc = 2 };

// As ICU's rules have it, a day is one of a month, or the first such day of the week on or after
// one of a month; or, with a negative number, counted from the month's end.
using icu_date = std::array<std::int32_t, 5>;

// The date in a year at which all of `changes` are, which happen once a year, and a number of
// seconds `ahead` of UTC. With `at_end`, midnight is the end of a day. ICU asks for the year by
// clocks that show the offset `standard`.
std::optional<icu_date> fit_date(const std::vector<instant>& changes, instant ahead,
                                 instant standard, bool at_end) {
  const auto find_day = [&](instant change) {
    return chrono::floor<chrono::days>(
        chrono::sys_seconds(chrono::seconds(change + ahead - (at_end ? 1 : 0))));
  };
  const auto get_day = [](chrono::year_month_day date) {
    return static_cast<unsigned>(date.day());
  };
  const chrono::sys_days first = find_day(changes.front());
  const chrono::year_month_day first_date = first;
  const chrono::weekday weekday(first);
  unsigned earliest = get_day(first_date);
  unsigned latest = earliest;
  bool has_weekday = true;
  bool is_last = true;
  for (std::size_t i = 0; i < changes.size(); ++i) {
    const chrono::sys_days day = find_day(changes[i]);
    const chrono::year_month_day date = day;
    if (date.month() != first_date.month() ||
        date.year() != first_date.year() + chrono::years(static_cast<int>(i)) ||
        date.year() != get_date(changes[i] + standard).year())
      return {};
    earliest = std::min(earliest, get_day(date));
    latest = std::max(latest, get_day(date));
    has_weekday = has_weekday && chrono::weekday(day) == weekday;
    is_last = is_last && chrono::year_month_day(day + chrono::weeks(1)).month() != date.month();
  }
  const instant time =
      changes.front() + ahead - chrono::sys_seconds(first).time_since_epoch().count();
  icu_date date = {static_cast<std::int32_t>(static_cast<unsigned>(first_date.month())) - 1,
                   static_cast<std::int32_t>(earliest), 0, static_cast<std::int32_t>(time), 0};
  if (earliest == latest) return date;
  if (!has_weekday) return {};
  const auto icu_weekday = static_cast<std::int32_t>(weekday.c_encoding()) + 1;
  constexpr unsigned days_of_week = 7;
  if (latest - earliest < days_of_week) {
    date[2] = -icu_weekday;
  } else if (is_last) {
    date[1] = -1;
    date[2] = icu_weekday;
  } else {
    return {};
  }
  return date;
}

// The same for the first clocks that tell a date which ICU has. `before` is what they show until
// each of the changes.
std::optional<icu_date> fit_date(const std::vector<instant>& changes, icu_time before) {
  const instant wall = before.standard + before.saving;
  for (const bool at_end : {false, true}) {
    for (const auto& [clocks, ahead] : {std::pair(told_by::wall_clocks, wall),
                                        std::pair(told_by::standard_time, instant{before.standard}),
                                        std::pair(told_by::utc, instant{0})}) {
      auto date = fit_date(changes, ahead, before.standard, at_end);
      if (!date || (at_end && date->at(3) != seconds_of_day)) continue;
      date->back() = static_cast<std::int32_t>(clocks);
      return date;
    }
  }
  return {};
}

// The rule that `changes` follow, those of 400 years; none if ICU has no such rule.
std::optional<icu_rule> fit_rule(const std::vector<icu_change>& changes) {
  std::vector<instant> begins;
  std::vector<instant> ends;
  icu_time daylight;
  for (const auto& [when, after] : changes) {
    (after.saving == 0 ? ends : begins).push_back(when);
    if (after.saving != 0) daylight = after;
  }
  const icu_time standard = {daylight.standard, 0};
  const bool are_two = std::all_of(changes.begin(), changes.end(), [&](const icu_change& change) {
    return change.after == standard || change.after == daylight;
  });
  if (!are_two || begins.size() != years_of_cycle || ends.size() != years_of_cycle) return {};
  const auto begin = fit_date(begins, standard);
  const auto end = fit_date(ends, daylight);
  // Where both are in one month, ICU takes the beginning for the earlier one.
  if (!begin || !end) return {};
  if (begin->front() == end->front() && begins.front() > ends.front()) return {};
  icu_rule rule{};
  std::copy(begin->begin(), begin->end(), rule.begin());
  std::copy(end->begin(), end->end(), rule.begin() + begin->size());
  rule.back() = daylight.saving;
  return rule;
}

// What happens in `year`, or as many years later, and what the clocks show before.
std::vector<icu_change> find_year(const icu_zone& zone, int year, int years_later) {
  const instant later = years_later == 0 ? 0 : seconds_of_cycle;
  icu_change before = {find_begin(year), zone.first};
  std::vector<icu_change> found;
  for (const auto& [when, after] : zone.changes) {
    if (when - later < before.when) before.after = after;
    if (get_year(when) == year + years_later) found.push_back({when - later, after});
  }
  found.push_back(before);
  return found;
}

}  // namespace

std::int32_t decode_mark(const std::string& mark) {
  constexpr std::string_view digits = "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz";
  constexpr std::int32_t zero = 70000;
  std::size_t number = 0;
  for (const char letter : mark) {
    const std::size_t digit = digits.find(letter);
    if (digit == std::string_view::npos || mark.size() != 3)
      throw std::invalid_argument(mark + " is no mark of a time");
    number = number * digits.size() + digit;
  }
  return static_cast<std::int32_t>(number) - zero;
}

icu_zone make_icu_zone(const olm_zone_file& file) {
  const int rule_year = get_year(file.get_last_change()) + 1;
  const instant end = find_begin(rule_year + years_of_cycle);
  // A year more, for what a time is depends on the next one, too.
  const auto periods = list_periods(file, find_begin(rule_year + years_of_cycle + 1));
  icu_zone zone;
  zone.first = split(periods, 0);
  icu_time last = zone.first;
  for (std::size_t i = 1; i < periods.size() && periods[i].begin < end; ++i) {
    const icu_time time = split(periods, i);
    if (time != last) zone.changes.push_back({periods[i].begin, last = time});
  }
  const auto first_ruled = [&](int year) {
    return std::find_if(zone.changes.begin(), zone.changes.end(),
                        [&](const icu_change& change) { return get_year(change.when) >= year; });
  };
  const auto yearly = first_ruled(rule_year);
  if (yearly == zone.changes.end()) return zone;
  zone.rule = fit_rule({yearly, zone.changes.end()});
  zone.is_cut = !zone.rule;
  if (zone.is_cut) return zone;
  zone.rule_year = rule_year;
  zone.rule_standard = last.standard;
  // The years before may have followed the same rule. ICU looks for changes only after another one.
  const auto follows = [&](int year) {
    return first_ruled(year) != zone.changes.begin() &&
           find_year(zone, year, 0) == find_year(zone, year, years_of_cycle);
  };
  while (follows(zone.rule_year - 1)) --zone.rule_year;
  zone.changes.erase(first_ruled(zone.rule_year), zone.changes.end());
  return zone;
}
