// errno of whoever is called, across what is done beside a call.
#pragma once

#include <cerrno>

namespace recordings {

/// Puts errno back where it ends: a tool may look at it after a call, and a host after a callback.
class KeptErrno {
 public:
  KeptErrno() noexcept : value_(errno) {}
  KeptErrno(KeptErrno const &) = delete;
  KeptErrno &operator=(KeptErrno const &) = delete;
  ~KeptErrno() { errno = value_; }

 private:
  int value_;
};

}  // namespace recordings
