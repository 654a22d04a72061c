// Which of a switch's links are cut off from the others, by who hears whose beacons. A link has its
// carrier while a switch past it has lost the network: only the other links can tell.
#pragma once

#include <cstdint>
#include <map>
#include <optional>
#include <set>
#include <utility>

namespace simhost::beacons {

/// An uplink, or the uplinks that the network takes for one link.
using Link = std::uint32_t;

/// Beacons go out in rounds, over all links. There is no other time: whoever was kept from sending
/// for a while was kept from listening, too.
class Hearing {
 public:
  /// These are the links from now on, known as they were. What others heard is forgotten.
  void follow(std::set<Link> const &links);
  /// A beacon of a link came in at another one.
  void hear(Link at, Link from);
  void begin_round();

  /// Whether a link is cut off. Two hear each other if both do: one that is heard and hears nothing
  /// carries nothing either. A link that hears nobody so is cut off if any others hear each other;
  /// else nobody can tell which one is, and none is. Nothing while it had no time yet to hear, and
  /// of what is no link.
  [[nodiscard]] std::optional<bool> is_cut_off(Link link) const;

 private:
  using Round = std::uint64_t;

  [[nodiscard]] bool hears(Link at, Link from) const;
  [[nodiscard]] bool is_in_touch(Link link) const;

  Round round_ = 0;
  std::map<Link, Round> since_;
  std::map<std::pair<Link, Link>, Round> heard_;  // where, and whose
};

}  // namespace simhost::beacons
