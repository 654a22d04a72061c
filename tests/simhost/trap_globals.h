// Calling the host the way the module does: with the trap armed.
#pragma once

#include <optional>
#include <ostream>
#include <string>
#include <type_traits>

#include "vswitch/call_trap.h"

/// Stands in for the interpreter's objects; the host only ever passes their addresses on.
struct _object {
  char const *name;
};

struct Raised {
  std::string type;
  std::string message;
  bool operator==(Raised const &) const = default;
  friend std::ostream &operator<<(std::ostream &stream, Raised const &raised) {
    return stream << raised.type << ": " << raised.message;
  }
};

/// What the host raises when it gives up on what it was handed.
inline Raised gave_up_with(std::string const &message) {
  return {.type = "RuntimeError", .message = message};
}

/// What the trap raises while `call` runs; nothing if it does not spring.
template <typename Call>
std::optional<Raised> raised_by(Call const &call) {
  static_assert(std::is_trivially_destructible_v<Call>, "the jump crosses the call");
  exception_status = setjmp(exception_buffer);
  if (exception_status != 0) {
    return Raised{.type = exceptionType->name, .message = exceptionMsg};
  }
  call();
  return std::nullopt;
}
