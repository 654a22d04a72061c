// DVSQEX_*: the state as a whole, and memory that comes back.
#include "nebpublic/kernel_state.h"
#include "abi/boundary.h"
#include "abi/ledger.h"
#include "abi/libnebPublic/arguments.h"
#include "model/state/images.h"

using simhost::answer;
using simhost::Call;
using simhost::Extent;

namespace {

QEX_ReturnStatus hand_out_state(char const *name, Extent extent, void **state, int *length) {
  return answer(name, [&](Call &call) {
    auto const output = simhost::output_at(state, length);
    simhost::allocate_copy(call, output, simhost::state_image(call.reading(), extent));
  });
}

}  // namespace

extern "C" {

QEX_ReturnStatus DVSQEX_StateInit(void *state, int length) {
  return answer(__func__, [&](Call &call) {
    auto const image = simhost::argument_bytes(state, length);
    if (image.empty()) {
      simhost::clear_state(call.changing());
    } else {
      simhost::load_state(call.changing(), image, Extent::whole);
    }
  });
}

QEX_ReturnStatus DVSQEX_StateGet(void **state, int *length) {
  return hand_out_state(__func__, Extent::whole, state, length);
}

QEX_ReturnStatus DVSQEX_PersistentStateGet(void **state, int *length) {
  return hand_out_state(__func__, Extent::persistent, state, length);
}

QEX_ReturnStatus DVSQEX_StateSanitize(void) {
  return answer(__func__, [&](Call &call) { simhost::sanitize_state(call.changing()); });
}

QEX_ReturnStatus DVSQEX_StateCleanup(void) {
  return answer(__func__, [&](Call &call) { simhost::clear_state(call.changing()); });
}

void DVSQEX_DataFree(void *data) {
  simhost::run(__func__, [&](Call &call) { call.ledger().release(data, call.name()); });
}

}  // extern "C"
