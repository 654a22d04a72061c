// The host that some harnesses use: one for all inputs, each of which is undone.
#ifndef TESTS_FUZZ_HOST_H
#define TESTS_FUZZ_HOST_H

#include "base/outcomes.h"
#include "clock/clock.h"
#include "planes/stored/stored_plane.h"
#include "scenario/scenario.h"
#include "storage/store.h"

/// A switch "s" with two of three uplinks and the ports "p1" and "p2".
inline simhost::storage::Store &shared_host() {
  static simhost::storage::Store store(std::nullopt,
                                       [](simhost::storage::ChangingTransaction &transaction) {
                                         simhost::run_on(simhost::stored::plane());
                                         simhost::scenario::apply(transaction, R"({
      "clock": {"stopped": true, "now": 1000},
      "uplinks": [{"name": "nic0"}, {"name": "nic1"}, {"name": "nic2"}],
      "switches": [{
        "alias": "s", "id": "s-id", "portset": "s-ports", "uplinks": ["nic0", "nic1"],
        "ports": [{"id": "p1"}, {"id": "p2"}]
      }]
    })");
                                       });
  return store;
}

/// Whether the host does `work`; it may refuse it, and nothing else.
template <typename Work>
bool is_accepted(Work const &work) {
  try {
    work();
    return true;
  } catch (simhost::Refused const &) {
    return false;
  }
}

#endif
