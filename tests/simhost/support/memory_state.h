// A host with four uplinks in memory, and what tests ask of calls on it.
#pragma once

#include <gtest/gtest.h>

#include <optional>

#include "base/outcomes.h"
#include "planes/stored/stored_plane.h"
#include "storage/ports.h"
#include "storage/store.h"

struct MemoryState : testing::Test {
  MemoryState() { simhost::run_on(simhost::stored::plane()); }

  static void populate(simhost::storage::ChangingTransaction &transaction) {
    for (auto const *uplink : {"nic0", "nic1", "nic2", "nic3"}) {
      simhost::storage::add_uplink(transaction, uplink);
    }
  }

  simhost::storage::Store store{std::nullopt, populate};
};

/// The status with which `work` is refused; QEX_OK if it is not.
template <typename Work>
QEX_ReturnStatus status_of(Work const &work) {
  try {
    work();
    return QEX_OK;
  } catch (simhost::Refused const &refused) {
    return refused.status();
  }
}
