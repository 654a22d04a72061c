// The rows of what joins this host to others: the tunnels that are a switch's uplink, and the
// underlay, which carries them.
#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "storage/running/multicast.h"

namespace simhost::storage {

/// How frames are wrapped.
enum class Encapsulation : std::uint8_t { vxlan, geneve };
inline constexpr std::uint32_t kGreatestTunnelKey = 0xFFFFFF;

/// The peers of one switch have so many places.
inline constexpr std::size_t kMostTunnels = 64;
/// By which the data path knows the first of them; no device has one of these numbers.
inline constexpr std::uint16_t kFirstTunnel = 0xFEC0;
inline constexpr std::uint16_t kLastTunnel = kFirstTunnel + kMostTunnels - 1;

struct Tunnel {
  std::uint16_t number;  ///< kFirstTunnel to kLastTunnel
  AddressBytes peer;     ///< of IPv4 or IPv6

  bool operator==(Tunnel const &) const = default;
};

/// The uplink of a switch that leads to other hosts, a tunnel to each.
struct Fabric {
  SwitchKey switch_key;
  std::string uplink;
  Encapsulation encapsulation;
  std::uint32_t key;
  std::vector<AddressBytes> peers;  ///< IPv4 first, by the addresses; this host may be one
  std::vector<Tunnel> tunnels;      ///< to the other ones, in the order of their numbers
};

std::optional<Fabric> fabric_of(Transaction &transaction, SwitchKey key);
/// Likewise that of an uplink; none for an uplink that is a wire.
std::optional<Fabric> fabric_of(Transaction &transaction, std::string_view uplink);
/// The switch whose fabric has that key.
std::optional<SwitchKey> find_fabric(Transaction &transaction, Encapsulation encapsulation,
                                     std::uint32_t key);
/// The uplink of a fabric, if there is one.
std::optional<std::string> first_fabric(Transaction &transaction);

/// Gives a switch a fabric, in place of the one that it had; a peer that stays keeps its number.
/// The uplink is on the host, and the peers are no more than there are places.
void put_fabric(ChangingTransaction &transaction, SwitchKey key, std::string_view uplink,
                Encapsulation encapsulation, std::uint32_t tunnel_key,
                std::vector<AddressBytes> const &peers);
/// Removes it with its uplink.
void remove_fabric(ChangingTransaction &transaction, SwitchKey key);

struct Underlay {
  std::string device;
  AddressBytes address;
  std::uint8_t prefix = 0;    ///< bits of the address that name its network
  AddressBytes gateway = {};  ///< empty for none

  bool operator==(Underlay const &) const = default;
};

std::optional<Underlay> underlay_of(Transaction &transaction);
void put_underlay(ChangingTransaction &transaction, Underlay const &underlay);
void remove_underlay(ChangingTransaction &transaction);

/// Whether frames come and go over an uplink: it has a device, or is tunnels.
bool carries_frames(Transaction &transaction, std::string_view uplink);

}  // namespace simhost::storage
