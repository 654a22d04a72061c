// What counts at several hosts: each host says what it has counted of a port itself, and the
// counters of the port where it is connected have all of that.
#pragma once

#include <cstdint>
#include <map>
#include <string>
#include <string_view>

#include "storage/shared.h"

namespace simhost::storage {
class ChangingTransaction;
}

namespace simhost::fabric {

/// By the name of the counter.
using Counts = std::map<std::string, std::uint64_t>;
/// By the name of the host.
using CountsOfHosts = std::map<std::string, Counts>;

/// What a text says that somebody else may have written: what is no counter of a port is left out.
Counts counts_in(std::string_view text);
std::string text_of(Counts const &counts);

/// Adds to the counters of ports what the fabric has of them and they have not yet. Returns whether
/// that was anything.
bool take_counts(storage::ChangingTransaction &transaction,
                 std::map<storage::SharedName, CountsOfHosts> const &of_fabric);
/// What this host has counted of shared ports, ever, whatever became of their counters meanwhile:
/// from one look to the next, so that these have to be looked at from time to time.
std::map<storage::SharedName, Counts> own_counts(storage::ChangingTransaction &transaction,
                                                 storage::Membership const &membership);

}  // namespace simhost::fabric
