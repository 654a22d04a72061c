// Numbers for addresses: the same one for an address until what lies there is released.
#pragma once

#include <cstdint>

namespace recordings {

/// The number of an address, from 1 on; 0 if there is no memory to remember it.
std::uint64_t identity_of(std::uint64_t address) noexcept;

/// Forgets an address: what is allocated there next is another thing.
void forget(std::uint64_t address) noexcept;

/// Around a fork, so that the child finds them whole.
void lock_identities() noexcept;
void unlock_identities() noexcept;

}  // namespace recordings
