// The plane that was chosen for this process.
#include "model/plane.h"

#include <cassert>

#include "base/outcomes.h"
#include "model/sharing.h"
#include "storage/store.h"

namespace simhost {
namespace {

constinit Plane *chosen = nullptr;
constinit Sharing *sharing = nullptr;

}  // namespace

Plane &running_plane() {
  assert(chosen != nullptr);
  return *chosen;
}

void run_on(Plane &plane) {
  chosen = &plane;
}

void share_through(Sharing *through) {
  sharing = through;
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
  // Last, because what others were told cannot be taken back.
  bool const is_told = sharing != nullptr && sharing->prepare(transaction);
  try {
    transaction.commit();
  } catch (storage::StateFailure const &failure) {
    if (is_told) {
      throw Refused(
          QEX_TIMEOUT,
          std::string("other hosts have the change, and this one will follow: ") + failure.what());
    }
    throw;
  }
  plane.committed();
}

}  // namespace simhost
