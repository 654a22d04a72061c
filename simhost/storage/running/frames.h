// The row of a host whose frames a daemon moves.
#pragma once

#include <cstdint>
#include <optional>

namespace simhost::storage {

class ChangingTransaction;
class Transaction;

/// The number of the last change that is to be in force; none while no daemon ever took the host.
std::optional<std::uint64_t> frames_change(Transaction &transaction);
/// Gives what is changed here the next number; nothing while no daemon ever took the host.
void advance_frames_change(ChangingTransaction &transaction);
/// A daemon takes the host. A host that was taken before stays as it is.
void take_frames(ChangingTransaction &transaction);

}  // namespace simhost::storage
