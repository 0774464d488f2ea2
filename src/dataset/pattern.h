#pragma once

#include <regex>

// Compiles `text`, a pattern of the ECMAScript grammar, for texts of any length.
//
// The names and words that the patterns meet come from outside and have no length limit. A
// backtracking matcher that recurses once for each byte overflows the stack on a long one, and that
// would end the start beyond the reach of every handler. With the GNU C++ library, the compiled
// pattern never recurses with the length of the text and matches in linear time; with another
// library, long texts get what that library's own matcher does with them. Compiling costs far more
// than matching a name, so each pattern is compiled once and kept.
// Throws std::regex_error for a malformed pattern, prints nothing.
[[nodiscard]] std::regex compile_pattern(const char* text);
