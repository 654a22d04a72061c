// VSQEX_*: MAC tables and MAC learning.
#include "abi/libvswitch/results.h"
#include "model/lookup.h"
#include "model/options/host_settings.h"
#include "model/plane.h"
#include "vswitch/queries.h"

namespace simhost {
namespace {

VSMACAddrType checked(VSMACAddrType type) {
  if (static_cast<unsigned>(type) > VS_MAC_ADDR_TYPE_ALL) {
    refuse(QEX_BAD_PARAM);
  }
  return type;
}

Place team(storage::Transaction &transaction, std::string_view alias) {
  return {.switch_key = get_running_switch(transaction, alias).key, .port = std::nullopt};
}

Place port_of(storage::Transaction &transaction, std::string_view alias,
              std::string_view identifier) {
  auto const key = get_running_switch(transaction, alias).key;
  return {.switch_key = key, .port = get_port(transaction, key, identifier).number};
}

// Lets `change` work with an entry on the table of a port.
template <typename Change>
void change_table(ChangingCall &call, char const *switch_name, char const *port,
                  VSMACEntry const *entry, Change const &change) {
  auto const alias = require_text(switch_name);
  auto const identifier = require_text(port);
  auto const &wanted = require(entry);
  auto &transaction = call.transaction();
  change(transaction, port_of(transaction, alias, identifier), wanted);
}

}  // namespace

extern "C" {

QEX_ReturnStatus VSQEX_GetTeamMACTable(char const *switchName, VSMACAddrType type,
                                       VSMACTable **table) {
  return reading(__func__, [&](ReadingCall &call) {
    auto const alias = require_text(switchName);
    auto &output = require(table);
    auto const wanted = checked(type);
    auto &transaction = call.transaction();
    auto const entries = running_plane().addresses(transaction, team(transaction, alias), wanted);
    output = allocate_list<VSMACTable>(call, entries);
  });
}

QEX_ReturnStatus VSQEX_GetPortMACTable(char const *switchName, char const *port, VSMACAddrType type,
                                       VSMACTable **table) {
  return reading(__func__, [&](ReadingCall &call) {
    auto const alias = require_text(switchName);
    auto const identifier = require_text(port);
    auto &output = require(table);
    auto const wanted = checked(type);
    auto &transaction = call.transaction();
    auto const entries =
        running_plane().addresses(transaction, port_of(transaction, alias, identifier), wanted);
    output = allocate_list<VSMACTable>(call, entries);
  });
}

QEX_ReturnStatus VSQEX_SetPortMACTable(char const *switchName, char const *port,
                                       VSMACEntry const *entry) {
  return changing(__func__, [&](ChangingCall &call) {
    change_table(
        call, switchName, port, entry,
        [](storage::ChangingTransaction &transaction, Place const &place,
           VSMACEntry const &wanted) { running_plane().put_address(transaction, place, wanted); });
  });
}

QEX_ReturnStatus VSQEX_ClearPortMACTable(char const *switchName, char const *port,
                                         VSMACEntry const *entry) {
  return changing(__func__, [&](ChangingCall &call) {
    change_table(call, switchName, port, entry,
                 [](storage::ChangingTransaction &transaction, Place const &place,
                    VSMACEntry const &wanted) {
                   running_plane().remove_address(transaction, place, wanted);
                 });
  });
}

QEX_ReturnStatus VSQEX_GetPortMACLearningStats(char const *switchName, char const *port,
                                               VSPMACLearningStats *stats) {
  return reading(__func__, [&](ReadingCall &call) {
    auto const alias = require_text(switchName);
    auto const identifier = require_text(port);
    auto &output = require(stats);
    auto &transaction = call.transaction();
    output = running_plane().learning_stats(transaction, port_of(transaction, alias, identifier));
  });
}

QEX_ReturnStatus VSQEX_GetGlobalMACLearningProps(VSMACLearningGlobalProps *props) {
  return reading(__func__, [&](ReadingCall &call) {
    auto &output = require(props);
    output = global_mac_learning(call.transaction());
  });
}

QEX_ReturnStatus VSQEX_SetGlobalMACLearningProps(VSMACLearningGlobalProps *props) {
  return changing(__func__, [&](ChangingCall &call) {
    auto const &wanted = require(props);
    set_global_mac_learning(call.transaction(), wanted);
  });
}

}  // extern "C"
}  // namespace simhost
