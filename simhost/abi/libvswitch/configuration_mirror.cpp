// VSDVS_*: the mirror sessions of ports.
#include "abi/targets.h"
#include "model/mirror/sessions.h"
#include "vswitch/configuration.h"

namespace simhost {
extern "C" {

QEX_ReturnStatus VSDVS_GetDVMirrorSessions(char const *switchName, char const *port,
                                           DVMirrorSessionTable **table) {
  return reading(__func__, [&](ReadingCall &call) {
    auto const target = port_of(switch_called(switchName), port);
    auto &output = require(table);
    auto &transaction = call.transaction();
    auto const bytes =
        effective_bytes(transaction, mirror::sessions, owner_of(transaction, target));
    output = allocate<DVMirrorSessionTable>(call, bytes);
  });
}

QEX_ReturnStatus VSDVS_AppendDVMirrorSessions(char const *switchName, char const *port,
                                              DVMirrorSessionTable *table) {
  return changing(__func__, [&](ChangingCall &call) {
    auto const target = port_of(switch_called(switchName), port);
    auto const bytes = mirror::table_bytes(require(table));
    auto &transaction = call.transaction();
    mirror::append_sessions(transaction, get_target(transaction, target), bytes);
  });
}

QEX_ReturnStatus VSDVS_RemoveDVMirrorSession(char const *switchName, char const *port,
                                             char const sid[32]) {
  return changing(__func__, [&](ChangingCall &call) {
    auto const target = port_of(switch_called(switchName), port);
    auto const name = require_text(sid);
    auto &transaction = call.transaction();
    mirror::remove_session(transaction, get_target(transaction, target), name);
  });
}

QEX_ReturnStatus VSDVS_ClearDVMirrorSessions(char const *switchName, char const *port) {
  return changing(__func__, [&](ChangingCall &call) {
    clear(call, port_of(switch_called(switchName), port), mirror::sessions);
  });
}

}  // extern "C"
}  // namespace simhost
