// From what flows and devices of a bridge have counted since they are there to what the counters of
// its switch gain: also when flows or devices are replaced by such that begin anew.
#pragma once

#include <compare>
#include <cstddef>
#include <cstdint>
#include <map>
#include <optional>
#include <string>
#include <utility>

#include "model/counters/counters.h"
#include "planes/openvswitch/openflow/replies.h"

namespace simhost::openvswitch {

/// What was counted, by the cookies of what counts it, see Counted.
using Totals = std::map<std::uint64_t, openflow::Traffic>;

/// A mirror session, as the cookies of flows know it by its number.
struct CountedSession {
  std::string sid;
  std::uint64_t copies = 0;  ///< of each frame
  std::uint64_t failed = 0;  ///< likewise those that reach nobody

  friend bool operator==(CountedSession const &, CountedSession const &) = default;
};
using CountedSessions = std::map<std::uint32_t, CountedSession>;

/// A port, by its number, or a mirror session of a switch.
struct CountingPart {
  std::uint32_t port = 0;
  std::string session = {};

  friend auto operator<=>(CountingPart const &, CountingPart const &) = default;
};

/// Gains that nobody has taken yet.
using Gains = std::map<CountingPart, Counters>;

class Tally {
 public:
  /// Nobody knows what of the first totals is whose: only what comes to them is gained.
  Tally() = default;
  /// `last` was counted when the counters were raised last.
  explicit Tally(Totals last) : last_(std::move(last)) {}

  /// What is counted now, all of it: what has gone begins anew when it returns. What counts less
  /// than it did began anew already. `sessions` are those for which flows counted.
  void count(Totals const &now, CountedSessions const &sessions);
  /// An address came to a port, of which it was known that it was elsewhere.
  void count_move(std::uint32_t port);

  [[nodiscard]] bool has_counted() const { return last_.has_value(); }
  /// What was counted last, if anything was.
  [[nodiscard]] Totals const &last() const { return *last_; }
  [[nodiscard]] Gains const &gains() const { return gains_; }
  /// They are taken, or those for whom they were are gone.
  void drop_gains() { gains_.clear(); }

 private:
  void gain(std::uint64_t cookie, openflow::Traffic const &more, CountedSessions const &sessions);
  void gain(CountingPart const &part, Counter const &counter, std::uint64_t more);
  void gain_of_session(CountedSession const &session, std::uint64_t frames);
  void gain_of_port(std::uint64_t cookie, openflow::Traffic const &more);

  std::optional<Totals> last_;
  Gains gains_;
};

}  // namespace simhost::openvswitch
