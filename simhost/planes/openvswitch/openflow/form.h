// What a switch takes or refuses when it reads a change, before it knows what the change is for.
#pragma once

#include <set>
#include <string>

#include "planes/openvswitch/openflow/change.h"
#include "planes/openvswitch/openflow/port.h"

namespace simhost::openflow {

/// The greatest number of a port of a bridge's own.
inline constexpr Port kLastOwn = 0xfeff;

/// The same for changes that differ in nothing but numbers of which Open vSwitch takes any:
/// registers, addresses, VLANs, cookies, its own ports; and in how often an action that changes
/// nothing for the next ones is there. Groups have forms of their own, each.
std::string form_of(Change const &change);

/// The forms of what a switch has taken.
class KnownForms {
 public:
  /// Whether it took changes like each of these.
  [[nodiscard]] bool include(Changes const &changes) const;
  /// It has taken these.
  void add(Changes const &changes);

 private:
  std::set<std::string> forms_;
};

}  // namespace simhost::openflow
