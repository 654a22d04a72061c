// VSDVS_*: the mirror sessions of ports.
#include "abi/targets.h"
#include "model/mirror/sessions.h"
#include "vswitch/configuration.h"

using simhost::changing;
using simhost::ChangingCall;
using simhost::port_of;
using simhost::reading;
using simhost::ReadingCall;
using simhost::require;
using simhost::require_text;
using simhost::switch_called;

extern "C" {

QEX_ReturnStatus VSDVS_GetDVMirrorSessions(char const *switchName, char const *port,
                                           DVMirrorSessionTable **table) {
  return reading(__func__, [&](ReadingCall &call) {
    auto const target = port_of(switch_called(switchName), port);
    auto &output = require(table);
    auto &transaction = call.transaction();
    auto const bytes = simhost::effective_bytes(transaction, simhost::mirror::sessions,
                                                simhost::owner_of(transaction, target));
    output = simhost::allocate<DVMirrorSessionTable>(call, bytes);
  });
}

QEX_ReturnStatus VSDVS_AppendDVMirrorSessions(char const *switchName, char const *port,
                                              DVMirrorSessionTable *table) {
  return changing(__func__, [&](ChangingCall &call) {
    auto const target = port_of(switch_called(switchName), port);
    auto const bytes = simhost::mirror::table_bytes(require(table));
    auto &transaction = call.transaction();
    simhost::mirror::append_sessions(transaction, simhost::get_target(transaction, target), bytes);
  });
}

QEX_ReturnStatus VSDVS_RemoveDVMirrorSession(char const *switchName, char const *port,
                                             char const sid[32]) {
  return changing(__func__, [&](ChangingCall &call) {
    auto const target = port_of(switch_called(switchName), port);
    auto const name = require_text(sid);
    auto &transaction = call.transaction();
    simhost::mirror::remove_session(transaction, simhost::get_target(transaction, target), name);
  });
}

QEX_ReturnStatus VSDVS_ClearDVMirrorSessions(char const *switchName, char const *port) {
  return changing(__func__, [&](ChangingCall &call) {
    simhost::clear(call, port_of(switch_called(switchName), port), simhost::mirror::sessions);
  });
}

}  // extern "C"
