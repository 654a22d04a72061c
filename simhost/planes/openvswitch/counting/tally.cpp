// The difference to the last time, each part of it for the counters that its cookie says.
#include "planes/openvswitch/counting/tally.h"

#include <algorithm>
#include <array>
#include <optional>

#include "planes/openvswitch/compile/pipeline.h"

namespace simhost::openvswitch {
namespace {

using openflow::Traffic;

struct CountersOfKind {
  Counted kind;
  Counter frames;
  std::optional<Counter> bytes = std::nullopt;
};

using Statistics = qex_NEBPortStatistics;

constexpr std::array kOfPorts{
    CountersOfKind{Counted::in_unicast, counter_in(&Statistics::pktsInUnicast),
                   counter_in(&Statistics::bytesInUnicast)},
    CountersOfKind{Counted::in_multicast, counter_in(&Statistics::pktsInMulticast),
                   counter_in(&Statistics::bytesInMulticast)},
    CountersOfKind{Counted::in_broadcast, counter_in(&Statistics::pktsInBroadcast),
                   counter_in(&Statistics::bytesInBroadcast)},
    CountersOfKind{Counted::out_unicast, counter_in(&Statistics::pktsOutUnicast),
                   counter_in(&Statistics::bytesOutUnicast)},
    CountersOfKind{Counted::out_multicast, counter_in(&Statistics::pktsOutMulticast),
                   counter_in(&Statistics::bytesOutMulticast)},
    CountersOfKind{Counted::out_broadcast, counter_in(&Statistics::pktsOutBroadcast),
                   counter_in(&Statistics::bytesOutBroadcast)},
    CountersOfKind{Counted::dropped, counter_in(&Statistics::pktsInDropped)},
    CountersOfKind{Counted::out_lost, counter_in(&Statistics::pktsOutDropped)},
    CountersOfKind{Counted::in_damaged, counter_in(&Statistics::pktsInException)},
    CountersOfKind{Counted::out_damaged, counter_in(&Statistics::pktsOutException)},
    CountersOfKind{Counted::limit_allowed, counter_in(&VSPMACLearningStats::noLearningAllowedPkts)},
    CountersOfKind{Counted::limit_dropped, counter_in(&VSPMACLearningStats::noLearningDroppedPkts)},
};

// A device has counted before it came to its bridge, a flow has not.
bool is_of_device(Counted kind) {
  return kind == Counted::out_lost || kind == Counted::in_damaged || kind == Counted::out_damaged;
}

// Both numbers begin anew together.
Traffic since(Traffic const &last, Traffic const &now) {
  bool const began_anew = now.packets < last.packets || now.bytes < last.bytes;
  return began_anew
             ? now
             : Traffic{.packets = now.packets - last.packets, .bytes = now.bytes - last.bytes};
}

}  // namespace

void Tally::count(Totals const &now, CountedSessions const &sessions) {
  if (last_) {
    for (auto const &[cookie, total] : now) {
      auto const known = last_->find(cookie);
      if (known != last_->end()) {
        gain(cookie, since(known->second, total), sessions);
      } else if (!is_of_device(kind_of(cookie))) {
        gain(cookie, total, sessions);
      }
    }
  }
  last_ = now;
}

void Tally::gain(std::uint64_t cookie, Traffic const &more, CountedSessions const &sessions) {
  if (kind_of(cookie) != Counted::mirrored) {
    gain_of_port(cookie, more);
  } else if (auto const session = sessions.find(number_of(cookie)); session != sessions.end()) {
    gain_of_session(session->second, more.packets);
  }
}

void Tally::count_move(std::uint32_t port) {
  gain({.port = port}, counter_in(&VSPMACLearningStats::numMACsMoved), 1);
}

void Tally::gain_of_port(std::uint64_t cookie, Traffic const &more) {
  auto const known = std::ranges::find(kOfPorts, kind_of(cookie), &CountersOfKind::kind);
  if (known == kOfPorts.end()) {
    return;
  }
  CountingPart const part{.port = number_of(cookie)};
  gain(part, known->frames, more.packets);
  if (known->bytes) {
    gain(part, *known->bytes, more.bytes);
  }
}

// A session without a destination that is there takes its frames nowhere; one all of whose
// destinations cannot be reached fails.
void Tally::gain_of_session(CountedSession const &session, std::uint64_t frames) {
  using Stats = VSDVMirrorSessionStats;
  CountingPart const part{.session = session.sid};
  auto const whole = session.copies > 0   ? counter_in(&Stats::mirroredPkts)
                     : session.failed > 0 ? counter_in(&Stats::failedPkts)
                                          : counter_in(&Stats::discardedPkts);
  gain(part, whole, frames);
  gain(part, counter_in(&Stats::mirrorPktCnt), frames * session.copies);
  gain(part, counter_in(&Stats::mirrorPktFailCnt), frames * session.failed);
}

void Tally::gain(CountingPart const &part, Counter const &counter, std::uint64_t more) {
  if (more != 0) {
    auto &gained = gains_[part];
    gained.set(counter, gained.of(counter) + more);
  }
}

}  // namespace simhost::openvswitch
