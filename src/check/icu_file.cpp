#include "check/icu_file.h"

#include <bit>
#include <cstdint>
#include <cstring>
#include <stdexcept>
#include <string>

namespace {

// A number as this machine has it, at `place`. Zero beyond the end.
template <typename number>
number get_number(std::string_view data, std::uint64_t place) {
  number found = 0;
  if (place + sizeof found <= data.size()) std::memcpy(&found, data.data() + place, sizeof found);
  return found;
}

}  // namespace

// The header has its own length, two bytes that never change, the byte order, and the format. The
// bundle after it has a word for its root, then some numbers; the first says how many these are,
// and the fourth where the bundle ends, in words.
void check_icu_file(std::string_view data) {
  constexpr std::string_view magic = "\xda\x27";
  constexpr std::string_view format = "ResB";
  constexpr std::uint64_t word = 4;
  constexpr std::uint64_t least_header = 24;
  constexpr std::uint32_t least_numbers = 5;
  const auto header = get_number<std::uint16_t>(data, 0);
  const auto info = get_number<std::uint16_t>(data, 4);
  const auto numbers = get_number<std::uint32_t>(data, header + word) & 0xff;
  const char is_big_endian = std::endian::native == std::endian::big ? 1 : 0;
  if (data.size() < least_header || data.substr(2, 2) != magic || data.substr(12, 4) != format ||
      header < least_header || info < least_header - word || numbers < least_numbers)
    throw std::invalid_argument("is no file of ICU's resources");
  if (data[8] != is_big_endian || data[9] != 0 || data[10] != 2)
    throw std::invalid_argument("is for machines of another kind");
  const char version = data[16];
  if (version < 1 || version > 3)
    throw std::invalid_argument("is of a version of the format that is not known");
  const std::uint64_t end = header + word * get_number<std::uint32_t>(data, header + 4 * word);
  // One that was taken out of a package is filled up.
  constexpr std::uint64_t step = 16;
  const bool has_end = data.size() == end || data.size() == (end + step - 1) / step * step;
  if (has_end) return;
  throw std::invalid_argument("is " + std::to_string(data.size()) +
                              " bytes long and says that it has " + std::to_string(end));
}
