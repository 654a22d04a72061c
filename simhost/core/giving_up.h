// The two ways in which the core ends a call early.
#pragma once

#include <exception>
#include <stdexcept>
#include <string>

#include "core/api.h"
#include "qexapi/status.h"

namespace simhost {

/// The host refuses the call: the caller gets `status`.
class Refused : public std::exception {
 public:
  explicit Refused(QEX_ReturnStatus status) : status_(status) {}
  [[nodiscard]] QEX_ReturnStatus status() const { return status_; }
  [[nodiscard]] char const *what() const noexcept override { return "the host refuses the call"; }

 private:
  QEX_ReturnStatus status_;
};

/// The interpreter's exception types with which the host gives up.
enum class PanicKind { runtime_error, os_error };

/// The host gives up on the call: the call trap springs with what(), the call's name before it.
class HostPanic : public std::runtime_error {
 public:
  HostPanic(PanicKind kind, std::string const &message)
      : std::runtime_error(message), kind_(kind) {}
  [[nodiscard]] PanicKind kind() const { return kind_; }

 private:
  PanicKind kind_;
};

/// Throws Refused; for the host's two libraries, which share no exception type with the core.
[[noreturn]] SIMHOST_API void refuse(QEX_ReturnStatus status);

}  // namespace simhost
