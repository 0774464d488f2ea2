// What the programs that answer questions have in common: they print to the standard output stream,
// and end with one exit status where they cannot tell.
#pragma once

#include <string>

inline constexpr int cannot_be_told = 2;

// Names come from outside: a control byte shows as a question mark, so that a line stays one.
[[nodiscard]] std::string clean(std::string text);

// Sees that what was printed got through. Prints why not, and ends the program, otherwise.
void flush_output();

// Prints `text` on the standard output stream and ends the program, with success if that gets
// through.
[[noreturn]] void print_and_exit(const std::string& text);

// Prints `usage` on the standard error stream and ends the program.
[[noreturn]] void refuse_usage(const char* usage);
