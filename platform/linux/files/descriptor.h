#pragma once

#include <unistd.h>

#include <cerrno>
#include <utility>

namespace platform {

// Owns an open file descriptor; closes it when it goes, and leaves errno as it is.
class Descriptor {
 public:
  Descriptor() = default;
  explicit Descriptor(int number) : _number{number} {}
  Descriptor(const Descriptor&) = delete;
  Descriptor(Descriptor&& other) noexcept : _number{other.release()} {}
  Descriptor& operator=(const Descriptor&) = delete;
  Descriptor& operator=(Descriptor&& other) noexcept {
    std::swap(_number, other._number);
    return *this;
  }
  ~Descriptor() {
    const int cause = errno;
    if (_number >= 0) ::close(_number);
    errno = cause;
  }

  [[nodiscard]] bool isOpen() const { return _number >= 0; }
  [[nodiscard]] int number() const { return _number; }
  // Hands the descriptor over to the caller.
  [[nodiscard]] int release() { return std::exchange(_number, -1); }

 private:
  int _number = -1;
};

}  // namespace platform
