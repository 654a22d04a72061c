// One port at a time: what comes of it is seen before the next one.
#include "daemon/load/next_move.h"

#include <algorithm>
#include <vector>

namespace simhost::daemon {
namespace {

// Less is noise, such as the requests that any client sends from time to time.
constexpr std::uint64_t kLeastBytes = 100'000;
// A tenth less is clearly less.
constexpr std::uint64_t kParts = 10;

}  // namespace

std::optional<Move> next_move(std::span<LoadedPort const> ports, std::size_t slots) {
  if (slots < 2) {
    return std::nullopt;
  }
  std::vector<std::uint64_t> carried(slots);
  for (auto const &port : ports) {
    carried.at(port.slot) += port.bytes;
  }
  auto const most = std::ranges::max_element(carried);
  auto const least = std::ranges::min_element(carried);
  auto const from = static_cast<std::size_t>(most - carried.begin());
  auto const to = static_cast<std::size_t>(least - carried.begin());
  auto busiest = *most - *most / kParts;
  std::optional<Move> best;
  for (auto const &port : ports) {
    auto const after = std::max(*most - port.bytes, *least + port.bytes);
    if (port.slot == from && port.bytes > 0 && *most >= kLeastBytes && after < busiest) {
      busiest = after;
      best = Move{.number = port.number, .slot = to};
    }
  }
  return best;
}

}  // namespace simhost::daemon
