// A host with four uplinks in memory, and what tests ask of calls on it.
#pragma once

#include <gtest/gtest.h>

#include <optional>

#include "core/giving_up.h"
#include "store/ports.h"
#include "store/store.h"

struct MemoryState : testing::Test {
  static void furnish(simhost::store::Transaction &transaction) {
    for (auto const *uplink : {"nic0", "nic1", "nic2", "nic3"}) {
      simhost::store::add_uplink(transaction, uplink);
    }
  }

  simhost::store::Store store{std::nullopt, furnish};
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
