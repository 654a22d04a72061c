// The rows of choices by load: a daemon that is started anew would have to find out once more what
// clients send, and move them meanwhile.
#pragma once

#include <cstdint>
#include <map>

#include "storage/ports.h"

namespace simhost::storage {

/// Which of its team's uplinks, by the remainder, a port was given for what its client sends.
using ChosenShares = std::map<PortNumber, std::uint32_t>;

/// Of the ports of a switch for which one was chosen.
ChosenShares chosen_shares(Transaction &transaction, SwitchKey key);
/// Does nothing for a port that is gone.
void put_chosen_share(ChangingTransaction &transaction, PortNumber port, std::uint32_t share);
/// Of all ports.
void remove_chosen_shares(ChangingTransaction &transaction);

}  // namespace simhost::storage
