// The rows of readings: what the data path of a switch had counted when its counters were last
// added to those of the host.
#pragma once

#include <cstdint>
#include <vector>

#include "storage/switches.h"

namespace simhost::storage {

class ChangingTransaction;
class Transaction;

struct Reading {
  std::uint64_t source;  ///< a number by which the data path knows what it counts; not 0
  std::uint64_t frames;
  std::uint64_t bytes;
};

/// Whether any were put since the counters were removed, be it none.
bool has_readings(Transaction &transaction, SwitchKey key);
std::vector<Reading> readings_of(Transaction &transaction, SwitchKey key);
/// Of each of these sources in place of the last one.
void put_readings(ChangingTransaction &transaction, SwitchKey key,
                  std::vector<Reading> const &readings);
/// The source counts no more.
void remove_reading(ChangingTransaction &transaction, SwitchKey key, std::uint64_t source);

}  // namespace simhost::storage
