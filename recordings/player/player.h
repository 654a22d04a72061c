// Plays a trace: what a tool calls is what the trace says that it called, and what comes back is
// what came back then. No host is there.
#pragma once

#include <cstddef>
#include <cstdint>
#include <string>

#include "recordings/core/api.h"
#include "recordings/core/shapes.h"

namespace recordings {

/// Which recorded call a call is.
enum class By : std::uint8_t {
  order,      ///< the next one of its thread
  arguments,  ///< the next one with the same inputs; when all were made, the last of them again
};

/// The status of a process that ends because a call cannot be played and no trap is there.
inline constexpr int exit_status = 125;

/// Whether a call is played, and goes to no host: all are while a recording is, and afterwards
/// those that are given what it gave out.
RECORDINGS_API bool is_played(Call const &call, std::uint64_t const *words) noexcept;

/// Plays a call, and returns what it returned. A call that was recorded with a trap, or was not
/// recorded, jumps to where the caller's trap leads.
RECORDINGS_API std::uint64_t play(Call const &call, std::uint64_t const *words);

/// Ends a call that cannot be carried out in words: as a trap, or with the process.
RECORDINGS_API [[noreturn]] void refuse_call(Call const &call, char const *why) noexcept;

/// Begins to play. What is wrong is an Unplayable.
void begin_playing(std::string const &trace, std::string const &ledger, By by);

/// Ends it: calls go to the host again.
void end_playing() noexcept;

/// What the first call that could not be played was told; empty if all were.
std::string first_failure();

}  // namespace recordings
