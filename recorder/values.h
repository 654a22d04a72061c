// Writes what calls take and give, as far as the tables say where it is and how long.
#pragma once

#include <cstdint>

#include "recorder/line.h"
#include "recorder/shapes.h"

namespace recorder {

/// The arguments of a call or its result, in 64 bits each.
using Words = std::uint64_t const *;

/// What a caller gives: a member for each argument that goes in.
void write_inputs(Line &line, Call const &call, Words words) noexcept;

/// What the call left: a member for each argument that comes out.
void write_outputs(Line &line, Call const &call, Words words, std::uint64_t result) noexcept;

/// Whether it has any.
bool has_outputs(Call const &call) noexcept;

/// What the call returned.
void write_result(Line &line, Call const &call, std::uint64_t result) noexcept;

/// A pointer: null, or {"at": its number}.
void write_pointer(Line &line, std::uint64_t address) noexcept;

}  // namespace recorder
