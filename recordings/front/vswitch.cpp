// libvswitch.so of the recorder: every call of the host's, forwarded.

#include <dlfcn.h>

#include <cstdarg>

#include "recordings/front/forward.h"
#include "vswitch/configuration.h"
#include "vswitch/queries.h"
#include "vswitch/status_text.h"

extern "C" {
#include "vswitch_calls.inc"
}

namespace {

using Reports = void (*)(char const *, ...);

/// Goes on to the host with what follows the format, which nothing else tells how much it is: as
/// many words as a caller's registers hold of either kind, and some of its stack. A function takes
/// them from where these are put.
void panic(Reports host, char const *format, std::va_list more) {
#if defined(__x86_64__)
  constexpr std::size_t integers = 5;
#elif defined(__aarch64__)
  constexpr std::size_t integers = 7;
#else
#error "how many arguments lie in registers is not known for this processor"
#endif
  constexpr std::size_t most = 7;
  long word[most] = {};
  double real[8] = {};
  long stack[8] = {};
  for (std::size_t at = 0; at < integers; ++at) {
    word[at] = va_arg(more, long);
  }
  for (double &one : real) {
    one = va_arg(more, double);
  }
  for (long &one : stack) {
    one = va_arg(more, long);
  }
#if defined(__aarch64__)
  host(format, word[0], word[1], word[2], word[3], word[4], word[5], word[6], real[0], real[1],
       real[2], real[3], real[4], real[5], real[6], real[7], stack[0], stack[1], stack[2], stack[3],
       stack[4], stack[5], stack[6], stack[7]);
#else
  host(format, word[0], word[1], word[2], word[3], word[4], real[0], real[1], real[2], real[3],
       real[4], real[5], real[6], real[7], stack[0], stack[1], stack[2], stack[3], stack[4],
       stack[5], stack[6], stack[7]);
#endif
}

}  // namespace

extern "C" RECORDINGS_API void Panic(char const *format, ...) {
  recordings::Call const &call = recordings::calls[recordings::number_of_Panic];
  recordings::Frame frame;
  frame.words[0] = recordings::word_of(format);
  if (recordings::is_played(call, static_cast<std::uint64_t *>(frame.words))) {
    recordings::play(call, static_cast<std::uint64_t *>(frame.words));
    return;
  }
  auto *const host =
      reinterpret_cast<Reports>(recordings::host_function(recordings::number_of_Panic));
  bool const is_recorded = recordings::begin(frame, call);
  std::va_list more;
  va_start(more, format);
  panic(host, format, more);
  va_end(more);
  if (is_recorded) {
    recordings::end(frame, 0);
  }
}
