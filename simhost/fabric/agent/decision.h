// Having a change decided by the cluster, whatever becomes of its servers meanwhile.
#pragma once

#include <string>

#include "fabric/cluster/cluster.h"

namespace simhost::fabric {

enum class Verdict {
  made,
  refused,  ///< nothing was changed, and nothing will be
  unknown,  ///< it may have been made, or may be yet
};

struct Decision {
  Verdict verdict;
  std::string why;  ///< if it was not made
};

/// A transaction that is made once at most, and how often it is tried.
struct Proposal {
  std::string id;
  std::string host;
  Json operations;  ///< with the insertion of the change of that id
};

/// Waits until the deadline, through as many servers as it takes.
Decision decide(Cluster &cluster, Proposal const &proposal, Deadline deadline);

/// Has a change whose outcome is unknown never be made, unless it is already. Returns whether it
/// was made; throws Unreachable.
bool was_made(Cluster &cluster, Proposal const &proposal, Deadline deadline);

}  // namespace simhost::fabric
