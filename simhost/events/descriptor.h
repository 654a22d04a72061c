// A file descriptor that is closed when its owner goes.
#pragma once

#include <unistd.h>

#include <cerrno>
#include <string>
#include <system_error>
#include <utility>

namespace simhost::events {

class Descriptor {
 public:
  Descriptor() = default;
  explicit Descriptor(int number) : number_(number) {}
  ~Descriptor() { close(); }
  Descriptor(Descriptor &&other) noexcept : number_(std::exchange(other.number_, -1)) {}
  Descriptor &operator=(Descriptor &&other) noexcept {
    if (this != &other) {
      close();
      number_ = std::exchange(other.number_, -1);
    }
    return *this;
  }
  Descriptor(Descriptor const &) = delete;
  Descriptor &operator=(Descriptor const &) = delete;

  [[nodiscard]] int number() const { return number_; }
  explicit operator bool() const { return number_ >= 0; }

  void close() {
    if (number_ >= 0) {
      ::close(std::exchange(number_, -1));
    }
  }

 private:
  int number_ = -1;
};

[[noreturn]] inline void fail_with_errno(std::string const &what) {
  throw std::system_error(errno, std::generic_category(), what);
}

/// The descriptor that a system call returned; throws std::system_error if it failed.
inline Descriptor owned(int number, char const *what) {
  if (number < 0) {
    fail_with_errno(what);
  }
  return Descriptor(number);
}

}  // namespace simhost::events
