// The rows of the multicast groups that ports have joined, and of the groups' sources.
#pragma once

#include <chrono>
#include <cstddef>
#include <cstdint>
#include <optional>
#include <vector>

#include "storage/ports.h"

namespace simhost::storage {

/// The bytes of an address as they go over the wire: 6 of Ethernet, 4 of IPv4, 16 of IPv6.
using AddressBytes = std::vector<std::byte>;

/// A multicast group that a port joined.
struct McastGroup {
  AddressBytes address;
  std::uint32_t version;      ///< of the protocol that joined
  std::uint32_t source_mode;  ///< a VSMcastSrcIPFilterMode
  std::uint32_t vni;
  std::chrono::milliseconds updated;  ///< by the host's clock
  std::vector<AddressBytes> sources;
};

/// Adds a group that the port has not joined.
void insert_group(ChangingTransaction &transaction, PortNumber port, McastGroup const &group);
/// False if the port has not joined it.
bool remove_group(ChangingTransaction &transaction, PortNumber port, AddressBytes const &address);
std::optional<McastGroup> find_group(Transaction &transaction, PortNumber port,
                                     AddressBytes const &address);
/// The groups of a port with addresses of that many bytes, in the order of the addresses.
std::vector<AddressBytes> group_addresses(Transaction &transaction, PortNumber port,
                                          std::size_t length);
void remove_groups(ChangingTransaction &transaction);

}  // namespace simhost::storage
