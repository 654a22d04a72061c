// What becomes of a call: it is played, or forwarded to the host's library and recorded on the way.
#pragma once

#include <setjmp.h>

#include <cstdint>
#include <type_traits>

#include "recordings/core/api.h"
#include "recordings/core/shapes.h"
#include "recordings/core/signatures.h"
#include "recordings/player/player.h"
#include "recordings/recorder/frames.h"
#include "recordings/recorder/stand_ins.h"
#include "vswitch/call_trap.h"

#pragma weak exception_buffer

namespace recordings {

#include "numbers.inc"

/// The host's functions, in the order of `calls`. Each library that forwards fills in its own.
RECORDINGS_API extern void *host_functions[];

/// The host's function; a process that calls one that its library lacks ends, as without the
/// recorder.
RECORDINGS_API void *host_function(std::size_t number) noexcept;

/// Calls the host's function, unless calls are played. A trap jumps over this frame, so nothing in
/// it has a destructor.
template <std::size_t number, typename Returned, typename... Parameters>
Returned forward(Returned (* /*declared*/)(Parameters...),
                 std::type_identity_t<Parameters>... given) {
  static_assert(sizeof...(Parameters) <= most_arguments);
  Frame frame;
  auto *word = static_cast<std::uint64_t *>(frame.words);
  *word = 0;
  ((*word++ = word_of(given)), ...);
  if (is_played(calls[number], static_cast<std::uint64_t *>(frame.words))) {
    return value_of<Returned>(play(calls[number], static_cast<std::uint64_t *>(frame.words)));
  }
  auto *const host = reinterpret_cast<Returned (*)(Parameters...)>(host_function(number));
  if (!begin(frame, calls[number])) {
    return host(given...);
  }
  if (frame.is_armed) {
    int const value = setjmp(exception_buffer);
    if (value != 0) {
      pass_trap_on(frame, value);
    }
    note_trap(frame);
  }
  if constexpr (std::is_void_v<Returned>) {
    host(stand_in(frame, given)...);
    end(frame, 0);
  } else {
    Returned const result = host(stand_in(frame, given)...);
    end(frame, word_of(result));
    return result;
  }
}

}  // namespace recordings
