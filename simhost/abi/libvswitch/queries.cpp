// VSQEX_*: asking the running switches about themselves, and releasing what they returned.
#include "vswitch/queries.h"

#include <algorithm>
#include <vector>

#include "abi/libvswitch/results.h"
#include "model/lookup.h"
#include "model/switches/switches.h"

namespace simhost {
namespace {

VSUplinks_entries entry_of(storage::AttachedUplink const &uplink) {
  VSUplinks_entries entry{};
  entry.name = name_of(uplink.name);
  entry.portID = static_cast<qex_SwitchPortID>(uplink.port);
  return entry;
}

}  // namespace

extern "C" {

QEX_ReturnStatus VSQEX_GetVSInfo(char const *switchName, VSInfo *info) {
  return reading(__func__, [&](ReadingCall &call) {
    auto const alias = require_text(switchName);
    require(info) = switch_info(call.transaction(), alias);
  });
}

QEX_ReturnStatus VSQEX_GetUplinks(char const *switchName, VSUplinks **uplinks) {
  return reading(__func__, [&](ReadingCall &call) {
    auto const alias = require_text(switchName);
    auto &output = require(uplinks);
    auto const attached = uplinks_of(call.transaction(), alias);
    std::vector<VSUplinks_entries> entries(attached.size());
    std::transform(attached.begin(), attached.end(), entries.begin(), entry_of);
    output = allocate_list<VSUplinks>(call, entries);
  });
}

QEX_ReturnStatus VSQEX_GetUplinkDVPortID(char const *uplink, char *portBuffer) {
  return reading(__func__, [&](ReadingCall &call) {
    auto const name = require_text(uplink);
    auto *const output = &require(portBuffer);
    auto &state = call.transaction();
    auto const found = get_uplink(state, name);
    if (!found.port) {
      refuse(QEX_IS_DISCONNECTED);
    }
    auto const identifier = get_port(state, *found.port).identifier;
    output[identifier.copy(output, 48)] = '\0';
  });
}

void VSQEX_FreeMemory(void *memory) {
  stateless_or_trap(__func__, [&](Call &call) { call.ledger().release(memory, call.name()); });
}

}  // extern "C"
}  // namespace simhost
