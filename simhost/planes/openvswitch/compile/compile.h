// From what a switch is to its frames to what Open vSwitch has for it: a pure function, so that
// what differs between two networks differs between what is made of them, and nothing else.
#pragma once

#include <cstdint>
#include <map>
#include <vector>

#include "planes/openvswitch/compile/network.h"
#include "planes/openvswitch/compile/plan.h"
#include "planes/openvswitch/openflow/flows/flow_parts.h"
#include "planes/openvswitch/openflow/group.h"

namespace simhost::openvswitch {

/// What the rows of Open vSwitch's database have to say. The bridge forwards nothing by itself
/// (fail_mode=secure).
struct Rows {
  /// In Open_vSwitch other_config:vlan-limit, for all bridges.
  std::uint32_t most_tags = 2;
  /// In Flow_Table flow_limit of table::kLearnedAddresses.
  std::uint32_t most_learned = 0;

  friend auto operator<=>(Rows const &, Rows const &) = default;
};

/// No two flows have one place, and no two groups one number. Open vSwitch fills four tables by
/// itself, of which nothing is said here: kFirstAddresses, kLearnedAddresses, kRecentSources,
/// kCountedSources.
struct Compiled {
  Rows rows;
  openflow::FlowParts flows;
  std::vector<openflow::Group> groups;  ///< in their order
};

/// What was made of each port of a switch for itself when it was compiled last. Each is kept with
/// all that it was made of, and made anew unless all of that is the same.
class MadeOfPorts {
 public:
  /// What is made of these, one after the other. The others are forgotten.
  std::vector<openflow::FlowPart> of(Plan const &plan);

 private:
  struct Made {
    Port port;
    AmongOthers among_others;
    openflow::FlowPart flows;
  };

  openflow::FlowPart const &of(PortPlan const &plan);

  Common common_;
  std::map<openflow::Port, Made> made_;
};

/// Refuses, in words, what no flows can be made of (QEX_LIMIT_EXCEEDED, QEX_BAD_PARAM).
void check(Network const &network);
/// Likewise. What `before` has is not made again, which makes it nothing else.
Compiled compile(Network const &network, MadeOfPorts &before);
/// Likewise, all of it.
Compiled compile(Network const &network);

/// The flow that says which change of the configuration is in force.
openflow::Flow generation_marker(std::uint64_t generation);

}  // namespace simhost::openvswitch
