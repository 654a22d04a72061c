// What was made of each switch last: most changes are of one port of one switch or of none, and
// what happens around a host of none at all.
#pragma once

#include <map>
#include <memory>
#include <vector>

#include "planes/openvswitch/compile/compile.h"
#include "storage/switches.h"

namespace simhost::daemon {

/// Nobody changes it, so that those who have the same need not look into it.
using Flows = std::shared_ptr<openvswitch::Compiled const>;

struct CompiledSwitch {
  openvswitch::Network network;
  Flows flows;
};

class Compiler {
 public:
  /// What compile() makes of it: the same as the last time, if that is still so. Refuses as
  /// compile() does. Valid until the next call.
  CompiledSwitch const &compile(storage::SwitchKey key, openvswitch::Network network);
  /// Those that nobody asks for from now on are to be forgotten.
  void begin();
  /// Forgets them, and what was made anew as it was before: to be done when nobody waits, as that
  /// takes a part of what it took to make it. Without begin() nobody had a chance to ask.
  void forget_others();

 private:
  struct Kept {
    CompiledSwitch made;
    openvswitch::MadeOfPorts made_of_ports;
    bool is_asked_for = true;
  };

  std::map<storage::SwitchKey, Kept> kept_;
  std::vector<Flows> replaced_;
  bool has_begun_ = false;
};

}  // namespace simhost::daemon
