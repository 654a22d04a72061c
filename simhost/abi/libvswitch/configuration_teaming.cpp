// VSDVS_*: which uplinks switches and ports use.
#include <algorithm>
#include <string>

#include "abi/targets.h"
#include "model/teaming/properties.h"
#include "vswitch/configuration.h"

namespace simhost {
extern "C" {

QEX_ReturnStatus VSDVS_GetTeamingPolicy(char const *switchName, VSTeamPolicy *policy) {
  return reading(__func__, [&](ReadingCall &call) {
    require(policy) = get(call, switch_called(switchName), teaming::of_switch);
  });
}

QEX_ReturnStatus VSDVS_GetTeamingPolicyFromDVSID(char const *switchId, VSTeamPolicy *policy) {
  return reading(__func__, [&](ReadingCall &call) {
    require(policy) = get(call, switch_identified(switchId), teaming::of_switch);
  });
}

QEX_ReturnStatus VSDVS_SetTeamingPolicy(char const *switchName, VSTeamPolicy const *policy) {
  return changing(__func__, [&](ChangingCall &call) {
    set(call, switch_called(switchName), teaming::of_switch, require(policy));
  });
}

QEX_ReturnStatus VSDVS_ClearTeamingPolicy(char const *switchName) {
  return changing(__func__, [&](ChangingCall &call) {
    clear(call, switch_called(switchName), teaming::of_switch);
  });
}

QEX_ReturnStatus VSDVS_GetPortTeamingPolicy(char const *switchName, char const *port,
                                            VSTeamPolicy *policy) {
  return reading(__func__, [&](ReadingCall &call) {
    require(policy) = get(call, port_of(switch_called(switchName), port), teaming::policy);
  });
}

QEX_ReturnStatus VSDVS_SetPortTeamingPolicy(char const *switchName, char const *port,
                                            VSTeamPolicy const *policy) {
  return changing(__func__, [&](ChangingCall &call) {
    set(call, port_of(switch_called(switchName), port), teaming::policy, require(policy));
  });
}

QEX_ReturnStatus VSDVS_ClearPortTeamingPolicy(char const *switchName, char const *port) {
  return changing(__func__, [&](ChangingCall &call) {
    clear(call, port_of(switch_called(switchName), port), teaming::policy);
  });
}

QEX_ReturnStatus VSDVS_GetPortTeamingOverride(char const *switchName, char const *port,
                                              char *overrideBuffer) {
  return reading(__func__, [&](ReadingCall &call) {
    auto const target = port_of(switch_called(switchName), port);
    auto *const output = &require(overrideBuffer);
    auto const text = get(call, target, teaming::bound_uplink);
    *std::copy(text.begin(), text.end(), output) = '\0';
  });
}

QEX_ReturnStatus VSDVS_SetPortTeamingOverride(char const *switchName, char const *port,
                                              char const *overrideName) {
  return changing(__func__, [&](ChangingCall &call) {
    auto const target = port_of(switch_called(switchName), port);
    auto const name = require_text(overrideName);
    set(call, target, teaming::bound_uplink, std::string(name));
  });
}

QEX_ReturnStatus VSDVS_ClearPortTeamingOverride(char const *switchName, char const *port) {
  return changing(__func__, [&](ChangingCall &call) {
    clear(call, port_of(switch_called(switchName), port), teaming::bound_uplink);
  });
}

QEX_ReturnStatus VSDVS_GetTxUplinkAlways(char const *switchName, char const *port,
                                         qex_Bool *enabled) {
  return reading(__func__, [&](ReadingCall &call) {
    require(enabled) =
        get(call, port_of(switch_called(switchName), port), teaming::transmit_uplink);
  });
}

QEX_ReturnStatus VSDVS_SetTxUplinkAlways(char const *switchName, char const *port,
                                         qex_Bool enabled) {
  return changing(__func__, [&](ChangingCall &call) {
    auto const value = static_cast<qex_Bool>(enabled != 0);
    set(call, port_of(switch_called(switchName), port), teaming::transmit_uplink, value);
  });
}

}  // extern "C"
}  // namespace simhost
