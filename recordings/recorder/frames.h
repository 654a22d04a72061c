// Calls and callbacks in progress: each is written when it begins and when it ends.
#pragma once

#include <setjmp.h>

#include <cstddef>
#include <cstdint>
#include <string_view>

#include "recordings/core/api.h"
#include "recordings/core/shapes.h"

namespace recordings {

inline constexpr std::size_t most_arguments = 8;

/// A call in progress, in the frame of the function that forwards it. Plain memory, for jumps cross
/// that frame.
struct Frame {
  std::uint64_t words[most_arguments];
  std::int64_t began;
  bool is_armed;   ///< whether a trap is to be caught here before it goes on to the caller
  jmp_buf caller;  ///< where a trap leads to, as the caller has it
  jmp_buf own;     ///< and while the call runs
};

/// Writes that a call begins. False if it is not to be recorded: nobody records, or the call is one
/// that the host's library makes on its own.
RECORDINGS_API bool begin(Frame &frame, Call const &call) noexcept;

/// Notes that the trap now leads to the frame.
RECORDINGS_API void note_trap(Frame &frame) noexcept;

/// Writes what the call left, and restores the caller's trap.
RECORDINGS_API void end(Frame &frame, std::uint64_t result) noexcept;

/// Writes that the call trapped, and goes on to where the caller's trap leads.
RECORDINGS_API [[noreturn]] void pass_trap_on(Frame &frame, int value) noexcept;

/// A value of a callback: a pointer, or a number.
struct Given {
  std::string_view name;
  bool is_pointer;
  std::uint64_t value;
};

/// Writes that the host calls back. `here` is anything in the frame of the function that passes it
/// on; the number is for the end, 0 if nothing is recorded.
std::uint64_t begin_callback(void const *here, std::string_view argument, Given first,
                             Given const *second) noexcept;
void end_callback(std::uint64_t number, Given const *result) noexcept;

/// The function that the tool gave to the walk that runs in this thread.
void *callback_in_progress() noexcept;
void note_callback(Frame &frame, void *callback) noexcept;

}  // namespace recordings
