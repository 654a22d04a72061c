// The rounds in which links were heard.
#include "planes/openvswitch/beacons/hearing.h"

#include <algorithm>

namespace simhost::beacons {
namespace {

// So many may be lost, of one link or all that comes in at it, before it is believed.
constexpr std::uint64_t kRounds = 3;

}  // namespace

void Hearing::follow(std::set<Link> const &links) {
  std::erase_if(since_, [&](auto const &known) { return !links.contains(known.first); });
  std::erase_if(heard_, [&](auto const &heard) {
    return !links.contains(heard.first.first) || !links.contains(heard.first.second);
  });
  for (auto const link : links) {
    since_.try_emplace(link, round_);
  }
}

void Hearing::hear(Link at, Link from) {
  if (at != from && since_.contains(at) && since_.contains(from)) {
    heard_[{at, from}] = round_;
  }
}

void Hearing::begin_round() {
  ++round_;
}

bool Hearing::hears(Link at, Link from) const {
  auto const heard = heard_.find({at, from});
  return heard != heard_.end() && round_ - heard->second <= kRounds;
}

bool Hearing::is_in_touch(Link link) const {
  return std::ranges::any_of(since_, [&](auto const &other) {
    return hears(link, other.first) && hears(other.first, link);
  });
}

std::optional<bool> Hearing::is_cut_off(Link link) const {
  auto const known = since_.find(link);
  if (known == since_.end()) {
    return std::nullopt;
  }
  if (is_in_touch(link)) {
    return false;
  }
  if (round_ - known->second <= kRounds) {
    return std::nullopt;
  }
  return std::ranges::any_of(since_, [&](auto const &other) { return is_in_touch(other.first); });
}

}  // namespace simhost::beacons
