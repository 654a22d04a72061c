// What goes wrong with a switch in a daemon that is like any other but for this: by its MTU, which
// the process that sets it has nothing against. The linker takes this in place of compile().
#include <stdexcept>
#include <string>

#include "planes/openvswitch/compile/compile.h"

using simhost::openflow::Group;
using simhost::openvswitch::Compiled;
using simhost::openvswitch::MadeOfPorts;
using simhost::openvswitch::Network;

Compiled compile_well(Network const &network, MadeOfPorts &before) asm(
    "__real__ZN7simhost11openvswitch7compileERKNS0_7NetworkERNS0_11MadeOfPortsE");
Compiled compile_with_faults(Network const &network, MadeOfPorts &before) asm(
    "__wrap__ZN7simhost11openvswitch7compileERKNS0_7NetworkERNS0_11MadeOfPortsE");

Compiled compile_with_faults(Network const &network, MadeOfPorts &before) {
  constexpr std::uint16_t kNotCompiled = 6001;
  constexpr std::uint16_t kNotEncoded = 6002;
  constexpr std::uint16_t kRefused = 6003;
  constexpr simhost::openflow::GroupId kLast = 0xffffff00;
  if (network.mtu == kNotCompiled) {
    throw std::logic_error("a fault planted in the compiler");
  }
  auto compiled = compile_well(network, before);
  if (network.mtu == kNotEncoded) {
    compiled.groups.push_back({.id = kLast, .selection = {.method = std::string(16, 'x')}});
  } else if (network.mtu == kRefused) {
    compiled.groups.push_back({.id = kLast, .type = simhost::openflow::GroupType::indirect});
  }
  return compiled;
}
