// Operators ask what would carry a host's ports if an uplink failed: a row of the fabric for each
// question, into which the host writes its reply.
#pragma once

#include <string>
#include <vector>

#include "fabric/rows/rows.h"
#include "storage/store.h"

namespace simhost::fabric {

struct Drill {
  std::string id;
  std::string switch_identifier;
};

/// Those that a host has yet to reply to.
std::vector<Drill> drills_for(ovsdb::Replica const &replica, std::string const &host);
/// What would be: "failovers", or "refused" with the reason.
Json drilled(storage::Store &store, Drill const &drill);
/// The operations that put a reply into the fabric.
Json reply_to(Drill const &drill, Json const &reply);

}  // namespace simhost::fabric
