#pragma once

#include <chrono>
#include <cstdint>
#include <string>
#include <vector>

// Seconds since 1970-01-01 00:00 UTC, without leap seconds.
using instant = std::int64_t;

// The beginning of `year`, which is within those that std::chrono knows.
[[nodiscard]] inline instant find_begin(int year) {
  const std::chrono::sys_seconds begin =
      std::chrono::sys_days(std::chrono::year(year) / std::chrono::January / 1);
  return begin.time_since_epoch().count();
}

// What clocks show.
struct local_time {
  std::int32_t offset = 0;  // in seconds, ahead of UTC
  bool is_dst = false;
  std::string name;  // the abbreviation, such as CEST

  [[nodiscard]] bool operator==(const local_time& other) const = default;
};

// The clocks of a zone, wherever it is known from.
class olm_clocks {
 public:
  olm_clocks(const olm_clocks&) = delete;
  olm_clocks& operator=(const olm_clocks&) = delete;
  virtual ~olm_clocks() = default;

  // What they show at `when`. Prints nothing.
  [[nodiscard]] virtual local_time find(instant when) const = 0;

  // Appends all instants after `from` and before `to` at which they change, in any order. Prints
  // nothing.
  virtual void list_changes(instant from, instant to, std::vector<instant>& changes) const = 0;

 protected:
  olm_clocks() = default;
};
