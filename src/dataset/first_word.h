#pragma once

#include <string>

// The first word of the file `path`: white space is skipped, then bytes are taken up to the next
// white space (that of the "C" locale) or the end, however many they are. Empty when the file
// cannot be opened or holds no word; that is no failure. Where memory runs out or reading fails,
// the word ends there. Throws only when memory runs out before that, prints nothing.
[[nodiscard]] std::string read_first_word(const std::string& path);
