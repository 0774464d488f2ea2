#include "make/icu_text.h"

#include <unicode/unistr.h>

#include <algorithm>
#include <cstdint>
#include <cstring>
#include <limits>
#include <span>
#include <stdexcept>
#include <string_view>

#include "check/icu_bundle.h"
#include "check/icu_file.h"
#include "check/icu_names.h"

namespace {

using std::string;
using std::to_string;

constexpr const char* zones_file = icu_files.front();
constexpr const char* links_key = "links";

[[noreturn]] void fail(const string& what) {
  throw std::runtime_error("ICU cannot read the base's " + what);
}

string quote(std::string_view text) {
  string quoted = "\"";
  for (const char letter : text) {
    if (letter == '"' || letter == '\\') quoted += '\\';
    quoted += letter;
  }
  return quoted + '"';
}

template <typename numbers>
string print_numbers(const numbers& all) {
  string text = ":intvector{";
  for (const auto number : all) text += to_string(number) + ',';
  return text + "}";
}

string print_bytes(std::span<const std::uint8_t> bytes) {
  constexpr std::string_view digits = "0123456789abcdef";
  string text = ":bin{";
  for (const std::uint8_t byte : bytes) text.append({digits[byte / 16], digits[byte % 16]});
  return text + '}';
}

string get_key(UResourceBundle* resource) {
  const char* const key = ures_getKey(resource);
  return key == nullptr ? "" : key;
}

void require(UErrorCode status, const char* what) {
  if (U_FAILURE(status) != 0) fail(what);
}

string get_string(UResourceBundle* resource) {
  UErrorCode status = U_ZERO_ERROR;
  std::int32_t length = 0;
  const UChar* const text = ures_getString(resource, &length, &status);
  require(status, "texts");
  string converted;
  return icu::UnicodeString(text, length).toUTF8String(converted);
}

// What `get`, one of ICU's functions, finds in a resource that is a list.
template <typename getter>
auto get_list(UResourceBundle* resource, getter get) {
  UErrorCode status = U_ZERO_ERROR;
  std::int32_t length = 0;
  const auto* const first = get(resource, &length, &status);
  require(status, "lists");
  return std::span(first, static_cast<std::size_t>(length));
}

// A resource that holds no others.
string print_leaf(UResourceBundle* resource) {
  const UResType type = ures_getType(resource);
  if (type == URES_STRING) return ":string{" + quote(get_string(resource)) + '}';
  if (type == URES_BINARY) return print_bytes(get_list(resource, &ures_getBinary));
  if (type == URES_INT_VECTOR) return print_numbers(get_list(resource, &ures_getIntVector));
  UErrorCode status = U_ZERO_ERROR;
  const std::int32_t number = ures_getInt(resource, &status);
  require(status, "numbers");
  return ":int{" + to_string(number) + '}';
}

// A resource, and all in it but for what has the key `without`.
// NOLINTNEXTLINE(misc-no-recursion): as deep as the base, which is trusted
string print_resource(UResourceBundle* resource, std::string_view without = "") {
  const UResType type = ures_getType(resource);
  if (type != URES_TABLE && type != URES_ARRAY) return print_leaf(resource);
  string text = type == URES_TABLE ? ":table{\n" : ":array{\n";
  for (const bundle& inner : list_inner(resource)) {
    if (inner == nullptr) fail("tables");
    const string key = get_key(inner.get());
    if (type == URES_TABLE && key == without) continue;
    if (type == URES_TABLE) text += quote(key);
    text += print_resource(inner.get()) + '\n';
  }
  return text + '}';
}

bundle open_or_fail(const string& name) {
  bundle root = open_bundle(name);
  if (root == nullptr) fail(name);
  return root;
}

// The part of the file of zones that is called `key`.
std::vector<bundle> list_part(UResourceBundle* root, const char* key) {
  UErrorCode status = U_ZERO_ERROR;
  const bundle part(ures_getByKey(root, key, nullptr, &status), &ures_close);
  if (U_FAILURE(status) != 0) fail(key);
  std::vector<bundle> inner = list_inner(part.get());
  for (const bundle& one : inner)
    if (one == nullptr) fail(key);
  return inner;
}

// The key of a rule among the others: any that is none of the base's.
string print_rule_key(std::size_t number) { return "rule" + to_string(number); }

// The changes in three lists, by how far from 1970 they are: of the far ones, both halves.
string print_changes(const std::vector<icu_change>& changes) {
  constexpr int bits = 32;
  std::vector<std::int32_t> before;
  std::vector<std::int32_t> near;
  std::vector<std::int32_t> after;
  for (const icu_change& change : changes) {
    const auto low = static_cast<std::int32_t>(change.when);
    const auto high = static_cast<std::int32_t>(change.when >> bits);
    if (change.when < std::numeric_limits<std::int32_t>::min()) {
      before.insert(before.end(), {high, low});
    } else if (change.when > std::numeric_limits<std::int32_t>::max()) {
      after.insert(after.end(), {high, low});
    } else {
      near.push_back(low);
    }
  }
  string text;
  if (!before.empty()) text += "transPre32" + print_numbers(before) + '\n';
  if (!near.empty()) text += "trans" + print_numbers(near) + '\n';
  if (!after.empty()) text += "transPost32" + print_numbers(after) + '\n';
  return text;
}

// Finds `one` in `all`, where it is added if need be.
template <typename element>
std::size_t find_or_add(std::vector<element>& all, const element& one) {
  std::size_t index = 0;
  while (index < all.size() && all[index] != one) ++index;
  if (index == all.size()) all.push_back(one);
  return index;
}

}  // namespace

