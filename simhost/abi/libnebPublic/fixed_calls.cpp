// The calls that model nothing: with sound arguments each returns the one status that
// simhost/fixed_calls.json names, whatever the state.
#include "abi/boundary.h"
#include "abi/targets.h"
#include "nebpublic/kernel_state.h"

namespace simhost {

// No switch here has commands of its own.
extern "C" QEX_ReturnStatus DVSQEX_CmdExec(char const *switchId, char const *command,
                                           void * /*input*/, int /*inputLength*/,
                                           void ** /*output*/, int * /*outputLength*/) {
  return reading(__func__, [&](ReadingCall &call) {
    auto const target = switch_identified(switchId);
    require_text(command);
    get_target(call.transaction(), target);
    refuse(QEX_NOT_SUPPORTED);
  });
}

}  // namespace simhost
