// VSDVS_*: MAC learning, and which frames ports send and take.
#include "abi/targets.h"
#include "vswitch/configuration.h"
#include "vswitch/properties.h"

using simhost::changing;
using simhost::ChangingCall;
using simhost::port_of;
using simhost::reading;
using simhost::ReadingCall;
using simhost::RecordProperty;
using simhost::require;
using simhost::switch_called;

namespace {

constexpr RecordProperty<VSMACLearning> kLearning{
    .key = VSPROP_SWITCH_MAC_LEARNING,
    .unset = {.agingTime = VS_MAC_LEARNING_AGING_TIME_DEFAULT,
              .learnStatic = VS_MAC_LEARNING_LEARN_STATIC_DEFAULT,
              .reserved = 0,
              .macLimit = VS_MAC_LEARNING_LIMIT_ENTRIES_DEFAULT}};
constexpr RecordProperty<VSPMACManagement> kManagement{
    .key = VSPROP_PORT_MAC_MANAGEMENT,
    .unset = {.macChangeAllowed = 0,
              .portMACLearning = {.learning = 0,
                                  .flooding = 0,
                                  .macLimit = VSPORT_MAC_LEARNING_LIMIT_ENTRIES_DEFAULT,
                                  .macLimitPolicy = VSPORT_MAC_LEARNING_LIMIT_POLICY_ALLOW}}};
constexpr RecordProperty<VSPropSecurity> kSecurity{.key = VSPROP_PORT_SECURITY, .unset = {}};
constexpr RecordProperty<VSExtraEthFilter> kFilter{.key = VSPROP_PORT_EXTRA_ETH_FRP, .unset = {}};
constexpr RecordProperty<qex_uint32> kFilterMode{.key = VSPROP_MULTICAST_FILTER,
                                                 .unset = VS_MCAST_FILTER_MODE_LEGACY};

}  // namespace

extern "C" {

QEX_ReturnStatus VSDVS_GetMACLearning(char const *switchName, VSMACLearning *learning) {
  return reading(__func__, [&](ReadingCall &call) {
    require(learning) = simhost::read(call, switch_called(switchName), kLearning);
  });
}

QEX_ReturnStatus VSDVS_SetMACLearning(char const *switchName, VSMACLearning const *learning) {
  return changing(__func__, [&](ChangingCall &call) {
    simhost::write(call, switch_called(switchName), kLearning, require(learning));
  });
}

QEX_ReturnStatus VSDVS_ClearMACLearning(char const *switchName) {
  return changing(__func__, [&](ChangingCall &call) {
    simhost::reset(call, switch_called(switchName), VSPROP_SWITCH_MAC_LEARNING);
  });
}

QEX_ReturnStatus VSDVS_GetPortMACLearning(char const *switchName, char const *port,
                                          VSPMACLearning *learning) {
  return reading(__func__, [&](ReadingCall &call) {
    auto const management =
        simhost::read(call, port_of(switch_called(switchName), port), kManagement);
    require(learning) = management.portMACLearning;
  });
}

QEX_ReturnStatus VSDVS_SetPortMACLearning(char const *switchName, char const *port,
                                          VSPMACLearning const *learning) {
  return changing(__func__, [&](ChangingCall &call) {
    auto const target = port_of(switch_called(switchName), port);
    auto const &wanted = require(learning);
    auto &transaction = call.transaction();
    auto const owner = simhost::owner_of(transaction, target);
    auto management = simhost::read(transaction, owner, kManagement);
    management.portMACLearning = wanted;
    simhost::write(transaction, owner, kManagement, management);
  });
}

QEX_ReturnStatus VSDVS_GetPortSecurity(char const *switchName, char const *port,
                                       VSPropSecurity *security) {
  return reading(__func__, [&](ReadingCall &call) {
    require(security) = simhost::read(call, port_of(switch_called(switchName), port), kSecurity);
  });
}

QEX_ReturnStatus VSDVS_SetPortSecurity(char const *switchName, char const *port,
                                       VSPropSecurity const *security) {
  return changing(__func__, [&](ChangingCall &call) {
    simhost::write(call, port_of(switch_called(switchName), port), kSecurity, require(security));
  });
}

QEX_ReturnStatus VSDVS_GetExtraEthFilter(char const *switchName, char const *port,
                                         VSExtraEthFilter *filter) {
  return reading(__func__, [&](ReadingCall &call) {
    require(filter) = simhost::read(call, port_of(switch_called(switchName), port), kFilter);
  });
}

QEX_ReturnStatus VSDVS_SetExtraEthFilter(char const *switchName, char const *port,
                                         VSExtraEthFilter const *filter) {
  return changing(__func__, [&](ChangingCall &call) {
    simhost::write(call, port_of(switch_called(switchName), port), kFilter, require(filter));
  });
}

QEX_ReturnStatus VSDVS_ClearExtraEthFilter(char const *switchName, char const *port) {
  return changing(__func__, [&](ChangingCall &call) {
    simhost::reset(call, port_of(switch_called(switchName), port), VSPROP_PORT_EXTRA_ETH_FRP);
  });
}

QEX_ReturnStatus VSDVS_IsSinkPortEnabled(char const *switchName, char const *port,
                                         qex_Bool *enabled) {
  return reading(__func__, [&](ReadingCall &call) {
    auto const filter = simhost::read(call, port_of(switch_called(switchName), port), kFilter);
    require(enabled) = static_cast<qex_Bool>((filter.flags & QEX_ETH_FILTER_SINK) != 0);
  });
}

QEX_ReturnStatus VSDVS_ConfigureSinkPort(char const *switchName, char const *port,
                                         qex_Bool enabled) {
  return changing(__func__, [&](ChangingCall &call) {
    auto const target = port_of(switch_called(switchName), port);
    auto &transaction = call.transaction();
    auto const owner = simhost::owner_of(transaction, target);
    auto filter = simhost::read(transaction, owner, kFilter);
    auto const others = filter.flags & ~qex_uint32{QEX_ETH_FILTER_SINK};
    filter.flags = enabled != 0 ? others | QEX_ETH_FILTER_SINK : others;
    simhost::write(transaction, owner, kFilter, filter);
  });
}

QEX_ReturnStatus VSDVS_GetMcastFilterMode(char const *switchName, int *mode) {
  return reading(__func__, [&](ReadingCall &call) {
    require(mode) = static_cast<int>(simhost::read(call, switch_called(switchName), kFilterMode));
  });
}

QEX_ReturnStatus VSDVS_SetMcastFilterMode(char const *switchName, VSMcastFilterMode mode) {
  return changing(__func__, [&](ChangingCall &call) {
    simhost::write(call, switch_called(switchName), kFilterMode, static_cast<qex_uint32>(mode));
  });
}

}  // extern "C"
