// From the outcome of a call to memory that a jump may leave behind.
#include "abi/boundary.h"

#include "abi/outcome.h"

namespace simhost {

void end_call(Ending &ending, char const *call) noexcept {
  auto const outcome = current_outcome();
  ending.status = outcome.status;
  ending.traps = outcome.traps;
  describe(ending.report, outcome.kind, outcome.text == TrapText::verbatim ? "" : call,
           outcome.reason);
  ending.report.type = outcome.type;
}

}  // namespace simhost
