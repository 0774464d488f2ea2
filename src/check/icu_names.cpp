#include "check/icu_names.h"

#include <algorithm>
#include <array>
#include <chrono>
#include <stdexcept>
#include <vector>

#include "check/olm_zone_rule.h"

namespace {

struct own_name {
  const char* name;
  const char* zone;
};

constexpr std::array<own_name, 27> own_names = {{{"ACT", "Australia/Darwin"},
                                                 {"AET", "Australia/Sydney"},
                                                 {"AGT", "America/Argentina/Buenos_Aires"},
                                                 {"ART", "Africa/Cairo"},
                                                 {"AST", "America/Anchorage"},
                                                 {"BET", "America/Sao_Paulo"},
                                                 {"BST", "Asia/Dhaka"},
                                                 {"CAT", "Africa/Maputo"},
                                                 {"CNT", "America/St_Johns"},
                                                 {"CST", "America/Chicago"},
                                                 {"CTT", "Asia/Shanghai"},
                                                 {"Canada/East-Saskatchewan", "America/Regina"},
                                                 {"EAT", "Africa/Nairobi"},
                                                 {"ECT", "Europe/Paris"},
                                                 {"IET", "America/Indiana/Indianapolis"},
                                                 {"IST", "Asia/Kolkata"},
                                                 {"JST", "Asia/Tokyo"},
                                                 {"MIT", "Pacific/Apia"},
                                                 {"NET", "Asia/Yerevan"},
                                                 {"NST", "Pacific/Auckland"},
                                                 {"PLT", "Asia/Karachi"},
                                                 {"PNT", "America/Phoenix"},
                                                 {"PRT", "America/Puerto_Rico"},
                                                 {"PST", "America/Los_Angeles"},
                                                 {"SST", "Pacific/Guadalcanal"},
                                                 {"US/Pacific-New", "America/Los_Angeles"},
                                                 {"VST", "Asia/Ho_Chi_Minh"}}};

// Followed by the beginning of its rule.
constexpr const char* old_zone = "SystemV/";
constexpr std::array<const char*, 13> old_rules = {
    "AST4", "AST4ADT", "CST6", "CST6CDT", "EST5", "EST5EDT", "HST10",
    "MST7", "MST7MDT", "PST8", "PST8PDT", "YST9", "YST9YDT"};

// No clocks follow these. Zone files may have the second, or not.
constexpr std::array<const char*, 2> zones_of_nobody = {"Etc/Unknown", "Factory"};

constexpr instant find_instant(int year, unsigned month, unsigned day, int hour) {
  const std::chrono::sys_seconds time =
      std::chrono::sys_days(std::chrono::year(year) / std::chrono::month(month) /
                            std::chrono::day(day)) +
      std::chrono::hours(hour);
  return time.time_since_epoch().count();
}

// In two years, daylight saving time was longer. In standard time.
constexpr std::array<std::array<instant, 2>, 2> exceptions = {
    {{find_instant(1974, 1, 6, 2), find_instant(1974, 11, 24, 1)},
     {find_instant(1975, 2, 23, 2), find_instant(1975, 10, 26, 1)}}};

class olm_own_zone final : public olm_clocks {
 public:
  explicit olm_own_zone(const std::string& rule)
      : rule_(rule + (rule.ends_with("DT") ? ",M4.5.0,M10.5.0" : "")) {}

  [[nodiscard]] local_time find(instant when) const override {
    const instant standard = when + rule_.get_standard().offset;
    const bool is_exception =
        std::any_of(exceptions.begin(), exceptions.end(), [&](const auto& exception) {
          return standard >= exception.front() && standard < exception.back();
        });
    return is_exception ? rule_.get_daylight() : rule_.find(when);
  }

  void list_changes(instant from, instant to, std::vector<instant>& changes) const override {
    rule_.list_changes(from, to, changes);
    for (const auto& exception : exceptions) {
      for (const instant standard : exception) {
        const instant change = standard - rule_.get_standard().offset;
        if (change > from && change < to) changes.push_back(change);
      }
    }
  }

 private:
  olm_zone_rule rule_;
};

}  // namespace

std::string find_namesake(const std::string& name) {
  const auto* const found = std::find_if(own_names.begin(), own_names.end(),
                                         [&](const own_name& own) { return name == own.name; });
  return found == own_names.end() ? "" : found->zone;
}

std::unique_ptr<const olm_clocks> make_own_zone(const std::string& name) {
  for (const char* const zone : zones_of_nobody)
    if (name == zone) return std::make_unique<olm_own_zone>("UTC0");
  for (const char* const rule : old_rules)
    if (name == std::string(old_zone) + rule) return std::make_unique<olm_own_zone>(rule);
  return nullptr;
}
