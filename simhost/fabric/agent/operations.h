// The rows of the fabric, from and to what hosts share.
#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include "fabric/shared/records.h"
#include "planes/openvswitch/ovsdb/client.h"

namespace simhost::fabric {

inline constexpr auto *kDatabase = "fabric";
/// What the versions of its schema begin with that this host knows.
inline constexpr auto *kSchemaVersion = "1.";

/// The columns that a host follows.
ovsdb::Selected selected_columns();

/// Of the switches that the host belongs to, and their ports.
Records records_of(ovsdb::Replica const &replica, std::string const &host);
/// How many changes there were.
std::int64_t revision_of(ovsdb::Replica const &replica);

/// A host, as the fabric has it.
struct HostRow {
  std::string state;
  std::string session;
};
std::optional<HostRow> find_host(ovsdb::Replica const &replica, std::string const &name);

/// A process that speaks for a host.
struct Speaker {
  std::string host;
  std::string session;
};

/// Refuses the transaction if somebody else speaks for the host by now.
Json only_for(Speaker const &speaker);
/// Each row must be as it was.
Json operations_of(std::vector<Change> const &changes);
Json next_revision();
/// A change that was made, or that is never to be made.
Json change_insertion(std::string const &id, std::string const &host, bool revoked);
Json change_selection(std::string const &id);
/// Those of the host from before that time, in seconds since the beginning of 1970.
Json old_changes_deletion(std::string const &host, std::int64_t time);
Json join(std::string const &alias, std::string const &host);

/// All of the operations in all of the lists.
Json together(std::initializer_list<Json> lists);

}  // namespace simhost::fabric
