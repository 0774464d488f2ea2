#pragma once

#include <regex>
#include <string>

// What the matcher asks about characters, for patterns of plain characters and ranges of them.
//
// For each of 256 characters in each bracket, the library's own traits ask the locale about classes
// and collation, which no such pattern needs; that was four fifths of a start's instructions. These
// answer that there are none. A pattern that names one, as in \d or [[:digit:]], is refused
// when it is compiled; \b would find no word.
class olm_range_traits : public std::regex_traits<char> {
 public:
  template <typename iterator>
  std::string transform_primary(iterator /*first*/, iterator /*last*/) const {
    return {};
  }
  template <typename iterator>
  std::string lookup_collatename(iterator /*first*/, iterator /*last*/) const {
    return {};
  }
  template <typename iterator>
  char_class_type lookup_classname(iterator /*first*/, iterator /*last*/,
                                   bool /*icase*/ = false) const {
    return {};
  }
  [[nodiscard]] static bool isctype(char /*character*/, char_class_type /*types*/) { return false; }
};

using olm_pattern = std::basic_regex<char, olm_range_traits>;

// Compiles `text`, a pattern of the ECMAScript grammar, for texts of any length.
//
// The names and words that the patterns meet come from outside and have no length limit. A
// backtracking matcher that recurses once for each byte overflows the stack on a long one, and that
// would end the start beyond the reach of every handler. With the GNU C++ library, the compiled
// pattern never recurses with the length of the text and matches in linear time; with another
// library, long texts get what that library's own matcher does with them. Compiling costs far more
// than matching a name, so each pattern is compiled once and kept.
// Throws std::regex_error for a pattern that is malformed or refused, prints nothing.
[[nodiscard]] olm_pattern compile_pattern(const char* text);
