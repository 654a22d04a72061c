// What the data path of an Open vSwitch remembers of its flows, so that not every frame is looked
// up.
#pragma once

#include <cstdint>
#include <filesystem>
#include <functional>
#include <string>

#include "planes/openvswitch/openflow/change.h"
#include "planes/openvswitch/openflow/connection.h"

namespace simhost::daemon {

/// Makes the Open vSwitch whose database has its socket in `folder` forget that, so that the next
/// frame of each kind is looked up. For `lives` see openvswitch::Stream. Throws std::runtime_error.
///
/// By itself it looks at what it remembers when flows change, but passes over some of it where that
/// is much: frames went on for up to 1.5 s as they had before.
void forget_cached_flows(std::filesystem::path const &folder, openvswitch::Lives const &lives = {});
/// Likewise. Returns whether the bridge of that name had that generation in force before: if not,
/// what is remembered may be how frames went until then.
bool forget_cached_flows(std::filesystem::path const &folder, std::string const &bridge,
                         std::uint64_t generation, openvswitch::Lives const &lives = {});

/// Makes changes, and does `forget`, if that is anything, so that it finds them made: it returns
/// whether it did so, as it can tell if they bring another generation. It is done at once, as Open
/// vSwitch looks at all of its devices before it listens again: most of the time it hears of both
/// at one time, and of the changes first.
void change_and_forget(openflow::Connection &connection, openflow::Changes const &changes,
                       bool is_other_generation, std::function<bool()> const &forget,
                       openvswitch::Deadline deadline);

}  // namespace simhost::daemon
