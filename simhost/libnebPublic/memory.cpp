// The state library's own door for memory that comes back.
#include "core/boundary.h"
#include "core/ledger.h"
#include "nebpublic/kernel_state.h"

extern "C" {

void DVSQEX_DataFree(void *data) {
  simhost::run(__func__, [&](simhost::Call &call) { call.ledger().take_back(data, call.name()); });
}

}  // extern "C"
