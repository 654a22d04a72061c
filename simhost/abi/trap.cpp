// The one place that jumps, and that keeps what a jump needs. Its own frames hold no object with a
// destructor.
#include "abi/trap.h"

#include <algorithm>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <span>

#include "base/utf8.h"
#include "vswitch/call_trap.h"

// Weak: the module and the interpreter provide these when they are in the process. Without them a
// plain C program can use the host as well.
extern "C" {
#pragma weak exception_buffer
#pragma weak exceptionType
#pragma weak exceptionMsg
// NOLINTBEGIN(readability-identifier-naming): the interpreter's own names
#define SIMHOST_KIND(kind, type) extern struct _object *PyExc_##type __attribute__((weak));
SIMHOST_TRAP_KINDS(SIMHOST_KIND)
#undef SIMHOST_KIND
// NOLINTEND(readability-identifier-naming)
}

namespace simhost {
namespace {

// The caller reads the message after the jump, and may keep the pointer until the next one.
constinit TrapReport last_report{};

_object **exception_variable(TrapKind kind) {
  switch (kind) {
#define SIMHOST_KIND(kind, type) \
  case TrapKind::kind:           \
    return &PyExc_##type;
    SIMHOST_TRAP_KINDS(SIMHOST_KIND)
#undef SIMHOST_KIND
  }
  __builtin_unreachable();
}

_object *exception_type(TrapKind kind) {
  _object **const type = exception_variable(kind);
  return type == nullptr ? nullptr : *type;
}

bool trap_is_there() {
  return &exception_buffer != nullptr && &exceptionType != nullptr && &exceptionMsg != nullptr;
}

// Appends what fits of `text` to the `used` bytes of `target`; returns the bytes used then.
std::size_t append(std::span<char> target, std::size_t used, std::string_view text) {
  while (!text.empty()) {
    auto const length = character_length(text);
    auto const step = std::max<std::size_t>(length, 1);
    if (used + step >= target.size()) {
      break;
    }
    if (length == 0) {
      target[used] = '?';
    } else {
      std::memcpy(&target[used], text.data(), length);
    }
    used += step;
    text.remove_prefix(step);
  }
  return used;
}

}  // namespace

void describe(TrapReport &report, TrapKind kind, std::string_view call,
              std::string_view message) noexcept {
  report.kind = kind;
  report.type = nullptr;
  std::size_t used = 0;
  if (!call.empty()) {
    used = append(report.text, used, call);
    used = append(report.text, used, ": ");
  }
  used = append(report.text, used, message);
  report.text.at(used) = '\0';
}

void spring_trap(TrapReport const &report) noexcept {
  auto *const type = report.type == nullptr ? exception_type(report.kind) : report.type;
  if (!trap_is_there() || type == nullptr) {
    std::fprintf(stderr, "simulated host: %s\n", report.text.data());
    std::abort();
  }
  last_report = report;
  exceptionType = type;
  exceptionMsg = last_report.text.data();
  longjmp(exception_buffer, 1);
}

void save_trap(SavedTrap &saved) noexcept {
  if (trap_is_there()) {
    std::memcpy(&saved.buffer, &exception_buffer, sizeof saved.buffer);
  }
}

void restore_trap(SavedTrap const &saved) noexcept {
  if (trap_is_there()) {
    std::memcpy(&exception_buffer, &saved.buffer, sizeof saved.buffer);
  }
}

}  // namespace simhost
