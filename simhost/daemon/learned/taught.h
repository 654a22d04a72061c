// What a bridge may have in the tables that it fills by itself: whatever else is there, somebody
// put there, and frames would obey it.
#pragma once

#include <memory>
#include <optional>

#include "planes/openvswitch/compile/compile.h"
#include "planes/openvswitch/openflow/replies.h"
#include "planes/openvswitch/reconcile/relearning.h"

namespace simhost::daemon {

enum class Origin {
  taught,    ///< by the flows of the bridge
  outdated,  ///< by none of them, but maybe by some that were there just before
  foreign,   ///< by somebody else
};

class Taught {
 public:
  /// The flows of the bridge from now on.
  void have(std::shared_ptr<openvswitch::Compiled const> flows);
  /// Of a flow in a table that bridges fill by themselves.
  Origin origin_of(openflow::ReadFlow const &read);

 private:
  std::shared_ptr<openvswitch::Compiled const> flows_;
  // Most changes are followed by another one before any flow is learned.
  std::optional<openvswitch::Teachers> teachers_;
};

}  // namespace simhost::daemon
