#include "recordings/player/trap.h"

#include <dlfcn.h>

#include <algorithm>
#include <array>
#include <cstring>
#include <map>
#include <string>

#include "vswitch/call_trap.h"

// Weak: there is a trap only with the module, and an interpreter only in its processes.
extern "C" {
#pragma weak exception_buffer
#pragma weak exceptionType
#pragma weak exceptionMsg
// NOLINTBEGIN(readability-identifier-naming): the interpreter's own names
extern struct _object *PyErr_NewException(char const *name, struct _object *base,
                                          struct _object *dict) __attribute__((weak));
extern int PyGILState_Ensure(void) __attribute__((weak));
extern void PyGILState_Release(int state) __attribute__((weak));
// NOLINTEND(readability-identifier-naming)
}

namespace recordings {
namespace {

constexpr std::size_t longest_text = 8192;

constinit thread_local std::array<char, longest_text> the_text{};

bool trap_is_there() {
  return &exception_buffer != nullptr && &exceptionType != nullptr && &exceptionMsg != nullptr;
}

_object *made_exception(std::string const &name) {
  if (PyErr_NewException == nullptr || PyGILState_Ensure == nullptr) {
    return nullptr;
  }
  int const state = PyGILState_Ensure();
  // No other lock is held. Never destroyed: tools call until the very end of their process.
  static auto &made = *new std::map<std::string, _object *>;
  _object *&type = made[name];
  if (type == nullptr) {
    type = PyErr_NewException(("recorded." + name).c_str(), nullptr, nullptr);
  }
  PyGILState_Release(state);
  return type;
}

/// The class of that name; null without an interpreter.
_object *exception_named(std::string_view name) {
  auto const symbol = "PyExc_" + std::string(name);
  if (void *const own = dlsym(RTLD_DEFAULT, symbol.c_str())) {
    return *static_cast<_object **>(own);
  }
  auto const plain = name.substr(name.rfind('.') + 1);
  return made_exception(std::string(plain));
}

}  // namespace

void save_trap(SavedTrap &saved) noexcept {
  saved.is_there = trap_is_there();
  if (saved.is_there) {
    std::memcpy(&saved.buffer, &exception_buffer, sizeof saved.buffer);
  }
}

bool is_armed(SavedTrap const &saved) noexcept {
  auto const *const bytes = reinterpret_cast<char const *>(&saved.buffer);
  return saved.is_there &&
         std::any_of(bytes, bytes + sizeof saved.buffer, [](char one) { return one != '\0'; });
}

void restore_trap(SavedTrap const &saved) noexcept {
  if (saved.is_there) {
    std::memcpy(&exception_buffer, &saved.buffer, sizeof saved.buffer);
  }
}

void keep_trap_text(std::string_view text) noexcept {
  auto end = std::min(text.size(), the_text.size() - 1);
  // Not in the middle of a character, which the interpreter would refuse.
  while (end > 0 && end < text.size() && (static_cast<unsigned char>(text[end]) & 0xC0U) == 0x80U) {
    --end;
  }
  std::memcpy(the_text.data(), text.data(), end);
  the_text.at(end) = '\0';
}

char *kept_trap_text() noexcept {
  return the_text.data();
}

void spring_trap(SavedTrap const &saved, char const *class_name, bool has_text,
                 int value) noexcept {
  auto *const type = class_name == nullptr ? nullptr : exception_named(class_name);
  // After that, in which other threads may have had their turn.
  restore_trap(saved);
  exceptionType = type;
  exceptionMsg = has_text ? the_text.data() : nullptr;
  longjmp(exception_buffer, value);
}

}  // namespace recordings
