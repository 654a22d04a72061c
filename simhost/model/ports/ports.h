// Ports of switches: their life, and the uplink ports with their names.
#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "base/api.h"
#include "base/bytes.h"
#include "model/properties/descriptor.h"
#include "nebpublic/ports.h"
#include "qexapi/switch_ports.h"
#include "storage/ports.h"

namespace simhost {

/// Bytes of names, without the NUL that callers have room for.
inline constexpr std::size_t kLongestIdentifier = QEX_NEB_PORT_ID_MAX_LEN - 1;
inline constexpr std::size_t kLongestName = QEX_NEB_NAME_MAX_LEN - 1;

/// Adds a port for a client. Refuses an empty identifier (QEX_BAD_PARAM), one of more than 47 bytes
/// (QEX_NAME_TOO_LONG), one that is taken (QEX_EXISTS), and a port past the switch's limit
/// (QEX_LIMIT_EXCEEDED).
SIMHOST_API storage::Port add_client_port(storage::ChangingTransaction &transaction,
                                          storage::SwitchKey switch_key,
                                          std::string_view identifier);
/// Adds an uplink port without an uplink, by the same rules of identifiers; refuses more than
/// QEX_TEAM_MAX_UPLINKS (QEX_LIMIT_EXCEEDED).
storage::Port add_vacant_uplink_port(storage::ChangingTransaction &transaction,
                                     storage::SwitchKey switch_key, std::string_view identifier);
/// Sets what another system calls a port, by the rules of identifiers.
SIMHOST_API void set_external_id(storage::ChangingTransaction &transaction,
                                 storage::Port const &port, std::string_view external_id);
/// Removes a port. Refuses an uplink port with its uplink (QEX_BUSY).
SIMHOST_API void remove_port(storage::ChangingTransaction &transaction, storage::Port const &port);

/// The port of a switch that another system knows by `external_id`.
SIMHOST_API storage::Port get_external_port(storage::Transaction &transaction,
                                            storage::SwitchKey switch_key,
                                            std::string_view external_id);
/// The uplink port of a switch that has a number.
SIMHOST_API storage::Port get_uplink_port(storage::Transaction &transaction,
                                          storage::SwitchKey switch_key, std::uint32_t number);

/// What a port is to this host: QEX_NEBPROP_PORT_TYPE, DVSPORT_TYPE_ACTIVE unless set.
SIMHOST_API DVSPortType type_of(storage::Transaction &transaction, storage::Port const &port);
/// The ports of a switch that are of that type, as lists of ports have them.
SIMHOST_API std::vector<DVPortData> ports_of_type(storage::Transaction &transaction,
                                                  storage::SwitchKey switch_key, DVSPortType type);
/// The number that a port's client must show: QEX_NEBPROP_PORT_CONNECTID, 0 unless set.
SIMHOST_API std::uint32_t connect_id_of(storage::Transaction &transaction,
                                        storage::Port const &port);
/// QEX_NEBPROP_PORT_ALIAS; nothing if it is not set.
SIMHOST_API std::optional<std::string> alias_of(storage::Transaction &transaction,
                                                storage::Port const &port);

/// An uplink port as callers know it.
struct UplinkPort {
  std::string name;
  std::string identifier;
};

/// The uplink ports of a switch, with or without uplinks. The name is the alias, or the identifier
/// of a port without one.
SIMHOST_API std::vector<UplinkPort> named_uplink_ports(storage::Transaction &transaction,
                                                       storage::SwitchKey switch_key);
/// The rules of QEX_NEBPROP_PORT_ALIAS: refuses a text that is too long (QEX_NAME_TOO_LONG), and
/// for an uplink port no name (QEX_BAD_PARAM) and the name of another one of its switch
/// (QEX_EXISTS).
SIMHOST_API void check_port_alias(Setting const &setting);
/// Makes the uplink ports of a switch those, known by their identifiers: new ones are added without
/// an uplink, those left out are removed and their uplinks set free, the others keep theirs.
/// Refuses empty names (QEX_BAD_PARAM), long ones (QEX_NAME_TOO_LONG), a name or an identifier
/// twice or an identifier of another port (QEX_EXISTS), more than QEX_TEAM_MAX_UPLINKS
/// (QEX_LIMIT_EXCEEDED).
SIMHOST_API void set_uplink_ports(storage::ChangingTransaction &transaction,
                                  storage::SwitchKey switch_key,
                                  std::vector<UplinkPort> const &ports);
/// Attaches an uplink of the host to the first uplink port without one, or to a new one. Refuses an
/// unknown uplink (QEX_NOT_FOUND), one that the switch has (QEX_EXISTS) and one that another has
/// (QEX_BUSY).
SIMHOST_API void add_uplink_port(storage::ChangingTransaction &transaction,
                                 storage::SwitchKey switch_key, std::string_view uplink);
/// Removes the uplink port at which an uplink is; the uplink becomes free.
SIMHOST_API void remove_uplink_port(storage::ChangingTransaction &transaction,
                                    storage::SwitchKey switch_key, std::string_view uplink);

/// The uplink ports in a list of names and a list of identifiers, a VSUplinkPorts and a
/// VSUplinkPortIds. Refuses lists that are not as long as they say, or each other (QEX_BAD_PARAM).
SIMHOST_API std::vector<UplinkPort> uplink_ports_in(BytesView names, BytesView identifiers);

/// The values of QEX_NEBPROP_SWITCH_UPLINKPORTS and of QEX_NEBPROP_HOST_UPLINKPORTS: a
/// VSUplinkPorts and a VSUplinkPortIds.
SIMHOST_API Bytes read_uplink_names(storage::Transaction &transaction,
                                    storage::PropertyOwner const &owner);
SIMHOST_API Bytes read_uplink_ids(storage::Transaction &transaction,
                                  storage::PropertyOwner const &owner);
/// Names for the uplink ports in their order; further ones add ports, missing ones remove ports.
SIMHOST_API void write_uplink_names(Setting const &setting);
/// The identifiers that the uplink ports are to have; new ports are named after theirs.
SIMHOST_API void write_uplink_ids(Setting const &setting);

}  // namespace simhost
