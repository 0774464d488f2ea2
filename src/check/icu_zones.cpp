#include "check/icu_zones.h"

#include <unicode/basictz.h>
#include <unicode/locid.h>
#include <unicode/strenum.h>
#include <unicode/timezone.h>
#include <unicode/tznames.h>
#include <unicode/tztrans.h>

#include <algorithm>
#include <array>
#include <cstdint>
#include <span>
#include <stdexcept>
#include <string_view>
#include <utility>

#include "check/icu_bundle.h"

namespace {

using icu::TimeZone;
using icu::UnicodeString;

bool has_failed(UErrorCode status) { return U_FAILURE(status) != 0; }

void require(UErrorCode status, const char* what) {
  if (has_failed(status))
    throw std::invalid_argument(std::string("ICU: ") + what + ": " + u_errorName(status));
}

UnicodeString to_unicode(const std::string& text) { return UnicodeString::fromUTF8(text); }

std::string to_text(const UnicodeString& text) {
  std::string converted;
  return text.toUTF8String(converted);
}

// Reads each of the values; nobody looks at them, but what ends or hangs a reader does so here.
template <typename value>
void read_all(const value* values, std::int32_t count) {
  if (values == nullptr || count < 0) return;
  [[maybe_unused]] volatile value last = 0;
  for (const value& one : std::span(values, static_cast<std::size_t>(count))) last = one;
}

// Reads a resource that holds no others. False where that fails.
bool read_leaf(UResourceBundle* resource) {
  UErrorCode status = U_ZERO_ERROR;
  std::int32_t length = 0;
  switch (ures_getType(resource)) {
    case URES_STRING:
      read_all(ures_getString(resource, &length, &status), length);
      break;
    case URES_BINARY:
      read_all(ures_getBinary(resource, &length, &status), length);
      break;
    case URES_INT_VECTOR:
      read_all(ures_getIntVector(resource, &length, &status), length);
      break;
    default:
      static_cast<void>(ures_getInt(resource, &status));
  }
  return !has_failed(status);
}

// Reads all that is in `root`. False where that fails.
bool walk(bundle root) {
  constexpr int most_depth = 16;
  std::vector<std::pair<bundle, int>> resources;
  resources.emplace_back(std::move(root), 0);
  while (!resources.empty()) {
    const auto [resource, depth] = std::move(resources.back());
    resources.pop_back();
    const UResType type = ures_getType(resource.get());
    if (type != URES_TABLE && type != URES_ARRAY) {
      if (!read_leaf(resource.get())) return false;
      continue;
    }
    for (bundle& inner : list_inner(resource.get())) {
      if (inner == nullptr || depth == most_depth) return false;
      resources.emplace_back(std::move(inner), depth + 1);
    }
  }
  return true;
}

// The names of the zones that share all their time with this one, itself among them; none if it is
// alone.
std::vector<std::string> list_equals(const std::string& name) {
  const UnicodeString id = to_unicode(name);
  std::vector<std::string> equals;
  const std::int32_t count = TimeZone::countEquivalentIDs(id);
  for (std::int32_t i = 0; i < count; ++i) {
    equals.insert(equals.end(), to_text(TimeZone::getEquivalentID(id, i)));
  }
  return equals;
}

bool is_region(std::string_view region) {
  const auto are_all = [&](char first, char last) {
    return std::all_of(region.begin(), region.end(),
                       [&](char byte) { return byte >= first && byte <= last; });
  };
  return (region.size() == 2 && are_all('A', 'Z')) || (region.size() == 3 && are_all('0', '9'));
}

class olm_icu_clocks final : public olm_clocks {
 public:
  explicit olm_icu_clocks(std::unique_ptr<icu::BasicTimeZone> zone) : zone_(std::move(zone)) {}

  [[nodiscard]] local_time find(instant when) const override {
    UErrorCode status = U_ZERO_ERROR;
    std::int32_t standard = 0;
    std::int32_t saving = 0;
    zone_->getOffset(to_date(when), 0, standard, saving, status);
    require(status, "a zone's time");
    return {.offset = (standard + saving) / U_MILLIS_PER_SECOND, .is_dst = saving != 0, .name = ""};
  }

  void list_changes(instant from, instant to, std::vector<instant>& changes) const override {
    icu::TimeZoneTransition next;
    while (zone_->getNextTransition(to_date(from), 0, next) != 0) {
      const auto change = static_cast<instant>(next.getTime() / U_MILLIS_PER_SECOND);
      if (change <= from || change >= to) break;
      changes.push_back(from = change);
    }
  }

 private:
  static UDate to_date(instant when) { return static_cast<UDate>(when) * U_MILLIS_PER_SECOND; }

  std::unique_ptr<icu::BasicTimeZone> zone_;
};

}  // namespace

bool walk_icu_file(const std::string& name) {
  bundle root = open_bundle(name);
  return root != nullptr && walk(std::move(root));
}

std::vector<std::string> list_icu_zones() {
  UErrorCode status = U_ZERO_ERROR;
  const std::unique_ptr<icu::StringEnumeration> names(
      TimeZone::createTimeZoneIDEnumeration(UCAL_ZONE_TYPE_ANY, nullptr, nullptr, status));
  require(status, "no list of zones");
  std::vector<std::string> listed;
  while (const UnicodeString* const name = names->snext(status)) listed.push_back(to_text(*name));
  require(status, "the list of zones");
  return listed;
}

std::unique_ptr<const olm_clocks> find_icu_zone(const std::string& name) {
  std::unique_ptr<TimeZone> zone(TimeZone::createTimeZone(to_unicode(name)));
  UnicodeString found;
  if (zone == nullptr || to_text(zone->getID(found)) != name) return nullptr;
  auto* const basic_zone = dynamic_cast<icu::BasicTimeZone*>(zone.get());
  if (basic_zone == nullptr) return nullptr;
  static_cast<void>(zone.release());
  return std::make_unique<olm_icu_clocks>(std::unique_ptr<icu::BasicTimeZone>(basic_zone));
}

std::string ask_about_zone(const std::string& name) {
  const UnicodeString id = to_unicode(name);
  const std::vector<std::string> equals = list_equals(name);
  for (const std::string& equal : equals)
    if (list_equals(equal) != equals) return "ICU takes it for an equal of " + equal;
  UErrorCode status = U_ZERO_ERROR;
  std::array<char, 16> region{};
  TimeZone::getRegion(id, region.data(), static_cast<std::int32_t>(region.size()) - 1, status);
  if (!is_region(region.data())) return "ICU has no region for it";
  // Their answers are not looked at.
  UnicodeString text;
  TimeZone::getCanonicalID(id, text, status);
  TimeZone::getWindowsID(id, text, status);
  TimeZone::getIDForWindowsID(text, nullptr, text, status);
  status = U_ZERO_ERROR;
  const std::unique_ptr<TimeZone> zone(TimeZone::createTimeZone(id));
  zone->getDisplayName(0, TimeZone::GENERIC_LOCATION, icu::Locale::getEnglish(), text);
  const std::unique_ptr<icu::TimeZoneNames> names(
      icu::TimeZoneNames::createInstance(icu::Locale::getEnglish(), status));
  const std::unique_ptr<icu::StringEnumeration> metazones(
      names->getAvailableMetaZoneIDs(id, status));
  require(status, "the names of a zone");
  while (const UnicodeString* const metazone = metazones->snext(status))
    names->getReferenceZoneID(*metazone, "001", text);
  return "";
}
