// The edge between the host's C functions and the core: every C function of the two libraries runs
// its bodies through one of the functions here, which say whether it reads the state, changes it or
// does neither, and whether it returns a status. No C++ exception passes it.
#pragma once

#include <cxxabi.h>

#include <string_view>
#include <type_traits>

#include "abi/call.h"
#include "abi/trap.h"
#include "base/api.h"
#include "base/outcomes.h"

namespace simhost {

/// How a call that was stopped ends. Plain memory: a jump may leave it behind.
struct Ending {
  QEX_ReturnStatus status;
  bool traps;  ///< although it could return the status
  TrapReport report;
};

/// What the exception being handled makes of a call. `ending` is overwritten.
SIMHOST_API void end_call(Ending &ending, char const *call) noexcept;

/// Runs `body` as a call of one kind; whether it came to its end, or else how it ends. Everything
/// that the body made has been destroyed when this returns.
template <typename KindOfCall, typename Body>
bool completes(CallName const &name, Body const &body, Ending &ending) {
  static_assert(std::is_trivially_destructible_v<Body>, "a jump leaves the captures behind");
  try {
    KindOfCall call(name);
    body(call);
    call.complete();
    return true;
  } catch (abi::__forced_unwind const &) {
    throw;  // the thread ends; no exception
  } catch (...) {
    end_call(ending, name.text);
    return false;
  }
}

/// Runs a call that returns a status: QEX_OK, or the one that says what stopped it.
template <typename KindOfCall, typename Body>
QEX_ReturnStatus status_of_call(CallName const &name, Body const &body) {
  Ending ending;
  if (completes<KindOfCall>(name, body, ending)) {
    return QEX_OK;
  }
  if (ending.traps) {
    spring_trap(ending.report);
  }
  return ending.status;
}

/// Runs a call that returns no status but what its body returns; it traps if something stops it.
template <typename KindOfCall, typename Body>
auto result_of_call(CallName const &name, Body const &body) {
  using Result = std::invoke_result_t<Body const &, KindOfCall &>;
  Ending ending;
  if constexpr (std::is_void_v<Result>) {
    if (!completes<KindOfCall>(name, body, ending)) {
      spring_trap(ending.report);
    }
  } else {
    static_assert(std::is_trivially_destructible_v<Result>, "a jump leaves the result behind");
    Result result{};
    if (!completes<KindOfCall>(
            name, [&](KindOfCall &call) { result = body(call); }, ending)) {
      spring_trap(ending.report);
    }
    return result;
  }
}

/// Calls with a status, declared by what they do to the state. `body` takes the call.
template <typename Body>
QEX_ReturnStatus stateless(CallName const &name, Body const &body) {
  return status_of_call<StatelessCall>(name, body);
}
template <typename Body>
QEX_ReturnStatus reading(CallName const &name, Body const &body) {
  return status_of_call<ReadingCall>(name, body);
}
template <typename Body>
QEX_ReturnStatus changing(CallName const &name, Body const &body) {
  return status_of_call<ChangingCall>(name, body);
}

/// Likewise calls without a status, which return what `body` returns.
template <typename Body>
auto stateless_or_trap(CallName const &name, Body const &body) {
  return result_of_call<StatelessCall>(name, body);
}
template <typename Body>
auto reading_or_trap(CallName const &name, Body const &body) {
  return result_of_call<ReadingCall>(name, body);
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
