#include "recordings/replayer/host.h"

#include <dlfcn.h>
#include <setjmp.h>

#include <array>
#include <cstring>
#include <type_traits>

#include "nebpublic/data.h"
#include "nebpublic/kernel_state.h"
#include "nebpublic/names.h"
#include "nebpublic/state.h"
#include "recordings/core/shapes.h"
#include "recordings/core/signatures.h"
#include "recordings/replayer/stand_ins.h"
#include "vswitch/configuration.h"
#include "vswitch/queries.h"
#include "vswitch/status_text.h"

namespace recordings {
namespace {

/// The trap, which the module has.
struct Trap {
  jmp_buf *buffer;
  _object **type;
  char **text;
};

Trap trap{};

template <typename T>
T argument(std::uint64_t word) {
  if constexpr (std::is_same_v<T, Visit>) {
    return word == 0 ? nullptr : visit;
  } else if constexpr (std::is_same_v<T, Allocate>) {
    return word == 0 ? nullptr : allocate;
  } else if constexpr (std::is_same_v<T, Release>) {
    return word == 0 ? nullptr : release;
  } else if constexpr (std::is_pointer_v<T>) {
    return reinterpret_cast<T>(word);
  } else {
    return static_cast<T>(word);
  }
}

/// Calls a function whose type is known. A trap jumps over this frame, so nothing in it has a
/// destructor.
template <typename Returned, typename... Parameters, std::size_t... positions>
std::uint64_t call(Returned (*function)(Parameters...), Words words,
                   std::index_sequence<positions...> /**/) {
  if constexpr (std::is_void_v<Returned>) {
    function(argument<Parameters>(words[positions])...);
    return 0;
  } else {
    return word_of(function(argument<Parameters>(words[positions])...));
  }
}

using Invoke = std::uint64_t (*)(void *function, Words words);

template <typename Function>
struct Typed;

template <typename Returned, typename... Parameters>
struct Typed<Returned(Parameters...)> {
  static std::uint64_t invoke(void *function, Words words) {
    return call(reinterpret_cast<Returned (*)(Parameters...)>(function), words,
                std::index_sequence_for<Parameters...>());
  }
};

/// What follows the format is in no trace.
template <typename Returned, typename... Parameters>
struct Typed<Returned(Parameters..., ...)> {
  static constexpr Invoke invoke = nullptr;
};

// In the order of `calls`.
constexpr Invoke invokes[] = {
#include "invokes.inc"
};

std::array<void *, std::size(invokes)> functions{};

}  // namespace

std::string find_host(char const *module) {
  void *const loaded = dlopen(module, RTLD_NOW | RTLD_NOLOAD);
  if (loaded == nullptr) {
    return "the module is not loaded";
  }
  trap.buffer = static_cast<jmp_buf *>(dlsym(loaded, "exception_buffer"));
  trap.type = static_cast<_object **>(dlsym(loaded, "exceptionType"));
  trap.text = static_cast<char **>(dlsym(loaded, "exceptionMsg"));
  if (trap.buffer == nullptr || trap.type == nullptr || trap.text == nullptr) {
    return "the module has no trap";
  }
  for (std::size_t at = 0; at < functions.size(); ++at) {
    functions[at] = dlsym(loaded, calls[at].name.data());
  }
  return {};
}

bool has_function(std::size_t number) noexcept {
  return functions[number] != nullptr && invokes[number] != nullptr;
}

Ended make_call(std::size_t number, Words words) noexcept {
  jmp_buf outer;
  std::memcpy(&outer, trap.buffer, sizeof outer);
  Ended ended;
  int const value = setjmp(*trap.buffer);
  if (value == 0) {
    ended.result = invokes[number](functions[number], words);
  } else {
    ended.trap = value;
    ended.trap_type = *trap.type;
    ended.trap_text = *trap.text;
  }
  // A call that a callback makes leaves the trap to the one that called back.
  std::memcpy(trap.buffer, &outer, sizeof outer);
  return ended;
}

}  // namespace recordings
