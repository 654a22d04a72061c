// A switch "s" with the uplinks nic0 to nic2 and the ports p1 and p2, and a clock that stands at
// 1000 seconds.
#pragma once

#include <chrono>

#include "clock/clock.h"
#include "memory_state.h"
#include "model/lookup.h"
#include "model/plane.h"
#include "model/ports/ports.h"
#include "model/properties/properties.h"
#include "model/switches/switches.h"

struct Plane : MemoryState {
  static constexpr std::chrono::seconds kStart{1000};

  Plane() {
    simhost::stop_clock(transaction);
    simhost::set_clock(transaction, kStart);
    simhost::create_switch(transaction, {.alias = "s", .uplink_count = 3});
    key = simhost::get_switch(transaction, "s").key;
    p1 = simhost::add_client_port(transaction, key, "p1");
    p2 = simhost::add_client_port(transaction, key, "p2");
  }

  template <typename Record>
  void set_policy(simhost::storage::PropertyOwner const &owner, char const *name,
                  Record const &record) {
    simhost::set_property(transaction, owner, name, simhost::bytes_of(record));
  }
  [[nodiscard]] simhost::storage::PropertyOwner of_switch() const {
    return simhost::storage::PropertyOwner::global(key);
  }
  [[nodiscard]] simhost::storage::PropertyOwner of(simhost::storage::Port const &port) const {
    return simhost::storage::PropertyOwner::port(key, port.number);
  }

  simhost::storage::ChangingTransaction transaction{store};
  simhost::storage::SwitchKey key{};
  simhost::storage::Port p1;
  simhost::storage::Port p2;
};
