// The file that a trace is written to: a line at a time, each with one write, so that what is there
// stays readable whatever becomes of the process.
#pragma once

#include <cstdint>

#include "recordings/core/line.h"

namespace recordings {

/// Begins with a trace that exists, at its end; false if it cannot be written, and errno says why.
bool begin_recording(char const *path) noexcept;

/// Ends it; calls in progress have no end in it.
void end_recording() noexcept;

/// Whether there is a trace to write; none is left after a write that failed.
bool is_recording() noexcept;

/// Numbers of what begins in this process: from 1 on, in the order in which it begins.
std::uint64_t next_number() noexcept;

/// Numbers of threads, likewise.
std::uint64_t next_thread() noexcept;

/// Nanoseconds of a clock that only goes forward.
std::int64_t now() noexcept;

/// Microseconds since the process began to record.
std::int64_t since_start(std::int64_t moment) noexcept;

/// Whether the tool may have closed the file since the last line.
enum class File : bool { is_kept, may_be_closed };

/// Adds a line. The first one of a process tells of the process itself before.
void write_line(Line const &line, File file) noexcept;

}  // namespace recordings
