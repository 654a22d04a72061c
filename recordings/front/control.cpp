// What becomes of the calls of this process, for programs that have the libraries in front of the
// host's: they are forwarded, written into a trace, or played from one.

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <exception>
#include <string_view>

#include "recordings/core/api.h"
#include "recordings/player/player.h"
#include "recordings/player/script.h"
#include "recordings/recorder/trace.h"

namespace {

/// Says something in so much room, of what is longer the begin; its length.
std::size_t say(std::string_view words, char *said, std::size_t room) {
  if (room != 0) {
    auto const end = words.copy(said, room - 1);
    said[end] = '\0';
  }
  return words.size();
}

}  // namespace

// Each returns 0 if all is well, and otherwise the length of what is wrong, which it says in the
// room that there is for it.
extern "C" {

/// Calls go to the host.
RECORDINGS_API void recordings_forward() {
  recordings::end_recording();
  recordings::end_playing();
}

/// They are written into a trace, at its end.
RECORDINGS_API std::size_t recordings_record(char const *trace, char *said, std::size_t room) {
  recordings_forward();
  return recordings::begin_recording(trace) ? 0 : say(std::strerror(errno), said, room);
}

/// They are played.
RECORDINGS_API std::size_t recordings_play(char const *trace, char const *ledger, int by_arguments,
                                           char *said, std::size_t room) {
  recordings_forward();
  try {
    auto const by = by_arguments != 0 ? recordings::By::arguments : recordings::By::order;
    recordings::begin_playing(trace, ledger, by);
    return 0;
  } catch (std::exception const &error) {
    return std::max<std::size_t>(say(error.what(), said, room), 1);
  }
}

/// What the first call that could not be played was told; nothing if all could.
RECORDINGS_API std::size_t recordings_failure(char *said, std::size_t room) {
  return say(recordings::first_failure(), said, room);
}

/// Looks at all of a trace, and counts its processes and its calls.
RECORDINGS_API std::size_t recordings_check(char const *trace, std::size_t *processes,
                                            std::size_t *calls, char *said, std::size_t room) {
  try {
    recordings::Script const script(recordings::text_of_file(trace));
    script.check_values();
    *processes = script.parts().size();
    *calls = script.calls();
    return 0;
  } catch (std::exception const &error) {
    return std::max<std::size_t>(say(error.what(), said, room), 1);
  }
}
}
