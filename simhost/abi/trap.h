// Springing the call trap.
#pragma once

#include <array>
#include <string_view>

#include "base/api.h"
#include "base/outcomes.h"

namespace simhost {

/// Why the host gives up on a call. Plain memory: a jump may leave it behind.
struct TrapReport {
  TrapKind kind;
  std::array<char, 1024> text;  ///< UTF-8 with its NUL
};

/// Writes "<call>: <message>", or the message alone without a call, into the report: cut at its
/// size between two characters, and with a
/// "?" for each byte that is no UTF-8, because the interpreter refuses a text with such bytes.
void describe(TrapReport &report, TrapKind kind, std::string_view call,
              std::string_view message) noexcept;

/// Raises the report in the interpreter that armed the trap. In a process without the module,
/// writes it to standard error and aborts. The caller's frame must hold nothing that wants
/// destroying.
[[noreturn]] SIMHOST_API void spring_trap(TrapReport const &report) noexcept;

/// What a function of the caller's answers. It may call the host, for which the trap is armed anew:
/// afterwards the trap leads again to where it led before.
SIMHOST_API char call_back(char (*callback)(void *, void *), void *reached, void *context);

}  // namespace simhost
