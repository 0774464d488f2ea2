// The two ways in which taking an update ends early.
#pragma once

#include <cerrno>
#include <exception>
#include <string>
#include <system_error>
#include <utility>
#include <vector>

// The update is refused, for these reasons.
struct olm_refusal : std::exception {
  explicit olm_refusal(std::vector<std::string> why) : reasons(std::move(why)) {}
  std::vector<std::string> reasons;
};

// A call failed: throws std::system_error, with `what`, such as a path, and the text of errno.
[[noreturn]] inline void fail(const std::string& what) {
  throw std::system_error(errno, std::generic_category(), what);
}
