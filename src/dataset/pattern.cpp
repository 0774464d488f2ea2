#include "dataset/pattern.h"

std::regex compile_pattern(const char* text) {
#ifdef __GLIBCXX__
  // This library's matcher recurses for each byte unless a pattern asks for its breadth-first mode.
  return std::regex(text, std::regex::ECMAScript | std::regex_constants::__polynomial);
#else
  return std::regex(text, std::regex::ECMAScript);
#endif
}
