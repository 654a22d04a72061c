// Transactions on the fabric: what hosts share as its rows.
#pragma once

#include <cstdint>
#include <map>
#include <optional>
#include <string>
#include <vector>

#include "fabric/rows/rows.h"
#include "fabric/shared/records.h"
#include "planes/openvswitch/ovsdb/client.h"

namespace simhost::fabric {

/// A process that speaks for a host.
struct Speaker {
  std::string host;
  std::string session;
};

/// Refuses the transaction if somebody else speaks for the host by now.
Json only_for(Speaker const &speaker);
/// Who speaks for a host, as rows.
Json session_selection(std::string const &host);
/// Each row must be as it was. `ports` has the rows of ports that are known, and `writers` are
/// those of the switches that the fabric has.
Json operations_of(std::vector<Change> const &changes, RowNames const &ports, Writers writers);
/// What a host has counted of ports, by the UUIDs of these: texts.
Json counts_update(std::string const &host, std::map<std::string, std::string> const &counts);
Json next_revision();
/// A change that was made, or that is never to be made.
Json change_insertion(std::string const &id, std::string const &host, bool revoked);
Json change_selection(std::string const &id);
/// Those of the host from before that time, in seconds since the beginning of 1970.
Json old_changes_deletion(std::string const &host, std::int64_t time);
/// Refuses the transaction if there is no switch of that alias.
Json join(std::string const &alias, std::string const &host);
Json leave(std::string const &switch_identifier, std::string const &host);

/// All of the operations in all of the lists.
Json together(std::initializer_list<Json> lists);

}  // namespace simhost::fabric
