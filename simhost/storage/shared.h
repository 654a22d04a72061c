// The rows of what this host shares with others through a fabric.
#pragma once

#include <cstddef>
#include <map>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "storage/ports.h"

namespace simhost::storage {

class ChangingTransaction;
class Transaction;

/// This host in its fabric.
struct Membership {
  std::string host;   ///< its name there
  std::string state;  ///< tells this state from another host's of the same name
};

/// None of a host that shares nothing.
std::optional<Membership> find_membership(Transaction &transaction);
void put_membership(ChangingTransaction &transaction, Membership const &membership);

/// A switch, or a port of it.
struct SharedName {
  std::string switch_identifier;
  std::string port;  ///< empty: the switch itself

  auto operator<=>(SharedName const &) const = default;
};

/// What the fabric and this host last agreed on.
struct Shared {
  SharedName name;
  std::string fabric;                           ///< the fabric's row as a text; empty: it has none
  std::optional<std::vector<std::byte>> image;  ///< of what this host has; none: it has nothing
  bool fits = true;  ///< whether that is the same; otherwise this host cannot bear the fabric's row
};

/// All of them, each switch before its ports.
std::vector<Shared> all_shared(Transaction &transaction);
std::optional<Shared> find_shared(Transaction &transaction, SharedName const &name);
/// Replaces what was there.
void put_shared(ChangingTransaction &transaction, Shared const &shared);
void remove_shared(ChangingTransaction &transaction, SharedName const &name);
/// With all of its ports.
void remove_shared_switch(ChangingTransaction &transaction, std::string_view identifier);
bool is_shared(Transaction &transaction, std::string_view switch_identifier);

/// Those that may have become other since they were put or removed, whoever did it, each switch
/// before its ports: all of a switch that is gone, and ports that were never put.
std::vector<SharedName> touched(Transaction &transaction);
/// One may have become other.
void touch(ChangingTransaction &transaction, SharedName const &name);
/// All of a switch may.
void touch(ChangingTransaction &transaction, std::string_view switch_identifier);
/// None of them has.
void forget_touched(ChangingTransaction &transaction);

/// What each host counted of a port: texts of counters by the name of the host.
using CountedByHost = std::map<std::string, std::string>;

CountedByHost counted_of(Transaction &transaction, PortNumber number);
/// Of all ports of a switch of which there is any.
std::map<PortNumber, CountedByHost> counted_of_ports(Transaction &transaction, SwitchKey key);
void put_counted(ChangingTransaction &transaction, PortNumber number, std::string_view host,
                 std::string_view counters);

}  // namespace simhost::storage
