// VSDVS_*: MAC learning, and which frames ports send and take.
#include "abi/targets.h"
#include "model/mac/properties.h"
#include "model/multicast/properties.h"
#include "model/security/properties.h"
#include "vswitch/configuration.h"

namespace simhost {
extern "C" {

QEX_ReturnStatus VSDVS_GetMACLearning(char const *switchName, VSMACLearning *learning) {
  return reading(__func__, [&](ReadingCall &call) {
    require(learning) = get(call, switch_called(switchName), mac::learning);
  });
}

QEX_ReturnStatus VSDVS_SetMACLearning(char const *switchName, VSMACLearning const *learning) {
  return changing(__func__, [&](ChangingCall &call) {
    set(call, switch_called(switchName), mac::learning, require(learning));
  });
}

QEX_ReturnStatus VSDVS_ClearMACLearning(char const *switchName) {
  return changing(
      __func__, [&](ChangingCall &call) { clear(call, switch_called(switchName), mac::learning); });
}

QEX_ReturnStatus VSDVS_GetPortMACLearning(char const *switchName, char const *port,
                                          VSPMACLearning *learning) {
  return reading(__func__, [&](ReadingCall &call) {
    auto const management = get(call, port_of(switch_called(switchName), port), mac::management);
    require(learning) = management.portMACLearning;
  });
}

QEX_ReturnStatus VSDVS_SetPortMACLearning(char const *switchName, char const *port,
                                          VSPMACLearning const *learning) {
  return changing(__func__, [&](ChangingCall &call) {
    auto const target = port_of(switch_called(switchName), port);
    auto const &wanted = require(learning);
    auto &transaction = call.transaction();
    auto const owner = owner_of(transaction, target);
    auto management = effective(transaction, mac::management, owner);
    management.portMACLearning = wanted;
    set(transaction, mac::management, owner, management);
  });
}

QEX_ReturnStatus VSDVS_GetPortSecurity(char const *switchName, char const *port,
                                       VSPropSecurity *security) {
  return reading(__func__, [&](ReadingCall &call) {
    require(security) = get(call, port_of(switch_called(switchName), port), security::forbids);
  });
}

QEX_ReturnStatus VSDVS_SetPortSecurity(char const *switchName, char const *port,
                                       VSPropSecurity const *security) {
  return changing(__func__, [&](ChangingCall &call) {
    set(call, port_of(switch_called(switchName), port), security::forbids, require(security));
  });
}

QEX_ReturnStatus VSDVS_GetExtraEthFilter(char const *switchName, char const *port,
                                         VSExtraEthFilter *filter) {
  return reading(__func__, [&](ReadingCall &call) {
    require(filter) = get(call, port_of(switch_called(switchName), port), mac::ethernet_filter);
  });
}

QEX_ReturnStatus VSDVS_SetExtraEthFilter(char const *switchName, char const *port,
                                         VSExtraEthFilter const *filter) {
  return changing(__func__, [&](ChangingCall &call) {
    set(call, port_of(switch_called(switchName), port), mac::ethernet_filter, require(filter));
  });
}

QEX_ReturnStatus VSDVS_ClearExtraEthFilter(char const *switchName, char const *port) {
  return changing(__func__, [&](ChangingCall &call) {
    clear(call, port_of(switch_called(switchName), port), mac::ethernet_filter);
  });
}

QEX_ReturnStatus VSDVS_IsSinkPortEnabled(char const *switchName, char const *port,
                                         qex_Bool *enabled) {
  return reading(__func__, [&](ReadingCall &call) {
    auto const filter = get(call, port_of(switch_called(switchName), port), mac::ethernet_filter);
    require(enabled) = static_cast<qex_Bool>((filter.flags & QEX_ETH_FILTER_SINK) != 0);
  });
}

QEX_ReturnStatus VSDVS_ConfigureSinkPort(char const *switchName, char const *port,
                                         qex_Bool enabled) {
  return changing(__func__, [&](ChangingCall &call) {
    auto const target = port_of(switch_called(switchName), port);
    auto &transaction = call.transaction();
    auto const owner = owner_of(transaction, target);
    auto filter = effective(transaction, mac::ethernet_filter, owner);
    auto const others = filter.flags & ~qex_uint32{QEX_ETH_FILTER_SINK};
    filter.flags = enabled != 0 ? others | QEX_ETH_FILTER_SINK : others;
    set(transaction, mac::ethernet_filter, owner, filter);
  });
}

QEX_ReturnStatus VSDVS_GetMcastFilterMode(char const *switchName, int *mode) {
  return reading(__func__, [&](ReadingCall &call) {
    require(mode) = static_cast<int>(get(call, switch_called(switchName), multicast::filter_mode));
  });
}

QEX_ReturnStatus VSDVS_SetMcastFilterMode(char const *switchName, VSMcastFilterMode mode) {
  return changing(__func__, [&](ChangingCall &call) {
    set(call, switch_called(switchName), multicast::filter_mode, static_cast<qex_uint32>(mode));
  });
}

}  // extern "C"
}  // namespace simhost
