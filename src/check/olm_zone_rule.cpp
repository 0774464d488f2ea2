#include "check/olm_zone_rule.h"

#include <algorithm>
#include <charconv>
#include <limits>
#include <stdexcept>
#include <string>
#include <utility>

namespace {

using std::chrono::days;
using std::chrono::floor;
using std::chrono::hours;
using std::chrono::minutes;
using std::chrono::seconds;
using std::chrono::sys_days;
using std::chrono::sys_seconds;
using std::chrono::year;

[[noreturn]] void refuse() { throw std::invalid_argument("no rule for the future"); }

// Takes `character` off the text, if that is how it begins.
bool take(std::string_view& text, char character) {
  if (!text.starts_with(character)) return false;
  text.remove_prefix(1);
  return true;
}

unsigned take_number(std::string_view& text, unsigned least, unsigned most) {
  unsigned number = 0;
  const auto [end, error] = std::from_chars(text.begin(), text.end(), number);
  if (error != std::errc() || number < least || number > most) refuse();
  text.remove_prefix(static_cast<std::size_t>(end - text.begin()));
  return number;
}

// Hours, and perhaps minutes and seconds.
seconds take_time(std::string_view& text, unsigned most_hours) {
  const bool is_negative = take(text, '-');
  if (!is_negative) take(text, '+');
  seconds time = hours(take_number(text, 0, most_hours));
  if (take(text, ':')) time += minutes(take_number(text, 0, 59));
  if (take(text, ':')) time += seconds(take_number(text, 0, 59));
  return is_negative ? -time : time;
}

bool is_letter(char byte) { return (byte >= 'A' && byte <= 'Z') || (byte >= 'a' && byte <= 'z'); }

bool is_of_name(char byte) {
  return is_letter(byte) || (byte >= '0' && byte <= '9') || byte == '+' || byte == '-';
}

std::string take_name(std::string_view& text) {
  const bool is_quoted = take(text, '<');
  const auto* const end =
      std::find_if_not(text.begin(), text.end(), is_quoted ? is_of_name : is_letter);
  std::string name(text.begin(), end);
  text.remove_prefix(name.size());
  constexpr std::size_t least_length = 3;
  if (name.size() < least_length || (is_quoted && !take(text, '>'))) refuse();
  return name;
}

// The text has what is to be added to local time for UTC.
std::int32_t take_offset(std::string_view& text) {
  return static_cast<std::int32_t>(-take_time(text, 24).count());
}

instant to_instant(sys_seconds time) { return time.time_since_epoch().count(); }

year find_year(instant when) {
  const auto day = floor<days>(sys_seconds(seconds(when)));
  return std::chrono::year_month_day(day).year();
}

}  // namespace

olm_zone_rule::yearly_date olm_zone_rule::read_date(std::string_view& text) {
  yearly_date date;
  if (!take(text, ',')) refuse();
  if (take(text, 'M')) {
    date.month = take_number(text, 1, 12);
    if (!take(text, '.')) refuse();
    date.week = take_number(text, 1, 5);
    if (!take(text, '.')) refuse();
    date.day = take_number(text, 0, 6);
  } else {
    date.form = take(text, 'J') ? 'J' : '0';
    date.day = take_number(text, date.form == 'J' ? 1 : 0, 365);
  }
  constexpr unsigned hours_of_week = 167;
  date.time = hours(2);
  if (take(text, '/')) date.time = take_time(text, hours_of_week);
  return date;
}

olm_zone_rule::olm_zone_rule(std::string_view text) {
  standard_.name = take_name(text);
  standard_.offset = take_offset(text);
  if (text.empty()) {
    daylight_ = standard_;
    return;
  }
  daylight_.name = take_name(text);
  daylight_.is_dst = true;
  constexpr std::int32_t hour = 3600;
  daylight_.offset = text.starts_with(',') ? standard_.offset + hour : take_offset(text);
  start_ = read_date(text);
  end_ = read_date(text);
  if (!text.empty()) refuse();
}

sys_seconds olm_zone_rule::yearly_date::find(year year) const {
  const std::chrono::month first{1};
  sys_days found = sys_days(year / first / 1) + days(day);
  if (form == 'M') {
    const std::chrono::year_month in = year / std::chrono::month(month);
    constexpr unsigned last_week = 5;
    found = week == last_week ? sys_days(in / std::chrono::weekday(day)[std::chrono::last])
                              : sys_days(in / std::chrono::weekday(day)[week]);
  } else if (form == 'J') {
    constexpr unsigned last_of_february = 59;
    found -= days(year.is_leap() && day > last_of_february ? 0 : 1);
  }
  return found + time;
}

// The start comes last, for a year that ends with daylight saving time may be followed by one that
// begins with it, at the same instant.
std::array<instant, 2> olm_zone_rule::find_changes(year year) const {
  return {to_instant(end_.find(year)) - daylight_.offset,
          to_instant(start_.find(year)) - standard_.offset};
}

local_time olm_zone_rule::find(instant when) const {
  if (!daylight_.is_dst) return standard_;
  instant last = std::numeric_limits<instant>::min();
  const local_time* found = &standard_;
  for (const int distance : {-1, 0, 1}) {
    const auto [end, start] = find_changes(find_year(when) + std::chrono::years(distance));
    for (const auto& [change, after] : {std::pair(end, &standard_), std::pair(start, &daylight_)}) {
      if (change > when || change < last) continue;
      last = change;
      found = after;
    }
  }
  return *found;
}

void olm_zone_rule::list_changes(instant from, instant to, std::vector<instant>& changes) const {
  if (!daylight_.is_dst) return;
  const int last = static_cast<int>(find_year(to)) + 1;
  for (int next = static_cast<int>(find_year(from)) - 1; next <= last; ++next) {
    for (const instant change : find_changes(year(next)))
      if (change > from && change < to) changes.push_back(change);
  }
}
