// A fresh host in memory, and what tests ask of calls on it.
#pragma once

#include <gtest/gtest.h>

#include <optional>

#include "core/fresh_host.h"
#include "core/giving_up.h"
#include "store/store.h"

struct MemoryState : testing::Test {
  simhost::store::Store store{std::nullopt, simhost::furnish_fresh_host};
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
