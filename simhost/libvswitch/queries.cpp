// VSQEX_*: asking the running switches about themselves, and giving back what they answered with.
#include "vswitch/queries.h"

#include <algorithm>
#include <vector>

#include "core/known.h"
#include "core/switches.h"
#include "libvswitch/results.h"

using simhost::answer;
using simhost::Call;
using simhost::required;
using simhost::required_text;

namespace {

VSUplinks_entries entry_of(simhost::store::AttachedUplink const &uplink) {
  VSUplinks_entries entry{};
  entry.name = simhost::name_of(uplink.name);
  entry.portID = static_cast<qex_SwitchPortID>(uplink.port);
  return entry;
}

}  // namespace

extern "C" {

QEX_ReturnStatus VSQEX_GetVSInfo(char const *switchName, VSInfo *info) {
  return answer(__func__, [&](Call &call) {
    auto const alias = required_text(switchName);
    required(info) = simhost::switch_info(call.reading(), alias);
  });
}

QEX_ReturnStatus VSQEX_GetUplinks(char const *switchName, VSUplinks **uplinks) {
  return answer(__func__, [&](Call &call) {
    auto const alias = required_text(switchName);
    auto &output = required(uplinks);
    auto const attached = simhost::uplinks_of(call.reading(), alias);
    std::vector<VSUplinks_entries> entries(attached.size());
    std::transform(attached.begin(), attached.end(), entries.begin(), entry_of);
    output = simhost::give_list<VSUplinks>(call, entries);
  });
}

QEX_ReturnStatus VSQEX_GetUplinkDVPortID(char const *uplink, char *portBuffer) {
  return answer(__func__, [&](Call &call) {
    auto const name = required_text(uplink);
    auto *const output = &required(portBuffer);
    auto &state = call.reading();
    auto const found = simhost::known_uplink(state, name);
    if (!found.port) {
      simhost::refuse(QEX_IS_DISCONNECTED);
    }
    auto const identifier = simhost::known_port(state, *found.port).identifier;
    output[identifier.copy(output, 48)] = '\0';
  });
}

void VSQEX_FreeMemory(void *memory) {
  simhost::run(__func__, [&](Call &call) { call.ledger().take_back(memory, call.name()); });
}

}  // extern "C"
