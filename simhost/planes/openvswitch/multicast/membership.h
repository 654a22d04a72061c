// Who is a member of which group on a switch, told by what hosts and routers say and by the time;
// and at which ports routers are (RFC 4541). It knows neither frames nor clocks.
//
// It asks as well, each place by itself: no member hears of another one, which would keep it from
// replying.
#pragma once

#include <chrono>
#include <cstddef>
#include <cstdint>
#include <functional>
#include <map>
#include <optional>
#include <queue>
#include <set>
#include <utility>
#include <vector>

#include "planes/openvswitch/multicast/filter.h"
#include "planes/openvswitch/multicast/groups.h"
#include "planes/openvswitch/multicast/messages.h"

namespace simhost::multicast {

/// What there is to choose of a family.
struct FamilyOptions {
  bool is_heard = false;         ///< else nothing is known of its groups, and nobody is asked
  unsigned version = 0;          ///< of the queries; of later reports no more counts than it has
  std::size_t most_sources = 0;  ///< a member that lists more of a group gets all of them

  friend bool operator==(FamilyOptions const &, FamilyOptions const &) = default;
};

struct Options {
  FamilyOptions igmp{};
  FamilyOptions mld{};
  /// How many queries may be lost; so many are sent to a new place, and when a member leaves.
  unsigned robustness = 2;
  std::chrono::seconds interval{125};  ///< between queries of all groups

  [[nodiscard]] FamilyOptions const &of(Family family) const {
    return family == Family::ipv4 ? igmp : mld;
  }
  friend bool operator==(Options const &, Options const &) = default;
};

/// A query to the members at a place.
struct Asked {
  Place place;
  Family family{};
  Query query;

  friend bool operator==(Asked const &, Asked const &) = default;
};

/// A group that a port joined.
struct Joined {
  unsigned version = 0;  ///< of the report that came last
  Sources sources;
  Time reported{};  ///< when that was

  friend bool operator==(Joined const &, Joined const &) = default;
};

class Membership {
 public:
  /// Of a place; what is more is not known.
  static constexpr std::size_t kMostGroups = 4096;

  /// Options that are others begin everything anew.
  void set_options(Options const &options, Time now);
  /// The places that there are. New ones are asked at once.
  void set_places(std::set<Place> const &places, Time now);
  /// Elsewhere than at a place it says nothing.
  void receive(Place const &place, Message const &message, Time now);

  /// When something is to be done next, or a little before.
  [[nodiscard]] std::optional<Time> next() const;
  /// Does what is due, and returns what is to be asked.
  std::vector<Asked> advance(Time now);

  /// Another number whenever groups() is another one.
  [[nodiscard]] std::uint64_t revision() const { return revision_; }
  [[nodiscard]] Groups groups() const;
  /// The groups of a port, in all of its VLANs.
  [[nodiscard]] std::map<Address, Joined> joined(std::uint32_t port) const;

 private:
  struct GroupInVlan {
    std::uint16_t vlan;
    Address address;
    friend auto operator<=>(GroupInVlan const &, GroupInVlan const &) = default;
  };
  struct GroupAtPort {
    GroupInVlan group;
    std::uint32_t port;
    friend auto operator<=>(GroupAtPort const &, GroupAtPort const &) = default;
  };
  struct Known {
    Filter filter;
    unsigned version = 0;
    Time reported{};
    std::optional<Time> looked_at;  // when it is in `due_`
  };
  struct Schedule {
    unsigned first_queries_left = 0;
    Time next_query{};
    std::optional<Time> undecided_until = std::nullopt;
    std::size_t groups = 0;
  };
  using Members = std::map<std::uint32_t, Known>;

  [[nodiscard]] Timing timing() const;
  [[nodiscard]] Time response() const;
  [[nodiscard]] Time first_response() const;
  [[nodiscard]] bool is_asking() const { return options_.igmp.is_heard || options_.mld.is_heard; }

  void begin(Place const &place, Time now);
  void forget(Place const &place);

  void receive_query(Place const &place, Message const &message, Query const &query, Time now);
  void receive_report(Place const &place, Report const &report, Time now);
  void receive_record(Place const &place, Record const &record, unsigned version, Time now);
  void put_router(Router const &router, Time until);
  void remove_router(Router const &router);

  Known *find(GroupAtPort const &key);
  // After something was done to it.
  void settle(GroupAtPort const &key, Known &known, Sources const &before);
  void remove(GroupAtPort const &key);

  void advance_groups(Time now, std::vector<Asked> &asked);
  void advance_places(Time now, std::vector<Asked> &asked);
  void ask_about(GroupAtPort const &key, std::vector<Address> sources,
                 std::vector<Asked> &asked) const;
  void ask_all(Place const &place, Schedule &schedule, Time now, std::vector<Asked> &asked) const;
  [[nodiscard]] Query query_of(Family family, Time response) const;
  void look_at(Schedule const &schedule);

  Options options_;
  std::map<Place, Schedule> places_;
  std::optional<Time> next_of_places_;  // or a little before
  std::map<Router, Time> routers_;      // until when they are there
  std::map<GroupInVlan, Members> groups_;
  // When to look at what; a time that is another one by now is passed over.
  using Due = std::pair<Time, GroupAtPort>;
  std::priority_queue<Due, std::vector<Due>, std::greater<>> due_;
  std::uint64_t revision_ = 0;
};

}  // namespace simhost::multicast
