// For how long nothing came from the addresses that a bridge has learned, and which of them have to
// go: those that Open vSwitch keeps for longer than they may stay, because a timeout of it has 16
// bits, or because it was told of them later than they were seen.
#pragma once

#include <chrono>
#include <cstdint>
#include <optional>
#include <span>
#include <utility>
#include <vector>

#include "planes/openvswitch/openflow/flow.h"
#include "planes/openvswitch/openflow/replies.h"
#include "storage/running/remembered.h"

namespace simhost::daemon {

using Unseen = std::chrono::nanoseconds;

/// A flow of table::kCountedSources.
struct Source {
  openflow::Flow flow;
  Unseen unseen;  ///< for how long nothing came from it
};

/// What the machine's clock shows.
storage::SeenAt seen_now();

/// What was known of a source before.
struct Sighting {
  std::optional<storage::SeenAt>
      seen;  ///< when something came last, maybe before the flow was there
  /// How old the flow was when it was looked at, and for how long nothing had come then.
  std::chrono::nanoseconds flow_age = std::chrono::nanoseconds::max();
  Unseen unseen{};
};

Unseen unseen(openflow::FlowEntry const &source, Sighting const &before, storage::SeenAt now);

/// Whether an address that was seen last at that time is not to be known any more. None is known
/// for ever, and with an ageing time of 0 nothing is learned.
bool is_aged(Unseen unseen, std::chrono::seconds aging);

/// Between two looks.
inline constexpr Unseen kBetweenLooks = std::chrono::seconds(30);

/// When to look again at sources: before any of them is older than it may be, and often enough that
/// what is known of them is not much older than that.
Unseen next_look(std::span<Source const> sources, std::chrono::seconds aging);

}  // namespace simhost::daemon
