// VSQEX_*: asking the running switches.
#include "vswitch/queries.h"

#include "core/boundary.h"
#include "core/ledger.h"
#include "core/switches.h"

using simhost::answer;
using simhost::Call;
using simhost::required;
using simhost::required_text;

extern "C" {

QEX_ReturnStatus VSQEX_GetVSInfo(char const *switchName, VSInfo *info) {
  return answer(__func__, [&](Call &call) {
    auto const alias = required_text(switchName);
    required(info) = simhost::switch_info(call.reading(), alias);
  });
}

void VSQEX_FreeMemory(void *memory) {
  simhost::run(__func__, [&](Call &call) { call.ledger().take_back(memory, call.name()); });
}

}  // extern "C"
