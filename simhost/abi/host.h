// The host of this process: both libraries and all threads share it.
#pragma once

#include <mutex>
#include <optional>

#include "abi/data_lists.h"
#include "abi/handles.h"
#include "abi/ledger.h"
#include "fabric/caller/fabric_sharing.h"
#include "planes/openvswitch/caller/openvswitch_plane.h"
#include "storage/store.h"

namespace simhost {

/// Everything in it is used under its lock.
class Host {
 public:
  /// The lock of all below. Not recursive: nothing of the caller's may run while it is held.
  std::mutex &lock() { return lock_; }
  Ledger &ledger() { return ledger_; }
  Handles &handles() { return handles_; }
  DataLists &lists() { return lists_; }
  /// The file of the state, the one that SIMHOST_STATE names when it is first asked for or used;
  /// none in memory. Throws storage::UnusableState.
  std::optional<storage::StateFile> const &state_file();
  /// The state, for a call that begins; opened on first use. Throws storage::UnusableState.
  storage::Store &state();
  /// The plane of a state file that is open; null for a state in memory.
  openvswitch::OpenVswitchPlane *find_openvswitch_plane() { return plane_ ? &*plane_ : nullptr; }
  /// Closes a state file; state() opens it again. A state in memory stays.
  void close_state_file();

 private:
  std::mutex lock_;
  Ledger ledger_;
  Handles handles_;
  DataLists lists_{ledger_};
  bool configured_ = false;
  std::optional<storage::StateFile> state_file_;
  std::optional<storage::Store> state_;
  std::optional<openvswitch::OpenVswitchPlane> plane_;
  std::optional<fabric::FabricSharing> sharing_;
};

/// Lives as long as the process.
Host &this_host();

}  // namespace simhost
