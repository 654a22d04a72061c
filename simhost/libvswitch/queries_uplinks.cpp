// VSQEX_*: links, link aggregation, teaming, and what a team counts.
#include <cstring>

#include "core/data_plane.h"
#include "core/known.h"
#include "libvswitch/results.h"
#include "vswitch/queries.h"

using simhost::answer;
using simhost::Call;
using simhost::data_plane;
using simhost::required;
using simhost::required_text;

namespace {

// Answers `ask` about an uplink of a switch as a link state.
template <typename Ask>
void link_state(Call &call, char const *switch_name, char const *uplink, int *state,
                Ask const &ask) {
  auto const alias = required_text(switch_name);
  auto const name = required_text(uplink);
  auto &output = required(state);
  auto &work = call.reading();
  auto const key = simhost::running_switch(work, alias).key;
  bool const up = ask(work, simhost::known_uplink(work, key, name).name);
  output = up ? QEX_LINK_STATE_UP : QEX_LINK_STATE_DOWN;
}

simhost::Counters switch_counters(Call &call, char const *switch_name) {
  auto const alias = required_text(switch_name);
  auto &work = call.reading();
  return data_plane().counters(work, {.switch_key = simhost::running_switch(work, alias).key});
}

std::size_t size_of(simhost::Lag const &lag) {
  return sizeof(VSLAGStatus) + (lag.members.size() * sizeof(qex_Name));
}

// Writes a group and the names of its uplinks; returns what comes behind them.
std::byte *write_lag(std::byte *at, simhost::Lag const &lag) {
  VSLAGStatus status{};
  status.state = lag.up() ? QEX_LINK_STATE_UP : QEX_LINK_STATE_DOWN;
  status.id = lag.id;
  std::memcpy(status.name, lag.name.data(), lag.name.size());
  status.numUplinks = static_cast<qex_uint32>(lag.members.size());
  auto *name = at + sizeof status;
  for (std::size_t number = 0; number < lag.members.size(); ++number) {
    auto const &member = lag.members[number];
    status.uplinkLinkupBitmap |= qex_uint64{member.up} << number;
    auto const written = simhost::name_of(member.uplink);
    std::memcpy(name, &written, sizeof written);
    name += sizeof written;
  }
  std::memcpy(at, &status, sizeof status);
  return name;
}

}  // namespace

extern "C" {

QEX_ReturnStatus VSQEX_GetUplinkLinkState(char const *switchName, char const *uplink, int *state) {
  return answer(__func__, [&](Call &call) {
    link_state(call, switchName, uplink, state,
               [](auto &work, auto const &name) { return data_plane().link_is_up(work, name); });
  });
}

QEX_ReturnStatus VSQEX_GetUplinkLACPLinkState(char const *switchName, char const *uplink,
                                              int *state) {
  return answer(__func__, [&](Call &call) {
    link_state(call, switchName, uplink, state,
               [](auto &work, auto const &name) { return data_plane().lacp_is_up(work, name); });
  });
}

QEX_ReturnStatus VSQEX_SetUplinkAdminLinkState(char const *switchName, char const *uplink,
                                               qex_LinkState state) {
  return answer(__func__, [&](Call &call) {
    auto const alias = required_text(switchName);
    auto const name = required_text(uplink);
    if (state != QEX_LINK_STATE_UP && state != QEX_LINK_STATE_DOWN) {
      simhost::refuse(QEX_BAD_PARAM);
    }
    auto &work = call.changing();
    auto const key = simhost::running_switch(work, alias).key;
    auto const known = simhost::known_uplink(work, key, name);
    data_plane().set_admin_state(work, known.name, state == QEX_LINK_STATE_UP);
  });
}

QEX_ReturnStatus VSQEX_GetLAGTable(char const *switchName, VSLAGTable **table) {
  return answer(__func__, [&](Call &call) {
    auto const alias = required_text(switchName);
    auto &output = required(table);
    auto &work = call.reading();
    auto const lags = data_plane().lags(work, simhost::running_switch(work, alias).key);
    std::size_t trailing = 0;
    for (auto const &lag : lags) {
      trailing += size_of(lag);
    }
    auto *const record = simhost::give_record<VSLAGTable>(call, trailing);
    record->numLAGs = static_cast<qex_uint32>(lags.size());
    auto *at = reinterpret_cast<std::byte *>(record + 1);
    for (auto const &lag : lags) {
      at = write_lag(at, lag);
    }
    output = record;
  });
}

QEX_ReturnStatus VSQEX_PortGetTeamUplinkHint(qex_SwitchPortID port, qex_Name *name) {
  return answer(__func__, [&](Call &call) {
    auto &output = required(name);
    auto &work = call.reading();
    auto const known = simhost::running_port(work, simhost::store::PortNumber{port});
    output = simhost::name_of(data_plane().team_uplink(work, known));
  });
}

QEX_ReturnStatus VSQEX_GetRARPStats(char const *switchName, VSRARPStats *stats) {
  return answer(__func__, [&](Call &call) {
    auto &output = required(stats);
    auto counters = switch_counters(call, switchName);
    output.rarpPktsSent = static_cast<qex_uint32>(counters["rarpPktsSent"]);
    output.maxRARPTime = static_cast<qex_uint32>(counters["maxRARPTime"]);
    output.rarpTime = counters["rarpTime"];
  });
}

QEX_ReturnStatus VSQEX_GetServicePortTeamingStats(char const *switchName,
                                                  VSServicePortTeamingStats *stats) {
  return answer(__func__, [&](Call &call) {
    auto &output = required(stats);
    auto counters = switch_counters(call, switchName);
    output.txFromSrvPort = counters["txFromSrvPort"];
    output.txUsingSrvPortFRP = counters["txUsingSrvPortFRP"];
    output.txUsingPktSrcPortFRP = counters["txUsingPktSrcPortFRP"];
    output.txErrors = counters["txErrors"];
    output.rxToSrvPort = counters["rxToSrvPort"];
    output.rxRpfOverride = counters["rxRpfOverride"];
  });
}

}  // extern "C"
