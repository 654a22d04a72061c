// The rows of the fabric, as a host reads them.
#pragma once

#include <cstdint>
#include <map>
#include <optional>
#include <string>
#include <vector>

#include "fabric/shared/records.h"
#include "planes/openvswitch/ovsdb/replica.h"

namespace simhost::fabric {

inline constexpr auto *kDatabase = "fabric";
/// What the versions of its schema begin with that this host knows.
inline constexpr auto *kSchemaVersion = "1.";

/// The columns that a host follows.
ovsdb::Selected selected_columns();

/// The switches that the host belongs to.
Records switches_of(ovsdb::Replica const &replica, std::string const &host);
/// Whether there is one of that alias, on any host.
bool has_switch(ovsdb::Replica const &replica, std::string const &alias);
/// What people call a switch or a port.
std::string words_of(SharedName const &name, Records const &switches);
/// The column that says which hosts may write a switch and its ports, where they have a role.
using Writers = std::map<std::string, Json>;
/// By the identifier of the switch.
Writers writers_in(ovsdb::Replica const &replica);
/// How many changes there were.
std::int64_t revision_of(ovsdb::Replica const &replica);

/// A host, as the fabric has it.
struct HostRow {
  std::string state;
  std::string session;
};
std::optional<HostRow> find_host(ovsdb::Replica const &replica, std::string const &name);

/// Whether a switch has a host.
bool has_host(ovsdb::Row const &row, std::string const &host);
/// What hosts call a switch, and a port, by its row.
SharedName switch_in(ovsdb::Row const &row);
SharedName port_in(ovsdb::Row const &row);
/// The UUIDs of rows, by what hosts call them.
using RowNames = std::map<SharedName, std::string>;
/// What hosts have counted of a port.
CountsOfHosts counts_of_hosts(ovsdb::Row const &row);
/// Of a port that has a name, if its switch is one of these.
void add_port(Records &records, ovsdb::Row const &row, Records const &switches);

}  // namespace simhost::fabric
