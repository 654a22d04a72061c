// Waiting, as a call does that a fault delays.
#pragma once

#include <chrono>
#include <stdexcept>
#include <string>

/// An object of the interpreter's; only its address goes anywhere.
struct _object;

namespace simhost {

/// A handler of a signal raised while a call waited: the call traps with what was raised.
class Interrupted : public std::runtime_error {
 public:
  Interrupted(_object *type, std::string const &text) : std::runtime_error(text), type_(type) {}
  [[nodiscard]] _object *type() const { return type_; }

 private:
  _object *type_;
};

/// Waits in real time, no call running. A thread that holds the interpreter lets go of it, so that
/// other threads run, and handles signals as the interpreter's own sleep() does; what a handler
/// raises is thrown as Interrupted. Only the main thread handles signals, which is the
/// interpreter's own rule. The trap leads afterwards where it led before.
void pause(std::chrono::milliseconds duration);

}  // namespace simhost
