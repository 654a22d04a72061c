// Writes what calls take and give, as far as the tables say where it is and how long.
#pragma once

#include <cstdint>

#include "recordings/core/identities.h"
#include "recordings/core/line.h"
#include "recordings/core/shapes.h"

namespace recordings {

/// The arguments of a call or its result, in 64 bits each.
using Words = std::uint64_t const *;

/// A number of so many bytes.
std::int64_t number_at(char const *at, std::uint32_t width, bool is_signed) noexcept;

/// A record with what follows it in the same block; `form` is that of its addresses, or no_form.
void write_record(Line &line, Record const &record, std::uint64_t address,
                  std::int64_t form) noexcept;

/// The number that stands for an address.
using Identify = std::uint64_t (*)(std::uint64_t address) noexcept;

/// What a caller gives: a member for each argument that goes in.
void write_inputs(Line &line, Call const &call, Words words,
                  Identify identify = identity_of) noexcept;

/// What the call left: a member for each argument that comes out.
void write_outputs(Line &line, Call const &call, Words words, std::uint64_t result) noexcept;

/// Whether it has any.
bool has_outputs(Call const &call) noexcept;

/// What the call returned.
void write_result(Line &line, Call const &call, std::uint64_t result) noexcept;

/// A pointer: null, or {"at": its number}.
void write_pointer(Line &line, std::uint64_t address, Identify identify = identity_of) noexcept;

}  // namespace recordings
