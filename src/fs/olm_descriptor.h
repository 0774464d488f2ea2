#pragma once

#include <unistd.h>

#include <utility>

// The owner of one file descriptor, or of none (-1, what a failed open gives). Its destructor
// closes what is still open. Nothing here throws or prints.
class olm_descriptor {
 public:
  explicit olm_descriptor(int descriptor) : descriptor_(descriptor) {}
  olm_descriptor(const olm_descriptor&) = delete;
  olm_descriptor& operator=(const olm_descriptor&) = delete;
  olm_descriptor(olm_descriptor&& other) noexcept : descriptor_(other.release()) {}
  olm_descriptor& operator=(olm_descriptor&& other) noexcept {
    std::swap(descriptor_, other.descriptor_);
    return *this;
  }
  ~olm_descriptor() {
    if (is_open()) ::close(descriptor_);
  }

  [[nodiscard]] bool is_open() const { return descriptor_ != -1; }
  [[nodiscard]] int get() const { return descriptor_; }

  // Closes now, for a caller that must know: 0, or -1 with errno set. Closed either way.
  [[nodiscard]] int close() { return ::close(std::exchange(descriptor_, -1)); }

  // Gives it to another owner.
  [[nodiscard]] int release() { return std::exchange(descriptor_, -1); }

 private:
  int descriptor_;
};
