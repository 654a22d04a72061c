// The two ways in which the core ends a call early.
#pragma once

#include <optional>
#include <stdexcept>
#include <string>
#include <string_view>

#include "base/api.h"
#include "qexapi/status.h"

namespace simhost {

/// The host refuses the call: the caller gets `status`.
class Refused : public std::runtime_error {
 public:
  explicit Refused(QEX_ReturnStatus status)
      : std::runtime_error("the host refuses the call"), status_(status) {}
  /// With the reason in words, for people who change the host from outside.
  Refused(QEX_ReturnStatus status, std::string const &reason)
      : std::runtime_error(reason), status_(status), has_reason_(true) {}
  [[nodiscard]] QEX_ReturnStatus status() const { return status_; }
  /// Whether what() is a reason of its own.
  [[nodiscard]] bool has_reason() const { return has_reason_; }

 private:
  QEX_ReturnStatus status_;
  bool has_reason_ = false;
};

// The interpreter's exception types: what a panic kind is called here, and there.
#define SIMHOST_TRAP_KINDS(KIND)                   \
  KIND(runtime_error, RuntimeError)                \
  KIND(os_error, OSError)                          \
  KIND(connection_error, ConnectionError)          \
  KIND(index_error, IndexError)                    \
  KIND(key_error, KeyError)                        \
  KIND(memory_error, MemoryError)                  \
  KIND(not_implemented_error, NotImplementedError) \
  KIND(permission_error, PermissionError)          \
  KIND(system_error, SystemError)                  \
  KIND(timeout_error, TimeoutError)                \
  KIND(type_error, TypeError)                      \
  KIND(value_error, ValueError)

/// The exception types with which calls trap: by themselves with the first two.
enum class TrapKind {
#define SIMHOST_KIND(kind, type) kind,
  SIMHOST_TRAP_KINDS(SIMHOST_KIND)
#undef SIMHOST_KIND
};

/// The kind of a type that the interpreter calls `type`, such as "OSError".
std::optional<TrapKind> find_trap_kind(std::string_view type);
/// All types, with commas between them.
std::string trap_types();

/// Whether the trap's text begins with the name of the call.
enum class TrapText { after_call, verbatim };

/// The call traps with what().
class Trapped : public std::runtime_error {
 public:
  Trapped(TrapKind kind, std::string const &message, TrapText text = TrapText::after_call)
      : std::runtime_error(message), kind_(kind), text_(text) {}
  [[nodiscard]] TrapKind kind() const { return kind_; }
  [[nodiscard]] TrapText text() const { return text_; }

 private:
  TrapKind kind_;
  TrapText text_;
};

/// Throws Refused; for the host's two libraries, which share no exception type with the core.
[[noreturn]] SIMHOST_API void refuse(QEX_ReturnStatus status);

}  // namespace simhost
