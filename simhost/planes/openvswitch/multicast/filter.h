// What one port wants of one group: the state that RFC 3376 (6.4) and RFC 3810 (7.4) describe.
#pragma once

#include <chrono>
#include <cstddef>
#include <map>
#include <optional>
#include <set>
#include <vector>

#include "planes/openvswitch/multicast/groups.h"
#include "planes/openvswitch/multicast/messages.h"

namespace simhost::multicast {

/// Since whatever a caller's clock began with.
using Time = std::chrono::milliseconds;

/// What a protocol's version can say; each level has what is below it.
enum class Level { joins, leaves, sources };

Level level_of(Family family, unsigned version);

/// How long things take.
struct Timing {
  Time membership{};      ///< until a member is gone that says nothing
  Time between_asking{};  ///< likewise one that is asked because another one left:
  unsigned times_asked = 0;

  [[nodiscard]] Time last_member() const { return between_asking * times_asked; }
};

/// What of reports counts.
struct Reading {
  Level level = Level::sources;
  std::size_t most_sources = 0;  ///< who lists more gets all of them
};

class Filter {
 public:
  /// The sources that members are to be asked about; none is the group as a whole.
  using Question = std::vector<Address>;

  void apply(Record const &given, Level level, Reading const &reading, Timing const &timing,
             Time now);
  /// Does what is due, and returns what is to be asked.
  std::vector<Question> advance(Timing const &timing, Time now);
  /// When something is due.
  [[nodiscard]] std::optional<Time> next() const;

  /// Nobody wants anything.
  [[nodiscard]] bool is_over() const { return !excludes_ && sources_.empty(); }
  [[nodiscard]] Sources wanted() const;

 private:
  struct Asking {
    unsigned times_left = 0;
    Time next{};
  };

  void note_old_hosts(Record const &record, Level level, Timing const &timing, Time now);
  [[nodiscard]] std::optional<Record> readable(Record record, Reading const &reading,
                                               Time now) const;
  void want(std::vector<Address> const &sources, Time until);
  void exclude(Record const &record, Time until_for_new, Timing const &timing, Time now);
  void ask_about_group(Timing const &timing, Time now);
  void ask_about(std::vector<Address> const &sources, Timing const &timing, Time now);
  [[nodiscard]] std::vector<Address> wanted_but(std::vector<Address> const &sources) const;
  void take_all_if_too_many(Reading const &reading, Timing const &timing, Time now);
  void expire(Time now);

  bool excludes_ = false;
  Time group_until_{};                                // while it excludes
  std::map<Address, std::optional<Time>> sources_{};  // until when each is wanted; excluded ones
  // Hosts that say less are there.
  Time only_joins_until_{};
  Time no_sources_until_{};
  Asking group_asking_;
  Asking source_asking_;
  std::set<Address> asked_sources_;
};

}  // namespace simhost::multicast
