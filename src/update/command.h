// Other programs' help: no shell is involved.
#pragma once

#include <optional>
#include <string>
#include <vector>

struct command_result {
  int status = 0;  // the exit status, or 128 and the number of the signal that ended it
  std::vector<std::string> lines;  // what it said on both streams
};

// Runs the program words[0], found by PATH, with the rest as its arguments, and reads its standard
// input from `input`. None where there is no such program. Prints nothing; throws std::system_error
// where it cannot be run or heard.
[[nodiscard]] std::optional<command_result> run_command(std::vector<std::string> words, int input);
