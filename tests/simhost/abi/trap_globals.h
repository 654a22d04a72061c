// Calling the host the way the module does: with the trap armed.
#pragma once

#include <cstring>
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

/// What a call raises that traps because of what it was given.
inline Raised trapped_with(std::string const &message) {
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

/// Where the trap leads after lead_the_trap_elsewhere(), which is to be no frame of a call.
inline jmp_buf elsewhere;

/// What code of a caller's does to the trap by calling the host through the module.
inline void lead_the_trap_elsewhere() {
  std::memcpy(&exception_buffer, &elsewhere, sizeof exception_buffer);
}

/// Whether `call` leaves the trap where it was armed for it, although the code that it runs leads
/// it elsewhere: `misuse`, which traps, lands where it would have landed before.
template <typename Call, typename Misuse>
bool keeps_the_trap(Call const &call, Misuse const &misuse) {
  static bool landed;
  landed = false;
  auto const went_elsewhere = raised_by([&] {
    std::memcpy(&elsewhere, &exception_buffer, sizeof elsewhere);
    raised_by([&] {
      call();
      misuse();
    });
    landed = true;
  });
  return landed && !went_elsewhere.has_value();
}
