// VSQEX_*: asking the running switches.
#include "vswitch/queries.h"

#include <algorithm>

#include "core/boundary.h"
#include "core/ledger.h"
#include "core/switches.h"

using simhost::answer;
using simhost::Call;
using simhost::required;
using simhost::required_text;

namespace {

VSUplinks_entries entry_of(simhost::store::AttachedUplink const &uplink) {
  VSUplinks_entries entry{};
  uplink.name.copy(entry.name.string, sizeof entry.name.string - 1);
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
    auto const size = sizeof(VSUplinks) + (attached.size() * sizeof(VSUplinks_entries));
    auto *const record = static_cast<VSUplinks *>(call.ledger().give_out(size, call.name()));
    record->totalEntries = static_cast<qex_uint32>(attached.size());
    record->numEntries = record->totalEntries;
    std::transform(attached.begin(), attached.end(), record->entries, entry_of);
    output = record;
  });
}

void VSQEX_FreeMemory(void *memory) {
  simhost::run(__func__, [&](Call &call) { call.ledger().take_back(memory, call.name()); });
}

}  // extern "C"
