// When ovs-vswitchd has done what the database says.
#pragma once

#include <cstdint>

#include "planes/openvswitch/ovsdb/client.h"

namespace simhost::ovsdb {

/// Adds to a transaction what gives the configuration its next number.
void raise_configuration(Json &operations);
/// That number, from the results of the transaction. Throws Malformed.
std::int64_t raised_configuration(Json const &results);

/// The columns that the following needs of the client's replica.
void select_configuration(Selected &selected);
/// The number of the last one that anybody asked for, as far as that is known.
std::int64_t wanted_configuration(Replica const &replica);
/// Returns when a configuration with this number, or a later one, is in force. Throws what waits
/// do.
void wait_for_configuration(Client &client, std::int64_t number, Deadline deadline);

}  // namespace simhost::ovsdb
