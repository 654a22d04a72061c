// What processes that use a state do for what it shares: they ask the state's daemon to have it
// decided in the fabric.
#pragma once

#include <filesystem>
#include <nlohmann/json.hpp>
#include <string>
#include <utility>

#include "model/sharing.h"

namespace simhost::fabric {

/// The socket of the agent of a state.
std::filesystem::path agent_socket_of(std::filesystem::path const &state);

/// Shares a switch, known by its identifier, from the end of the transaction on. Refuses a host
/// that belongs to no fabric (QEX_NOT_SUPPORTED) and a switch that is shared (QEX_EXISTS).
void share(storage::ChangingTransaction &transaction, std::string const &switch_identifier);

// These ask the daemon of a state; an empty name stands for a host that belongs to no fabric.

/// Returns when the switch of the fabric that has that alias is in the state. Refuses with
/// QEX_NOT_SUPPORTED, QEX_BUSY and QEX_TIMEOUT.
void join(std::filesystem::path const &state, std::string const &alias);
/// What the daemon says of the fabric.
nlohmann::json status(std::filesystem::path const &state);

class FabricSharing : public Sharing {
 public:
  explicit FabricSharing(std::filesystem::path state) : state_(std::move(state)) {}

  bool prepare(storage::ChangingTransaction &transaction) override;

 private:
  std::filesystem::path state_;
};

}  // namespace simhost::fabric
