// DVSQEX_*: the state as a whole, and memory that comes back.
#include "nebpublic/kernel_state.h"
#include "abi/boundary.h"
#include "abi/ledger.h"
#include "abi/libnebPublic/arguments.h"
#include "model/state/images.h"

namespace simhost {
namespace {

QEX_ReturnStatus return_state(char const *name, Extent extent, void **state, int *length) {
  return reading(name, [&](ReadingCall &call) {
    auto const output = output_at(state, length);
    allocate_copy(call, output, state_image(call.transaction(), extent));
  });
}

}  // namespace

extern "C" {

QEX_ReturnStatus DVSQEX_StateInit(void *state, int length) {
  return changing(__func__, [&](ChangingCall &call) {
    auto const image = argument_bytes(state, length);
    if (state == nullptr) {
      clear_state(call.transaction());
    } else {
      load_state(call.transaction(), image, Extent::whole);
    }
  });
}

QEX_ReturnStatus DVSQEX_StateGet(void **state, int *length) {
  return return_state(__func__, Extent::whole, state, length);
}

QEX_ReturnStatus DVSQEX_PersistentStateGet(void **state, int *length) {
  return return_state(__func__, Extent::persistent, state, length);
}

QEX_ReturnStatus DVSQEX_StateSanitize(void) {
  return changing(__func__, [&](ChangingCall &call) { sanitize_state(call.transaction()); });
}

QEX_ReturnStatus DVSQEX_StateCleanup(void) {
  return changing(__func__, [&](ChangingCall &call) { clear_state(call.transaction()); });
}

void DVSQEX_DataFree(void *data) {
  stateless_or_trap(__func__, [&](Call &call) { call.ledger().release(data, call.name()); });
}

}  // extern "C"
}  // namespace simhost
