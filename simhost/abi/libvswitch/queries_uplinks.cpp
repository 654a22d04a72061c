// VSQEX_*: links, link aggregation, teaming, and what a team counts.
#include <cstring>

#include "abi/libvswitch/results.h"
#include "model/lookup.h"
#include "model/plane.h"
#include "model/uplinks/lags.h"
#include "vswitch/queries.h"

namespace simhost {
namespace {

// Stores what `ask` returns of an uplink of a switch as a link state.
template <typename Ask>
void link_state(ReadingCall &call, char const *switch_name, char const *uplink, int *state,
                Ask const &ask) {
  auto const alias = require_text(switch_name);
  auto const name = require_text(uplink);
  auto &output = require(state);
  auto &transaction = call.transaction();
  auto const key = get_running_switch(transaction, alias).key;
  bool const up = ask(transaction, get_uplink(transaction, key, name).name);
  output = up ? QEX_LINK_STATE_UP : QEX_LINK_STATE_DOWN;
}

Counters switch_counters(ReadingCall &call, char const *switch_name) {
  auto const alias = require_text(switch_name);
  auto &transaction = call.transaction();
  return running_plane().counters(transaction,
                                  {.switch_key = get_running_switch(transaction, alias).key});
}

std::size_t size_of(Lag const &lag) {
  return sizeof(VSLAGStatus) + (lag.members.size() * sizeof(qex_Name));
}

// Writes a group and the names of its uplinks; returns where the next one begins.
std::byte *write_lag(std::byte *at, Lag const &lag) {
  VSLAGStatus status{};
  status.state = lag.up() ? QEX_LINK_STATE_UP : QEX_LINK_STATE_DOWN;
  status.id = lag.id;
  std::memcpy(status.name, lag.name.data(), lag.name.size());
  status.numUplinks = static_cast<qex_uint32>(lag.members.size());
  auto *name = at + sizeof status;
  for (std::size_t number = 0; number < lag.members.size(); ++number) {
    auto const &member = lag.members[number];
    status.uplinkLinkupBitmap |= qex_uint64{member.up} << number;
    auto const written = name_of(member.uplink);
    std::memcpy(name, &written, sizeof written);
    name += sizeof written;
  }
  std::memcpy(at, &status, sizeof status);
  return name;
}

}  // namespace

extern "C" {

QEX_ReturnStatus VSQEX_GetUplinkLinkState(char const *switchName, char const *uplink, int *state) {
  return reading(__func__, [&](ReadingCall &call) {
    link_state(call, switchName, uplink, state, [](auto &transaction, auto const &name) {
      return running_plane().link_is_up(transaction, name);
    });
  });
}

QEX_ReturnStatus VSQEX_GetUplinkLACPLinkState(char const *switchName, char const *uplink,
                                              int *state) {
  return reading(__func__, [&](ReadingCall &call) {
    link_state(call, switchName, uplink, state, [](auto &transaction, auto const &name) {
      return running_plane().lacp_is_up(transaction, name);
    });
  });
}

QEX_ReturnStatus VSQEX_SetUplinkAdminLinkState(char const *switchName, char const *uplink,
                                               qex_LinkState state) {
  return changing(__func__, [&](ChangingCall &call) {
    auto const alias = require_text(switchName);
    auto const name = require_text(uplink);
    if (state != QEX_LINK_STATE_UP && state != QEX_LINK_STATE_DOWN) {
      refuse(QEX_BAD_PARAM);
    }
    auto &transaction = call.transaction();
    auto const key = get_running_switch(transaction, alias).key;
    auto const known = get_uplink(transaction, key, name);
    running_plane().set_admin_state(transaction, known.name, state == QEX_LINK_STATE_UP);
  });
}

QEX_ReturnStatus VSQEX_GetLAGTable(char const *switchName, VSLAGTable **table) {
  return reading(__func__, [&](ReadingCall &call) {
    auto const alias = require_text(switchName);
    auto &output = require(table);
    auto &transaction = call.transaction();
    auto const lags = lags_of(transaction, get_running_switch(transaction, alias).key);
    std::size_t trailing = 0;
    for (auto const &lag : lags) {
      trailing += size_of(lag);
    }
    auto *const record = allocate_record<VSLAGTable>(call, trailing);
    record->numLAGs = static_cast<qex_uint32>(lags.size());
    auto *at = reinterpret_cast<std::byte *>(record + 1);
    for (auto const &lag : lags) {
      at = write_lag(at, lag);
    }
    output = record;
  });
}

QEX_ReturnStatus VSQEX_PortGetTeamUplinkHint(qex_SwitchPortID port, qex_Name *name) {
  return reading(__func__, [&](ReadingCall &call) {
    auto &output = require(name);
    auto &transaction = call.transaction();
    auto const known = get_running_port(transaction, storage::PortNumber{port});
    output = name_of(running_plane().team_uplink(transaction, known));
  });
}

QEX_ReturnStatus VSQEX_GetRARPStats(char const *switchName, VSRARPStats *stats) {
  return reading(__func__, [&](ReadingCall &call) {
    auto &output = require(stats);
    show(switch_counters(call, switchName), output);
  });
}

QEX_ReturnStatus VSQEX_GetServicePortTeamingStats(char const *switchName,
                                                  VSServicePortTeamingStats *stats) {
  return reading(__func__, [&](ReadingCall &call) {
    auto &output = require(stats);
    show(switch_counters(call, switchName), output);
  });
}

}  // extern "C"
}  // namespace simhost
