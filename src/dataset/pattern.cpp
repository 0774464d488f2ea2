#include "dataset/pattern.h"

olm_pattern compile_pattern(const char* text) {
#ifdef __GLIBCXX__
  // This library's matcher recurses for each byte unless a pattern asks for its breadth-first mode.
  return olm_pattern(text, olm_pattern::ECMAScript | std::regex_constants::__polynomial);
#else
  return olm_pattern(text, olm_pattern::ECMAScript);
#endif
}
