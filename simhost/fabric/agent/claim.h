// The name of a host in its fabric, and the process that speaks for it there.
#pragma once

#include <string>

#include "fabric/cluster/cluster.h"
#include "fabric/rows/operations.h"
#include "fabric/rows/rows.h"
#include "storage/shared.h"
#include "storage/store.h"

namespace simhost::fabric {

/// Of a session, a state, a change: no other has it.
std::string random_name();

/// That in the state, or a new one if it belongs to no fabric. Throws std::runtime_error if it
/// belongs to one by another name.
storage::Membership membership_in(storage::Store &store, std::string const &host);

/// Claims a name for a process, as often as it is asked.
class Claim {
 public:
  /// `state` tells hosts of one name apart.
  Claim(Speaker speaker, std::string state);

  /// Throws std::runtime_error if the name is another host's, or by now another process speaks for
  /// the host; and as Cluster does.
  void make(Cluster &cluster);
  /// The cluster is lost.
  void lose() { speaks_ = false; }

  [[nodiscard]] Speaker const &speaker() const { return speaker_; }
  [[nodiscard]] bool speaks() const { return speaks_; }
  /// For good.
  [[nodiscard]] bool gave_way() const { return gave_way_; }

 private:
  void insert_host(Cluster &cluster) const;
  void contend(Cluster &cluster, HostRow const &row);
  void take_over(Cluster &cluster, HostRow const &row);
  void become_speaker(Cluster &cluster, Json const &operations) const;

  Speaker speaker_;
  std::string state_;
  bool speaks_ = false;
  bool spoke_ = false;  // at any time
  bool gave_way_ = false;
  std::string former_session_;     // from which it has the name
  std::string former_if_is_ours_;  // once that is seen
};

}  // namespace simhost::fabric
