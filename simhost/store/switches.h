// The rows of the switches. Names are unique on the host, each kind for itself.
#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace simhost::store {

class Transaction;

enum class SwitchKey : std::int64_t {};

/// The three kinds of name that a switch has.
enum class SwitchName { alias, identifier, portset };

struct Switch {
  std::string alias;
  std::string identifier;
  std::string portset;
  std::uint32_t max_ports;  ///< uplink ports not counted
  std::uint32_t version;
  bool persistent;
};

struct FoundSwitch {
  SwitchKey key;
  Switch row;
};

/// Adds a switch; nothing if one of its names is taken.
std::optional<SwitchKey> add_switch(Transaction &transaction, Switch const &row);
/// The switch that bears `name`, which is of the given kind.
std::optional<FoundSwitch> find_switch(Transaction &transaction, SwitchName kind,
                                       std::string_view name);
/// All switches of the host, in the order in which they were added.
std::vector<FoundSwitch> all_switches(Transaction &transaction);
/// Removes a switch with its ports and properties; its uplinks become free.
void remove_switch(Transaction &transaction, SwitchKey key);

}  // namespace simhost::store
