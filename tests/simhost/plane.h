// A switch "s" with the uplinks nic0 to nic2 and the ports p1 and p2, and a clock that stands at
// 1000 seconds.
#pragma once

#include <chrono>

#include "core/clock.h"
#include "core/data_plane.h"
#include "core/known.h"
#include "core/ports.h"
#include "core/properties.h"
#include "core/switches.h"
#include "memory_state.h"

struct Plane : MemoryState {
  static constexpr std::chrono::seconds kStart{1000};

  Plane() {
    simhost::stop_clock(work);
    simhost::set_clock(work, kStart);
    simhost::create_switch(work, {.alias = "s", .uplink_count = 3});
    key = simhost::known_switch(work, "s").key;
    p1 = simhost::add_client_port(work, key, "p1");
    p2 = simhost::add_client_port(work, key, "p2");
  }

  template <typename Record>
  void set_policy(simhost::store::PropertyOwner const &owner, char const *name,
                  Record const &record) {
    simhost::set_property(work, owner, name, simhost::bytes_of(record));
  }
  [[nodiscard]] simhost::store::PropertyOwner of_switch() const {
    return simhost::store::PropertyOwner::global(key);
  }
  [[nodiscard]] simhost::store::PropertyOwner of(simhost::store::Port const &port) const {
    return simhost::store::PropertyOwner::port(key, port.number);
  }

  simhost::store::Transaction work{store, simhost::store::Access::write};
  simhost::store::SwitchKey key{};
  simhost::store::Port p1;
  simhost::store::Port p2;
};
