// The one table from exceptions to what a caller of the host sees of them.
#pragma once

#include <string>

#include "base/outcomes.h"
#include "qexapi/status.h"

/// An object of the interpreter's; only its address goes anywhere.
struct _object;

namespace simhost {

/// What ended a call early, for callers of every kind.
struct Outcome {
  QEX_ReturnStatus status;  ///< for a function that returns one
  bool traps;               ///< whether a call of the host traps although it could return a status
  TrapKind kind;            ///< with which a call traps
  TrapText text;
  std::string reason;       ///< in words
  _object *type = nullptr;  ///< of the interpreter's own, instead of that of the kind
};

/// The outcome of the exception that is being handled.
Outcome current_outcome() noexcept;

}  // namespace simhost
