// The rows of the ports and of the host's uplinks, which sit at uplink ports or are free.
#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "storage/switches.h"

namespace simhost::storage {

/// The numeric id of a port: never 0, unique on the host, never given to a second port before a
/// reset of the host.
enum class PortNumber : std::uint32_t {};

enum class PortKind { client, uplink };

/// Adds a port; nothing if the switch has one of that identifier.
std::optional<PortNumber> add_port(ChangingTransaction &transaction, SwitchKey switch_key,
                                   std::string_view identifier, PortKind kind);
struct Port {
  PortNumber number;
  SwitchKey switch_key;
  std::string identifier;
  PortKind kind;
};

/// The port of a switch that has an identifier.
std::optional<Port> find_port(Transaction &transaction, SwitchKey switch_key,
                              std::string_view identifier);
/// The port that has a number, whichever its switch is.
std::optional<Port> find_port(Transaction &transaction, PortNumber number);
/// Likewise, of one switch only.
std::optional<Port> find_port(Transaction &transaction, SwitchKey switch_key, PortNumber number);
/// The port that another row says is there. Throws UnusableState if it is not.
Port get_port_row(Transaction &transaction, PortNumber number);
/// The port of a switch that another system knows by `external_id`.
std::optional<Port> find_port_by_external_id(Transaction &transaction, SwitchKey switch_key,
                                             std::string_view external_id);
/// The first port of a switch that was added after `number`; PortNumber{} comes before all.
std::optional<Port> next_port(Transaction &transaction, SwitchKey switch_key, PortNumber number);
/// What another system calls the port; empty if none does.
std::string external_id_of(Transaction &transaction, PortNumber number);
/// False if another port of the switch is known by it.
bool set_external_id(ChangingTransaction &transaction, PortNumber number,
                     std::string_view external_id);
/// Removes a port with its properties; an uplink at it becomes free.
void remove_port(ChangingTransaction &transaction, PortNumber number);
/// The ports of a switch, in the order in which they were added.
std::vector<Port> ports_of(Transaction &transaction, SwitchKey switch_key);
/// The numbers of the ports of a switch that are no uplink ports.
std::vector<PortNumber> client_numbers(Transaction &transaction, SwitchKey switch_key);
/// How many ports of that kind the switch has.
std::uint32_t count_ports(Transaction &transaction, SwitchKey switch_key, PortKind kind);

struct AttachedUplink {
  std::string name;
  PortNumber port;
};

struct Uplink {
  std::string name;
  std::optional<PortNumber> port;  ///< none while it is free
};

std::optional<Uplink> find_uplink(Transaction &transaction, std::string_view name);
/// All uplinks of the host, in the order in which they were added.
std::vector<Uplink> all_uplinks(Transaction &transaction);
/// Adds a free uplink to the host. Its name is unique there.
void add_uplink(ChangingTransaction &transaction, std::string_view name);
/// Removes all uplinks from the host but for those that are tunnels, which go with their fabric.
void remove_uplinks(ChangingTransaction &transaction);
/// The free uplinks of the host that are wires, in the order in which they were added.
std::vector<std::string> free_uplinks(Transaction &transaction);
/// Puts an uplink at an uplink port.
void attach_uplink(ChangingTransaction &transaction, std::string_view name, PortNumber port);
/// The uplink ports of a switch in their order, with or without an uplink.
std::vector<Port> uplink_ports_of(Transaction &transaction, SwitchKey switch_key);
/// The uplink at a port.
std::optional<std::string> uplink_at(Transaction &transaction, PortNumber number);
/// The uplinks at the ports of a switch, in the order of the ports.
std::vector<AttachedUplink> uplinks_of(Transaction &transaction, SwitchKey switch_key);

/// The numbers that callers see, of ports and of link-aggregation groups, begin anew: for a host
/// that has none of them.
void restart_numbering(ChangingTransaction &transaction);

}  // namespace simhost::storage
