// The plane that was chosen for this process.
#include "model/plane.h"

#include <algorithm>
#include <cassert>

namespace simhost {
namespace {

constinit Plane *chosen = nullptr;

}  // namespace

bool Lag::up() const {
  return std::any_of(members.begin(), members.end(), [](Member const &m) { return m.up; });
}

Plane &running_plane() {
  assert(chosen != nullptr);
  return *chosen;
}

void run_on(Plane &plane) {
  chosen = &plane;
}

}  // namespace simhost
