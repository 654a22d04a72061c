// VSDVS_*: which uplinks switches and ports use.
#include <algorithm>
#include <string>

#include "abi/targets.h"
#include "model/teaming/properties.h"
#include "vswitch/configuration.h"
#include "vswitch/properties.h"

using simhost::changing;
using simhost::ChangingCall;
using simhost::port_of;
using simhost::reading;
using simhost::ReadingCall;
using simhost::RecordProperty;
using simhost::require;
using simhost::require_text;
using simhost::switch_called;
using simhost::switch_identified;

namespace {

constexpr RecordProperty<VSTeamPolicy> kSwitchTeaming{.key = VSPROP_SWITCH_TEAMING,
                                                      .unset = simhost::teaming::of_switch.unset};
constexpr RecordProperty<qex_Bool> kTxUplink{.key = VSPROP_PORT_TX_UPLINK, .unset = 0};

// What a port uses: its own policy, or else its switch's.
VSTeamPolicy teaming_of(ReadingCall &call, simhost::NamedPort const &target) {
  auto &transaction = call.transaction();
  auto const owner = simhost::owner_of(transaction, target);
  auto const on_switch = simhost::read(
      transaction, simhost::storage::PropertyOwner::global(owner.switch_key), kSwitchTeaming);
  return simhost::read(
      transaction, owner,
      RecordProperty<VSTeamPolicy>{.key = VSPROP_PORT_TEAMING_POLICY, .unset = on_switch});
}

}  // namespace

extern "C" {

QEX_ReturnStatus VSDVS_GetTeamingPolicy(char const *switchName, VSTeamPolicy *policy) {
  return reading(__func__, [&](ReadingCall &call) {
    require(policy) = simhost::read(call, switch_called(switchName), kSwitchTeaming);
  });
}

QEX_ReturnStatus VSDVS_GetTeamingPolicyFromDVSID(char const *switchId, VSTeamPolicy *policy) {
  return reading(__func__, [&](ReadingCall &call) {
    require(policy) = simhost::read(call, switch_identified(switchId), kSwitchTeaming);
  });
}

QEX_ReturnStatus VSDVS_SetTeamingPolicy(char const *switchName, VSTeamPolicy const *policy) {
  return changing(__func__, [&](ChangingCall &call) {
    simhost::write(call, switch_called(switchName), kSwitchTeaming, require(policy));
  });
}

QEX_ReturnStatus VSDVS_ClearTeamingPolicy(char const *switchName) {
  return changing(__func__, [&](ChangingCall &call) {
    simhost::reset(call, switch_called(switchName), VSPROP_SWITCH_TEAMING);
  });
}

QEX_ReturnStatus VSDVS_GetPortTeamingPolicy(char const *switchName, char const *port,
                                            VSTeamPolicy *policy) {
  return reading(__func__, [&](ReadingCall &call) {
    require(policy) = teaming_of(call, port_of(switch_called(switchName), port));
  });
}

QEX_ReturnStatus VSDVS_SetPortTeamingPolicy(char const *switchName, char const *port,
                                            VSTeamPolicy const *policy) {
  return changing(__func__, [&](ChangingCall &call) {
    constexpr RecordProperty<VSTeamPolicy> kOfPort{.key = VSPROP_PORT_TEAMING_POLICY, .unset = {}};
    simhost::write(call, port_of(switch_called(switchName), port), kOfPort, require(policy));
  });
}

QEX_ReturnStatus VSDVS_ClearPortTeamingPolicy(char const *switchName, char const *port) {
  return changing(__func__, [&](ChangingCall &call) {
    simhost::reset(call, port_of(switch_called(switchName), port), VSPROP_PORT_TEAMING_POLICY);
  });
}

QEX_ReturnStatus VSDVS_GetPortTeamingOverride(char const *switchName, char const *port,
                                              char *overrideBuffer) {
  return reading(__func__, [&](ReadingCall &call) {
    auto const target = port_of(switch_called(switchName), port);
    auto *const output = &require(overrideBuffer);
    auto &transaction = call.transaction();
    auto const property = simhost::get_property(transaction, simhost::owner_of(transaction, target),
                                                VSPROP_PORT_TEAMING_OVERRIDE);
    auto const text = property ? simhost::text_of(property->value) : std::string();
    *std::copy(text.begin(), text.end(), output) = '\0';
  });
}

QEX_ReturnStatus VSDVS_SetPortTeamingOverride(char const *switchName, char const *port,
                                              char const *overrideName) {
  return changing(__func__, [&](ChangingCall &call) {
    auto const target = port_of(switch_called(switchName), port);
    auto const name = require_text(overrideName);
    auto &transaction = call.transaction();
    simhost::set_property(transaction, simhost::owner_of(transaction, target),
                          VSPROP_PORT_TEAMING_OVERRIDE, simhost::bytes_of_text(name));
  });
}

QEX_ReturnStatus VSDVS_ClearPortTeamingOverride(char const *switchName, char const *port) {
  return changing(__func__, [&](ChangingCall &call) {
    simhost::reset(call, port_of(switch_called(switchName), port), VSPROP_PORT_TEAMING_OVERRIDE);
  });
}

QEX_ReturnStatus VSDVS_GetTxUplinkAlways(char const *switchName, char const *port,
                                         qex_Bool *enabled) {
  return reading(__func__, [&](ReadingCall &call) {
    require(enabled) = simhost::read(call, port_of(switch_called(switchName), port), kTxUplink);
  });
}

QEX_ReturnStatus VSDVS_SetTxUplinkAlways(char const *switchName, char const *port,
                                         qex_Bool enabled) {
  return changing(__func__, [&](ChangingCall &call) {
    auto const value = static_cast<qex_Bool>(enabled != 0);
    simhost::write(call, port_of(switch_called(switchName), port), kTxUplink, value);
  });
}

}  // extern "C"
