// Copies of frames for mirror sessions, which other stages put where the sources are.
#pragma once

#include <algorithm>
#include <cstdint>
#include <vector>

#include "planes/openvswitch/compile/plan.h"
#include "planes/openvswitch/compile/program.h"

namespace simhost::openvswitch {

/// Where a frame is copied: as it comes into the switch, or as it leaves it.
enum class Copied { coming, leaving };

inline bool tells_direction(Mirror const &mirror) {
  return mirror.wrapping == Wrapping::erspan3 && !mirror.collectors.empty();
}

inline void append_copies(Actions &actions, Mirror const &mirror, Copied where) {
  if (where == Copied::leaving && tells_direction(mirror)) {
    actions.emplace_back(openflow::load(field::kLeaves, 1));
  }
  actions.emplace_back(openflow::set(field::kSession, mirror.id));
  actions.push_back(go_to(table::kMirrors));
}

/// What copies a frame to each session that names a source: `direction` is Mirror::received or
/// Mirror::sent, `kind` where in it the source is.
template <typename Source>
Actions copies(std::vector<Mirror> const &mirrors, MirrorSources Mirror::*direction,
               std::vector<Source> MirrorSources::*kind, Source const &source, Copied where) {
  Actions actions;
  for (auto const &mirror : mirrors) {
    auto const &sources = mirror.*direction.*kind;
    if (std::find(sources.begin(), sources.end(), source) != sources.end()) {
      append_copies(actions, mirror, where);
    }
  }
  return actions;
}

}  // namespace simhost::openvswitch
