// A flow that counted something says it by itself, for as long as Open vSwitch can count.
#include "daemon/learned/ageing.h"

#include <algorithm>

namespace simhost::daemon {
namespace {

using namespace std::chrono_literals;

constexpr Unseen kLeastPause = 1s;
// What is unused for longer is said to be so for no more than that.
constexpr Unseen kLongestUnused = 65535s;
// How often at least while an address ages.
constexpr int kLooks = 10;

}  // namespace

storage::SeenAt seen_now() {
  return std::chrono::duration_cast<storage::SeenAt>(
      std::chrono::system_clock::now().time_since_epoch());
}

Unseen unseen(openflow::FlowEntry const &source, Sighting const &before, storage::SeenAt now) {
  if (source.traffic.packets > 0 && source.unused < kLongestUnused) {
    return source.unused;
  }
  if (source.age >= before.flow_age) {
    return before.unseen + (source.age - before.flow_age);
  }
  return before.seen ? std::max<Unseen>(source.unused, now - *before.seen) : source.unused;
}

bool is_aged(Unseen unseen, std::chrono::seconds aging) {
  return unseen >= aging;
}

Unseen next_look(std::span<Source const> sources, std::chrono::seconds aging) {
  auto next = std::min<Unseen>(kBetweenLooks, Unseen(aging) / kLooks);
  for (auto const &source : sources) {
    next = std::min(next, aging - source.unseen);
  }
  return std::max(next, kLeastPause);
}

}  // namespace simhost::daemon
