// The rows of addresses that the data path of a switch has learned: it forgets them when it is
// started anew, and a client that says nothing would not be reached until it does.
#pragma once

#include <chrono>
#include <cstdint>
#include <optional>
#include <vector>

#include "storage/ports.h"
#include "storage/running/devices.h"

namespace simhost::storage {

/// As which the data path has an address; it may have it as several.
enum class RememberedAs : std::uint8_t {
  first,    ///< the one that a client without a known one sent from first
  learned,  ///< where it is
  counted,  ///< one of those that the switch may have
};

/// Since the beginning of 1970: what a data path learned ages by no clock but that of the machine.
using SeenAt = std::chrono::milliseconds;

/// No two of a switch have all but the last two in common.
struct Remembered {
  RememberedAs as;
  std::optional<std::uint16_t> vlan;  ///< none: in all
  MacBytes mac;
  std::optional<PortNumber> port;             ///< none: beyond the uplinks, or at no place
  std::optional<SeenAt> seen = std::nullopt;  ///< last, as a source; of RememberedAs::counted
};

std::vector<Remembered> remembered_of(Transaction &transaction, SwitchKey key);
/// Does nothing for a switch that is gone and a port without a device. What is remembered of a
/// port goes with its device: another client may come with another one.
void remember(ChangingTransaction &transaction, SwitchKey key, Remembered const &address);
/// At whichever port it is.
void remove_remembered(ChangingTransaction &transaction, SwitchKey key, Remembered const &address);
/// Of all switches.
void remove_remembered(ChangingTransaction &transaction);

}  // namespace simhost::storage
