// The rows of the MAC tables: which address, in its VLAN and virtual network, is at which place of
// a switch. It is at one place of a switch only.
#pragma once

#include <array>
#include <chrono>
#include <cstddef>
#include <cstdint>
#include <optional>
#include <vector>

#include "storage/ports.h"
#include "vswitch/mac_tables.h"

namespace simhost::storage {

/// Where an address is reached: at a port, or through the switch's team of uplinks.
struct Place {
  SwitchKey switch_key;
  std::optional<PortNumber> port;  ///< none: the team
};

/// An address as a switch tells it from others.
struct AddressName {
  std::array<std::byte, 6> mac;
  std::uint16_t vid;
  std::uint32_t vni;
};

struct Address {
  AddressName name;
  VSMACAddrType type;
  bool ages;
  std::chrono::milliseconds seen;  ///< last, by the host's clock
};

enum class AddressRow : std::int64_t {};

struct FoundAddress {
  AddressRow row;
  std::optional<PortNumber> port;  ///< none: the team
  VSMACAddrType type;
};

/// The addresses of a place, in their order: those of one type or of all (VS_MAC_ADDR_TYPE_ALL),
/// without what ages and was last seen at `gone` or before.
std::vector<Address> addresses_at(Transaction &transaction, Place const &place, VSMACAddrType type,
                                  std::chrono::milliseconds gone);
struct PlacedAddress {
  std::optional<PortNumber> port;  ///< none: the team
  Address address;
};

/// The static and user addresses of a switch, in the order of their ports, those of the team last.
std::vector<PlacedAddress> fixed_addresses(Transaction &transaction, SwitchKey key);
/// Those at a place.
std::vector<Address> fixed_addresses(Transaction &transaction, Place const &place);
/// An address of a switch, wherever it is.
std::optional<FoundAddress> find_address(Transaction &transaction, SwitchKey key,
                                         AddressName const &name);
/// Puts an address at a place, wherever it was before.
void place_address(ChangingTransaction &transaction, Place const &place, Address const &address);
void set_seen(ChangingTransaction &transaction, AddressRow row, std::chrono::milliseconds seen);
void remove_address(ChangingTransaction &transaction, AddressRow row);
/// Removes from a switch what ages and was last seen at `gone` or before.
void remove_aged(ChangingTransaction &transaction, SwitchKey key, std::chrono::milliseconds gone);
void remove_learned(ChangingTransaction &transaction);

/// How many addresses are learned at a place, or at all places of a switch: with those that are too
/// old and have not been removed yet.
std::int64_t count_learned(Transaction &transaction, Place const &place);
std::int64_t count_learned(Transaction &transaction, SwitchKey key);
/// How many of a place are learned, age, and were last seen at `gone` or before.
std::int64_t count_aged(Transaction &transaction, Place const &place,
                        std::chrono::milliseconds gone);

}  // namespace simhost::storage
