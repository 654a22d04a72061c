// The plane that was chosen for this process.
#include "model/plane.h"

#include <cassert>

#include "base/outcomes.h"
#include "storage/store.h"

namespace simhost {
namespace {

constinit Plane *chosen = nullptr;

}  // namespace

Plane &running_plane() {
  assert(chosen != nullptr);
  return *chosen;
}

void run_on(Plane &plane) {
  chosen = &plane;
}

Wires &get_wires() {
  auto *const wires = running_plane().find_wires();
  if (wires == nullptr) {
    throw Refused(QEX_NOT_SUPPORTED, "the wires are real: what comes over them cannot be set");
  }
  return *wires;
}

void commit(storage::ReadingTransaction &transaction) {
  transaction.commit();
}

void commit(storage::ChangingTransaction &transaction) {
  auto &plane = running_plane();
  plane.prepare(transaction);
  transaction.commit();
  plane.committed();
}

}  // namespace simhost
