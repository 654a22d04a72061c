// The interpreter is used if there is one in the process and this thread holds it; a plain C
// program just sleeps, and handles its signals itself.
#include "abi/pause.h"

#include <algorithm>
#include <ctime>

#include "abi/call.h"
#include "abi/trap.h"

// Weak, because a process without the interpreter has none of them.
extern "C" {
// NOLINTBEGIN(readability-identifier-naming): the interpreter's own names
int Py_IsInitialized() __attribute__((weak));
int PyGILState_Check() __attribute__((weak));
struct _ts *PyEval_SaveThread() __attribute__((weak));
void PyEval_RestoreThread(struct _ts *thread) __attribute__((weak));
int PyErr_CheckSignals() __attribute__((weak));
void PyErr_Fetch(struct _object **type, struct _object **value, struct _object **traceback)
    __attribute__((weak));
void PyErr_Clear() __attribute__((weak));
struct _object *PyObject_Str(struct _object *object) __attribute__((weak));
char const *PyUnicode_AsUTF8(struct _object *text) __attribute__((weak));
void Py_DecRef(struct _object *object) __attribute__((weak));
// NOLINTEND(readability-identifier-naming)
}

namespace simhost {
namespace {

using std::chrono::steady_clock;

// A signal may reach another thread than the one that waits; then this is how late it is noticed.
constexpr std::chrono::milliseconds kSlice{100};

bool holds_interpreter() {
  return Py_IsInitialized != nullptr && Py_IsInitialized() != 0 && PyGILState_Check() != 0;
}

// Ends early when a signal arrives.
void sleep_for(std::chrono::nanoseconds duration) {
  auto const seconds = std::chrono::duration_cast<std::chrono::seconds>(duration);
  timespec const wanted{.tv_sec = seconds.count(), .tv_nsec = (duration - seconds).count()};
  nanosleep(&wanted, nullptr);
}

// The text of a value of the interpreter's; empty if it has none.
std::string text_of(_object *value) {
  auto *const object = value == nullptr ? nullptr : PyObject_Str(value);
  char const *const text = object == nullptr ? nullptr : PyUnicode_AsUTF8(object);
  std::string copy = text == nullptr ? "" : text;
  Py_DecRef(object);
  PyErr_Clear();
  return copy;
}

[[noreturn]] void throw_raised() {
  _object *type = nullptr;
  _object *value = nullptr;
  _object *traceback = nullptr;
  PyErr_Fetch(&type, &value, &traceback);
  Interrupted const interrupted(type, text_of(value));
  Py_DecRef(value);
  Py_DecRef(traceback);
  // The reference to the type is kept: whoever raises it after the jump borrows it.
  throw interrupted;
}

// The interpreter ends a thread that comes back while it ends itself, as an exception would end
// this function; so nothing here is left to a destructor, which no such exception may leave.
void wait_with_interpreter(std::chrono::nanoseconds duration) {
  auto *const thread = PyEval_SaveThread();
  sleep_for(duration);
  PyEval_RestoreThread(thread);
  if (PyErr_CheckSignals() != 0) {
    throw_raised();
  }
}

void wait(std::chrono::nanoseconds duration) {
  if (holds_interpreter()) {
    wait_with_interpreter(duration);
  } else {
    sleep_for(duration);
  }
}

}  // namespace

void pause(std::chrono::milliseconds duration) {
  require_no_call();
  SavedTrap saved;
  save_trap(saved);
  auto const end = steady_clock::now() + duration;
  for (auto now = steady_clock::now(); now < end; now = steady_clock::now()) {
    wait(std::min<std::chrono::nanoseconds>(end - now, kSlice));
    restore_trap(saved);
  }
}

}  // namespace simhost
