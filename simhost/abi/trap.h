// The call trap: how it is sprung, and where it leads.
#pragma once

#include <setjmp.h>

#include <array>
#include <string_view>

#include "base/api.h"
#include "base/outcomes.h"

/// An object of the interpreter's; only its address goes anywhere.
struct _object;

namespace simhost {

/// Why a call traps. Plain memory: a jump may leave it behind.
struct TrapReport {
  TrapKind kind;
  _object *type;                ///< of the interpreter's own; null for that of the kind
  std::array<char, 1024> text;  ///< UTF-8 with its NUL
};

/// Writes "<call>: <message>", or the message alone without a call, into the report: cut at its
/// size between two characters, and with a "?" for each byte that is no UTF-8, because the
/// interpreter refuses a text with such bytes.
void describe(TrapReport &report, TrapKind kind, std::string_view call,
              std::string_view message) noexcept;

/// Raises the report in the interpreter that armed the trap. In a process without the module,
/// writes it to standard error and aborts. The caller's frame must hold nothing that wants
/// destroying.
[[noreturn]] SIMHOST_API void spring_trap(TrapReport const &report) noexcept;

/// Where the trap leads. Plain memory, so that code of the caller's may jump over it.
struct SavedTrap {
  jmp_buf buffer;
};

SIMHOST_API void save_trap(SavedTrap &saved) noexcept;
SIMHOST_API void restore_trap(SavedTrap const &saved) noexcept;

}  // namespace simhost
