#include "check/icu_file.h"

#include <bit>
#include <cstdint>
#include <cstring>
#include <set>
#include <stdexcept>
#include <string>
#include <vector>

namespace {

using place = std::uint64_t;

constexpr place word = 4;
constexpr place half = 2;

[[noreturn]] void refuse(const std::string& reason) { throw std::invalid_argument(reason); }

// A number as this machine has it.
template <typename number>
number get_number(std::string_view data, place at) {
  if (at + sizeof(number) > data.size()) refuse("has parts that lie beyond its end");
  number found = 0;
  std::memcpy(&found, data.substr(at).data(), sizeof found);
  return found;
}

// The resources in a bundle: what follows the header. Each is a word: its kind in the four high
// bits, and in the others where it is, or its value. First come the bundle's own numbers, then the
// names of what is in tables, then all that is counted in half words, then the rest.
class olm_bundle {
 public:
  // `data` ends where the bundle says that it ends.
  explicit olm_bundle(std::string_view data)
      : data_(data),
        begin_of_names_(word * (1 + (get_number<std::uint32_t>(data, word) & 0xff))),
        end_of_names_(word * get_number<std::uint32_t>(data, 2 * word)) {}

  // Sees that all that can be reached from its root lies within.
  void check() {
    add(get_number<std::uint32_t>(data_, 0));
    while (!resources_.empty()) {
      const std::uint32_t resource = resources_.back();
      resources_.pop_back();
      check_resource(resource >> 28, resource & 0x0fffffff);
    }
  }

 private:
  enum kinds : std::uint32_t {
    text = 0,
    binary = 1,
    table = 2,
    table_of_words = 4,
    table_of_halves = 5,
    text_of_halves = 6,
    integer = 7,
    array = 8,
    array_of_halves = 9,
    integers = 14
  };

  void add(std::uint32_t resource) {
    if (known_.insert(resource).second) resources_.push_back(resource);
  }

  void check_resource(std::uint32_t kind, place offset) {
    const place at = offset * word;
    const place half_at = end_of_names_ + offset * half;
    if (kind == text_of_halves) return check_text(half_at);
    if (kind == table_of_halves) return check_items<std::uint16_t, std::uint16_t>(half_at, true);
    if (kind == array_of_halves) return check_items<std::uint16_t, std::uint16_t>(half_at, false);
    // Without a place, all of these are empty.
    if (kind == integer || offset == 0) return;
    if (kind == table) return check_items<std::uint16_t, std::uint32_t>(at, true);
    if (kind == table_of_words) return check_items<std::uint32_t, std::uint32_t>(at, true);
    if (kind == array) return check_items<std::uint32_t, std::uint32_t>(at, false);
    if (kind != text && kind != binary && kind != integers)
      refuse("has a resource of no known kind");
    const place count = get_number<std::uint32_t>(data_, at);
    const place size = kind == text ? half : kind == binary ? 1 : word;
    // A text has an end that is not counted.
    const place length = (kind == text ? count + 1 : count) * size;
    if (at + word + length > data_.size()) refuse("has parts that lie beyond its end");
  }

  // A text's length comes first, as units that no text begins with; or else it has an end.
  void check_text(place at) const {
    const std::uint32_t first = get_number<std::uint16_t>(data_, at);
    const auto next = [&](place number) -> std::uint32_t {
      return get_number<std::uint16_t>(data_, at + number * half);
    };
    place length = 0;
    if (first < 0xdc00 || first > 0xdfff) {
      while (next(length) != 0) ++length;
    } else if (first < 0xdfef) {
      length = 1 + (first & 0x3ff);
    } else if (first < 0xdfff) {
      length = 2 + ((first - 0xdfef) << 16 | next(1));
    } else {
      length = 3 + (next(1) << 16 | next(2));
    }
    if (next(length) != 0) refuse("has a text without an end");
  }

  // A list: a count as wide as a name's place, the places of the names if it is a table, and the
  // items.
  template <typename name, typename item>
  void check_items(place at, bool has_names) {
    const place count = get_number<name>(data_, at);
    at += sizeof(name);
    std::string_view last;
    for (place i = 0; has_names && i < count; ++i, at += sizeof(name)) {
      const std::string_view next = get_name(get_number<name>(data_, at));
      if (i > 0 && next <= last) refuse("has a table that is out of order");
      last = next;
    }
    if (sizeof(item) == word) at = (at + word - 1) / word * word;
    for (place i = 0; i < count; ++i, at += sizeof(item)) {
      const auto next = get_number<item>(data_, at);
      add(sizeof(item) == word ? next : text_of_halves << 28 | next);
    }
  }

  [[nodiscard]] std::string_view get_name(place at) const {
    const std::string_view names = data_.substr(0, end_of_names_);
    const place end = names.find('\0', at);
    if (at < begin_of_names_ || end == std::string_view::npos) refuse("has a name without an end");
    return names.substr(at, end - at);
  }

  std::string_view data_;
  place begin_of_names_;
  place end_of_names_;
  std::vector<std::uint32_t> resources_;  // yet to be looked at
  std::set<std::uint32_t> known_;
};

}  // namespace

// The header has its own length, two bytes that never change, the byte order, and the format. The
// bundle after it has a word for its root, then some numbers: how many these are, where the names
// end, two more of the kind, and where the bundle ends, all in words.
void check_icu_file(std::string_view data) {
  constexpr std::string_view magic = "\xda\x27";
  constexpr std::string_view format = "ResB";
  constexpr place least_header = 24;
  constexpr std::uint32_t least_numbers = 7;
  constexpr std::uint32_t needs_others = 4;
  if (data.size() < least_header || data.substr(2, 2) != magic || data.substr(12, 4) != format)
    refuse("is no file of ICU's resources");
  const char is_big_endian = std::endian::native == std::endian::big ? 1 : 0;
  if (data[8] != is_big_endian || data[9] != 0 || data[10] != half)
    refuse("is for machines of another kind");
  if (data[16] < 2 || data[16] > 3) refuse("is of a version of the format that is not known");
  const place header = get_number<std::uint16_t>(data, 0);
  const place info = get_number<std::uint16_t>(data, 4);
  const auto numbers = get_number<std::uint32_t>(data, header + word) & 0xff;
  if (header < least_header || header % word != 0 || info < least_header - word ||
      numbers < least_numbers)
    refuse("is no file of ICU's resources");
  const place end = header + word * get_number<std::uint32_t>(data, header + 4 * word);
  // One that was taken out of a package is filled up.
  constexpr place step = 16;
  if (data.size() != end && data.size() != (end + step - 1) / step * step) {
    refuse("is " + std::to_string(data.size()) + " bytes long and says that it has " +
           std::to_string(end));
  }
  if ((get_number<std::uint32_t>(data, header + 6 * word) & needs_others) != 0)
    refuse("has names in another file");
  olm_bundle(data.substr(header, end - header)).check();
}
