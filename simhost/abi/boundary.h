// The edge between the host's C functions and the core: every C function of the two libraries is
// one of the two templates around a body that takes the Call. No C++ exception passes it.
#pragma once

#include <string_view>
#include <type_traits>

#include "abi/call.h"
#include "abi/trap.h"
#include "base/api.h"
#include "base/outcomes.h"

namespace simhost {

/// How a call ended. Plain memory: a jump may leave it behind.
struct Outcome {
  QEX_ReturnStatus status;  ///< unless the host gives up
  bool traps;
  TrapReport report;  ///< if it does
};

/// What the exception being handled makes of a call that answers a status. `ending` is overwritten.
SIMHOST_API void end_with_status(Outcome &ending, char const *call) noexcept;
/// Likewise for a call that has no status to answer with: the host can only give up.
SIMHOST_API void end_without_status(Outcome &ending, char const *call) noexcept;

/// Runs `body` as the call `name` and answers QEX_OK, or what stopped it. Springs the trap only
/// when everything that the body made has been destroyed.
template <typename Body>
QEX_ReturnStatus answer(char const *name, Body const &body) {
  static_assert(std::is_trivially_destructible_v<Body>, "a jump leaves the captures behind");
  Outcome ending;
  try {
    Call call(name);
    body(call);
    call.complete();
    return QEX_OK;
  } catch (...) {
    end_with_status(ending, name);
  }
  if (ending.traps) {
    spring_trap(ending.report);
  }
  return ending.status;
}

/// Likewise for a call without a result; `how` is nothing, or Call::Resumed.
template <typename Body, typename... How>
void run(char const *name, Body const &body, How... how) {
  static_assert(std::is_trivially_destructible_v<Body>, "a jump leaves the captures behind");
  Outcome ending;
  try {
    Call call(name, how...);
    body(call);
    call.complete();
    return;
  } catch (...) {
    end_without_status(ending, name);
  }
  spring_trap(ending.report);
}

/// What a pointer from the caller points to; refuses null (QEX_BAD_PARAM).
template <typename Value>
Value &require(Value *pointer) {
  if (pointer == nullptr) {
    refuse(QEX_BAD_PARAM);
  }
  return *pointer;
}

/// A text from the caller; refuses null (QEX_BAD_PARAM).
inline std::string_view require_text(char const *text) {
  return &require(text);
}

/// A text from the caller; null is empty.
inline std::string_view optional_text(char const *text) {
  return text == nullptr ? std::string_view() : text;
}

}  // namespace simhost
