// What was learned by a flow, as another one would have learned it: so that a change of what is
// learned does not make a switch forget whom it knows.
#pragma once

#include <map>
#include <optional>
#include <set>
#include <vector>

#include "planes/openvswitch/openflow/flows/flow_parts.h"
#include "planes/openvswitch/reconcile/difference.h"

namespace simhost::openvswitch {

/// How flows teach others.
class Teachers {
 public:
  explicit Teachers(openflow::FlowParts flows);
  /// Likewise, as far as they teach those: nothing is known of others.
  Teachers(openflow::FlowParts flows, std::set<LearnedFlows> const &learned);

  /// The one way in which some of them teach those, whatever their limits; nothing if there are
  /// several.
  [[nodiscard]] std::optional<openflow::Learn> how_learned(LearnedFlows const &learned) const;
  /// Whether some frame makes one of them teach that flow. How long it stays is left out: it may
  /// have been learned when that was said otherwise.
  [[nodiscard]] bool teach(openflow::Flow const &flow) const;

 private:
  openflow::FlowParts flows_;
  std::map<LearnedFlows, std::vector<openflow::Learn const *>> ways_;
};

/// The flow that `learn` would have made of the frame of which `before` was made; nothing if that
/// does not tell enough of it.
std::optional<openflow::Flow> relearned(openflow::Learn const &learn, openflow::Flow const &before);

}  // namespace simhost::openvswitch
