// VSDVS_*: configuring the switches.
#include "vswitch/configuration.h"

#include "core/boundary.h"
#include "core/ledger.h"
#include "core/switches.h"

using simhost::answer;
using simhost::Call;
using simhost::optional_text;
using simhost::required;
using simhost::required_text;

extern "C" {

QEX_ReturnStatus VSDVS_CreateVSwitch(char const *alias, char const *switchId,
                                     char const *portsetName, qex_uint32 maxPorts,
                                     qex_Bool persistent, qex_uint32 version, qex_uint32 mtu,
                                     qex_uint32 uplinkCount) {
  return answer(__func__, [&](Call &call) {
    simhost::SwitchSpec const spec{.alias = required_text(alias),
                                   .identifier = optional_text(switchId),
                                   .portset = optional_text(portsetName),
                                   .max_ports = maxPorts,
                                   .persistent = persistent != 0,
                                   .version = version,
                                   .mtu = mtu,
                                   .uplink_count = uplinkCount};
    simhost::create_switch(call.changing(), spec);
  });
}

QEX_ReturnStatus VSDVS_DestroyVSwitch(char const *switchName) {
  return answer(__func__, [&](Call &call) {
    auto const alias = required_text(switchName);
    simhost::destroy_switch(call.changing(), alias);
  });
}

QEX_ReturnStatus VSDVS_GetMTU(char const *switchName, qex_uint32 *mtu) {
  return answer(__func__, [&](Call &call) {
    auto const alias = required_text(switchName);
    required(mtu) = simhost::mtu_of(call.reading(), alias);
  });
}

QEX_ReturnStatus VSDVS_SetMTU(char const *switchName, qex_uint32 mtu) {
  return answer(__func__, [&](Call &call) {
    auto const alias = required_text(switchName);
    simhost::set_mtu(call.changing(), alias, mtu);
  });
}

void VSDVS_FreeMemory(void *memory) {
  simhost::run(__func__, [&](Call &call) { call.ledger().take_back(memory, call.name()); });
}

}  // extern "C"
