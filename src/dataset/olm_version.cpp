#include "dataset/olm_version.h"

#include <regex>
#include <stdexcept>
#include <tuple>

#include "dataset/pattern.h"
#include "fs/device.h"

namespace {

// The whole text, then year, letters and the two dotted numbers.
constexpr std::size_t sub_match_count = 5;

// The sub-matches of the version that `text` is. Prints a warning and throws std::invalid_argument
// when it is none.
std::smatch match_version(const std::string& text) {
  static const olm_pattern pattern =
      compile_pattern(R"(([0-9]+)([a-z]+)(?:\.([0-9]+))?(?:\.([0-9]+))?)");
  std::smatch results;
  const bool matched = std::regex_match(text, results, pattern);
  if (!matched || results.size() != sub_match_count) {
    device::warn("Cannot parse version string %s, results.size() = %d", text.c_str(),
                 static_cast<int>(results.size()));
    throw std::invalid_argument("no match");
  }
  return results;
}

// The number that a group of digits holds, or -1 for a group that took no part in the match.
// Throws std::out_of_range for a number beyond 32 bits.
std::int32_t read_number(const std::ssub_match& digits) {
  return digits.matched ? std::stoi(digits.str()) : -1;
}

}  // namespace

olm_version::olm_version(const std::string& text) { parse(text); }

void olm_version::parse(const std::string& text) {
  try {
    const std::smatch results = match_version(text);
    year = read_number(results[1]);
    letters = results[2];
    major = read_number(results[3]);
    minor = read_number(results[4]);
  } catch (const std::invalid_argument&) {
    device::warn("Cannot parse version string %s", text.c_str());
    *this = olm_version();
  }
}

bool olm_version::operator>(const olm_version& other) const {
  return std::tie(year, letters, major, minor) >
         std::tie(other.year, other.letters, other.major, other.minor);
}
