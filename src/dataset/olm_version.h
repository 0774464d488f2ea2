#pragma once

#include <cstdint>
#include <string>

// The version of a data set, read from the data set's name, such as 2019c.1.0: the release year,
// one or more release letters, and two dotted numbers that a name may lack.
//
// Versions are ordered by their fields as they stand here, at the first difference; letters by
// their bytes, so that 2019d is newer than 2019cc. A number that the name lacks is -1 and so older
// than any other. The unknown version (the defaults) is older than every version that was read.
struct olm_version {
  std::int32_t year = -1;
  std::string letters;
  std::int32_t major = -1;
  std::int32_t minor = -1;

  // The unknown version. Throws and prints nothing.
  olm_version() = default;

  // The version that `text` holds; throws and prints what parse does.
  explicit olm_version(const std::string& text);

  // Reads all four fields from `text`, the whole of which must be a version. Where it is not,
  // prints two warnings, "Cannot parse version string ...", and leaves the unknown version. Throws
  // std::out_of_range for a number beyond 32 bits, with the fields before it already set.
  void parse(const std::string& text);

  // Whether this version is strictly newer. Throws and prints nothing.
  [[nodiscard]] bool operator>(const olm_version& other) const;

  [[nodiscard]] bool operator==(const olm_version& other) const = default;
};
