// VSQEX_*: mirror sessions as they run.
#include <algorithm>
#include <array>
#include <cstring>
#include <string>
#include <vector>

#include "abi/libvswitch/results.h"
#include "model/lookup.h"
#include "model/mirror/running.h"
#include "model/options/runtime_options.h"
#include "model/plane.h"
#include "vswitch/queries.h"

namespace simhost {
namespace {

using Sid = std::array<char, sizeof(DVMirrorSID)>;

Sid sid_of(MirrorSession const &session) {
  Sid sid{};
  session.sid().copy(sid.data(), sid.size());
  return sid;
}

}  // namespace

extern "C" {

QEX_ReturnStatus VSQEX_GetDVMirrorSessionIDs(char const *switchName, VSDVMirrorSessionIDs **ids) {
  return reading(__func__, [&](ReadingCall &call) {
    auto const alias = require_text(switchName);
    auto &output = require(ids);
    auto &transaction = call.transaction();
    auto const key = get_running_switch(transaction, alias).key;
    std::vector<Sid> running;
    for (auto const &session : mirrors_of(transaction, key)) {
      auto const sid = sid_of(session);
      if (session.runs() && std::find(running.begin(), running.end(), sid) == running.end()) {
        running.push_back(sid);
      }
    }
    output = allocate_list<VSDVMirrorSessionIDs>(call, running);
  });
}

QEX_ReturnStatus VSQEX_GetDVMirrorSessionStats(char const *switchName, char const sid[32],
                                               VSDVMirrorSessionStats *stats) {
  return reading(__func__, [&](ReadingCall &call) {
    auto const alias = require_text(switchName);
    auto const *const first = &require(sid);
    std::string const wanted(first, strnlen(first, sizeof(DVMirrorSID)));
    auto &output = require(stats);
    auto &transaction = call.transaction();
    auto const key = get_running_switch(transaction, alias).key;
    auto sessions = mirrors_of(transaction, key);
    std::erase_if(sessions, [&](auto const &session) { return session.sid() != wanted; });
    if (sessions.empty()) {
      refuse(QEX_NOT_FOUND);
    }
    // Two ports may have a session of that name, one of them a disabled one.
    auto const found = std::find_if(sessions.begin(), sessions.end(),
                                    [](auto const &session) { return session.runs(); });
    if (found == sessions.end() || runtime_number(transaction, VS_RT_OPT_ALLOW_MIRROR_STATS) == 0) {
      refuse(QEX_IS_DISABLED);
    }
    auto const counters =
        running_plane().counters(transaction, {.switch_key = key, .session = wanted});
    show(counters, output);
    static_assert(sizeof output.name == sizeof found->record.dname);
    std::memcpy(output.name, found->record.dname, sizeof output.name);
  });
}

QEX_ReturnStatus VSQEX_GetPromiscSessionActiveDsts(char const *switchName,
                                                   VSPromiscSessionActiveDsts **ports) {
  return reading(__func__, [&](ReadingCall &call) {
    auto const alias = require_text(switchName);
    auto &output = require(ports);
    auto &transaction = call.transaction();
    auto const active = promiscuous_ports(transaction, get_running_switch(transaction, alias).key);
    output = allocate_list<VSPromiscSessionActiveDsts>(call, active);
  });
}

}  // extern "C"
}  // namespace simhost
