// VSQEX_*: MAC tables and MAC learning.
#include "core/data_plane.h"
#include "core/host_settings.h"
#include "core/known.h"
#include "libvswitch/results.h"
#include "vswitch/queries.h"

using simhost::answer;
using simhost::Call;
using simhost::data_plane;
using simhost::Place;
using simhost::required;
using simhost::required_text;
using simhost::store::Transaction;

namespace {

VSMACAddrType checked(VSMACAddrType type) {
  if (static_cast<unsigned>(type) > VS_MAC_ADDR_TYPE_ALL) {
    simhost::refuse(QEX_BAD_PARAM);
  }
  return type;
}

Place team(Transaction &work, std::string_view alias) {
  return {.switch_key = simhost::running_switch(work, alias).key, .port = std::nullopt};
}

Place port_of(Transaction &work, std::string_view alias, std::string_view identifier) {
  auto const key = simhost::running_switch(work, alias).key;
  return {.switch_key = key, .port = simhost::known_port(work, key, identifier).number};
}

// Lets `change` work with an entry on the table of a port.
template <typename Change>
void change_table(Call &call, char const *switch_name, char const *port, VSMACEntry const *entry,
                  Change const &change) {
  auto const alias = required_text(switch_name);
  auto const identifier = required_text(port);
  auto const &wanted = required(entry);
  auto &work = call.changing();
  change(work, port_of(work, alias, identifier), wanted);
}

}  // namespace

extern "C" {

QEX_ReturnStatus VSQEX_GetTeamMACTable(char const *switchName, VSMACAddrType type,
                                       VSMACTable **table) {
  return answer(__func__, [&](Call &call) {
    auto const alias = required_text(switchName);
    auto &output = required(table);
    auto const wanted = checked(type);
    auto &work = call.reading();
    auto const entries = data_plane().addresses(work, team(work, alias), wanted);
    output = simhost::give_list<VSMACTable>(call, entries);
  });
}

QEX_ReturnStatus VSQEX_GetPortMACTable(char const *switchName, char const *port, VSMACAddrType type,
                                       VSMACTable **table) {
  return answer(__func__, [&](Call &call) {
    auto const alias = required_text(switchName);
    auto const identifier = required_text(port);
    auto &output = required(table);
    auto const wanted = checked(type);
    auto &work = call.reading();
    auto const entries = data_plane().addresses(work, port_of(work, alias, identifier), wanted);
    output = simhost::give_list<VSMACTable>(call, entries);
  });
}

QEX_ReturnStatus VSQEX_SetPortMACTable(char const *switchName, char const *port,
                                       VSMACEntry const *entry) {
  return answer(__func__, [&](Call &call) {
    change_table(call, switchName, port, entry,
                 [](Transaction &work, Place const &place, VSMACEntry const &wanted) {
                   data_plane().put_address(work, place, wanted);
                 });
  });
}

QEX_ReturnStatus VSQEX_ClearPortMACTable(char const *switchName, char const *port,
                                         VSMACEntry const *entry) {
  return answer(__func__, [&](Call &call) {
    change_table(call, switchName, port, entry,
                 [](Transaction &work, Place const &place, VSMACEntry const &wanted) {
                   data_plane().remove_address(work, place, wanted);
                 });
  });
}

QEX_ReturnStatus VSQEX_GetPortMACLearningStats(char const *switchName, char const *port,
                                               VSPMACLearningStats *stats) {
  return answer(__func__, [&](Call &call) {
    auto const alias = required_text(switchName);
    auto const identifier = required_text(port);
    auto &output = required(stats);
    auto &work = call.reading();
    output = data_plane().learning_stats(work, port_of(work, alias, identifier));
  });
}

QEX_ReturnStatus VSQEX_GetGlobalMACLearningProps(VSMACLearningGlobalProps *props) {
  return answer(__func__, [&](Call &call) {
    auto &output = required(props);
    output = simhost::global_mac_learning(call.reading());
  });
}

QEX_ReturnStatus VSQEX_SetGlobalMACLearningProps(VSMACLearningGlobalProps *props) {
  return answer(__func__, [&](Call &call) {
    auto const &wanted = required(props);
    simhost::set_global_mac_learning(call.changing(), wanted);
  });
}

}  // extern "C"
