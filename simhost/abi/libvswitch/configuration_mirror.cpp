// VSDVS_*: the mirror sessions of ports.
#include "abi/targets.h"
#include "model/mirror/sessions.h"
#include "vswitch/configuration.h"
#include "vswitch/properties.h"

using simhost::answer;
using simhost::Call;
using simhost::port_of;
using simhost::require;
using simhost::require_text;
using simhost::switch_called;

extern "C" {

QEX_ReturnStatus VSDVS_GetDVMirrorSessions(char const *switchName, char const *port,
                                           DVMirrorSessionTable **table) {
  return answer(__func__, [&](Call &call) {
    auto const target = port_of(switch_called(switchName), port);
    auto &output = require(table);
    auto &transaction = call.reading();
    auto const bytes =
        simhost::mirror_sessions_of(transaction, simhost::found(transaction, target));
    output = simhost::allocate<DVMirrorSessionTable>(call, bytes);
  });
}

QEX_ReturnStatus VSDVS_AppendDVMirrorSessions(char const *switchName, char const *port,
                                              DVMirrorSessionTable *table) {
  return answer(__func__, [&](Call &call) {
    auto const target = port_of(switch_called(switchName), port);
    auto const bytes = simhost::mirror_table_bytes(require(table));
    auto &transaction = call.changing();
    simhost::append_mirror_sessions(transaction, simhost::found(transaction, target), bytes);
  });
}

QEX_ReturnStatus VSDVS_RemoveDVMirrorSession(char const *switchName, char const *port,
                                             char const sid[32]) {
  return answer(__func__, [&](Call &call) {
    auto const target = port_of(switch_called(switchName), port);
    auto const name = require_text(sid);
    auto &transaction = call.changing();
    simhost::remove_mirror_session(transaction, simhost::found(transaction, target), name);
  });
}

QEX_ReturnStatus VSDVS_ClearDVMirrorSessions(char const *switchName, char const *port) {
  return answer(__func__, [&](Call &call) {
    simhost::reset(call, port_of(switch_called(switchName), port), VSPROP_PORT_MIRROR_SESSIONS);
  });
}

}  // extern "C"
