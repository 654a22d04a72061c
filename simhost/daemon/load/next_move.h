// Which port is to use another uplink, so that the busiest one carries less.
#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>
#include <span>

namespace simhost::daemon {

struct LoadedPort {
  std::uint32_t number;
  std::size_t slot;     ///< which of its team's it uses
  std::uint64_t bytes;  ///< that its client sent since the last look
};

struct Move {
  std::uint32_t number;
  std::size_t slot;

  friend bool operator==(Move const &, Move const &) = default;
};

/// From the slot that carries most to the one that carries least, the port after which the busier
/// of the two carries least. None if that is not clearly less than now: a move costs its client
/// frames, and what ports sent is not what they will send. `slots` is how many there are.
std::optional<Move> next_move(std::span<LoadedPort const> ports, std::size_t slots);

}  // namespace simhost::daemon