icu_base read_icu_base() {
  icu_base base;
  base.release = get_icu_version();
  const bundle root = open_or_fail(zones_file);
  const auto names = list_part(root.get(), "Names");
  const auto regions = list_part(root.get(), "Regions");
  const auto zones = list_part(root.get(), "Zones");
  if (regions.size() != names.size() || zones.size() != names.size()) fail("regions");
  for (std::size_t i = 0; i < names.size(); ++i) {
    const string name = get_string(names[i].get());
    base.regions[name] = get_string(regions[i].get());
    if (make_own_zone(name) != nullptr && ures_getType(zones[i].get()) == URES_TABLE)
      base.own_zones[name] = print_resource(zones[i].get(), links_key);
  }
  for (const bundle& rule : list_part(root.get(), "Rules")) {
    const string key = quote(get_key(rule.get()));
    const auto has_rule = [&](const auto& zone) { return zone.second.find(key) != string::npos; };
    if (std::any_of(base.own_zones.begin(), base.own_zones.end(), has_rule))
      base.own_rules += key + print_resource(rule.get()) + '\n';
  }
  return base;
}

string print_icu_file(const string& name) {
  const bundle root = open_or_fail(name);
  // All of a file is a table; that it has no others to fall back to, it says by itself.
  return name + ":table(nofallback)" + print_resource(root.get()).substr(std::strlen(":table")) +
         '\n';
}

string print_zone(const icu_zone& zone, std::vector<icu_rule>& rules) {
  std::vector<icu_time> times = {zone.first};
  std::vector<std::uint8_t> kinds;
  for (const icu_change& change : zone.changes)
    kinds.push_back(static_cast<std::uint8_t>(find_or_add(times, change.after)));
  std::vector<std::int32_t> offsets;
  for (const icu_time& time : times) offsets.insert(offsets.end(), {time.standard, time.saving});
  string text =
      ":table{\n" + print_changes(zone.changes) + "typeOffsets" + print_numbers(offsets) + '\n';
  if (!kinds.empty()) text += "typeMap" + print_bytes(kinds) + '\n';
  if (zone.rule) {
    text += "finalRule:string{" + quote(print_rule_key(find_or_add(rules, *zone.rule))) +
            "}\nfinalRaw:int{" + to_string(zone.rule_standard) + "}\nfinalYear:int{" +
            to_string(zone.rule_year) + "}\n";
  }
  return text;
}

string print_zones(const string& release, const std::map<string, zone_entry>& zones,
                   const std::vector<icu_rule>& rules, const string& own_rules) {
  std::map<string, std::size_t> places;
  for (const auto& [name, zone] : zones) places.emplace(name, places.size());
  // Each zone tells all of its names, if it has more than one.
  std::map<string, std::vector<std::size_t>> groups;
  for (const auto& [name, zone] : zones)
    groups[zone.target.empty() ? name : zone.target].push_back(places.at(name));
  string names = "Names:array{\n";
  string regions = "Regions:array{\n";
  string entries = "Zones:array{\n";
  for (const auto& [name, zone] : zones) {
    names += quote(name) + ",\n";
    regions += quote(zone.region) + ",\n";
    if (!zone.target.empty()) {
      entries += ":int{" + to_string(places.at(zone.target)) + "}\n";
      continue;
    }
    entries += zone.text;
    if (groups[name].size() > 1) entries += links_key + print_numbers(groups[name]) + '\n';
    entries += "}\n";
  }
  string all_rules = "Rules:table{\n" + own_rules;
  for (std::size_t i = 0; i < rules.size(); ++i)
    all_rules += print_rule_key(i) + print_numbers(rules[i]) + '\n';
  return string(zones_file) + ":table(nofallback){\n" + names + "}\n" + regions + "}\n" +
         all_rules + "}\nTZVersion:string{" + quote(release) + "}\n" + entries + "}\n}\n";
}
