// A table of whole starts, read from a text file.
//
// A line "state NAME" gives a name to the entries (see device.h) that follow it, indented. A line
// "case NAME" begins a start; the lines that follow it, indented too, tell the device:
//   has ENTRY        what it holds before, in order
//   says "WARNING"   what the program prints, in order
//   ends END         how it ends, if not by exit 0
//   then ENTRY       all that look() finds afterwards
// The name of a state in place of an entry stands for its entries. A # begins a comment line.
// Everywhere, \xNN is a byte and {N*TEXT} is TEXT N times; \n in an entry is a newline.
#pragma once

#include <map>
#include <string>
#include <vector>

#include "testbed/device.h"

struct start_case {
  std::string name;
  std::string device;
  report heard;
  std::string after;
};

class start_table {
 public:
  // Reads `file`. Throws std::runtime_error, which names the line, when it cannot be understood.
  explicit start_table(const std::string& file);

  std::map<std::string, std::string> states;
  std::vector<start_case> cases;

 private:
  [[nodiscard]] std::string expand(const std::string& entry) const;
  bool add_to_last_case(const std::string& word, const std::string& rest);
};
