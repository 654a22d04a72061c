// The rows of the switches. Names are unique on the host, each kind for itself.
#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace simhost::storage {

class ChangingTransaction;
class Transaction;

enum class SwitchKey : std::int64_t {};

/// The three kinds of name that a switch has.
enum class SwitchName { alias, identifier, portset };

/// Ports of a switch, of which it has one at least.
inline constexpr std::uint32_t kGreatestMaxPorts = 65535;

struct Switch {
  std::string alias;
  std::string identifier;
  std::string portset;
  std::uint32_t max_ports;  ///< uplink ports not counted
  std::uint32_t version;
  bool persistent;
  bool associated = true;  ///< runs on this host

  bool operator==(Switch const &) const = default;
};

struct FoundSwitch {
  SwitchKey key;
  Switch row;
};

/// Adds a switch; nothing if one of its names is taken.
std::optional<SwitchKey> add_switch(ChangingTransaction &transaction, Switch const &row);
/// The switch that bears `name`, which is of the given kind.
std::optional<FoundSwitch> find_switch(Transaction &transaction, SwitchName kind,
                                       std::string_view name);
std::optional<FoundSwitch> find_switch(Transaction &transaction, SwitchKey key);
/// The switch that another row says is there. Throws UnusableState if it is not.
FoundSwitch get_switch_row(Transaction &transaction, SwitchKey key);
/// The first switch that was added after `key`; SwitchKey{} comes before all.
std::optional<FoundSwitch> next_switch(Transaction &transaction, SwitchKey key);
/// All switches of the host, in the order in which they were added.
std::vector<FoundSwitch> all_switches(Transaction &transaction);
/// Replaces the alias; false if another switch has it.
bool rename_switch(ChangingTransaction &transaction, SwitchKey key, std::string_view alias);
void set_version(ChangingTransaction &transaction, SwitchKey key, std::uint32_t version);
void set_max_ports(ChangingTransaction &transaction, SwitchKey key, std::uint32_t max_ports);
void set_associated(ChangingTransaction &transaction, SwitchKey key, bool associated);
/// Removes a switch with its ports and properties; its uplinks become free.
void remove_switch(ChangingTransaction &transaction, SwitchKey key);

}  // namespace simhost::storage
