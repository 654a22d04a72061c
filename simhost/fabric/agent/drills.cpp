// A reply is JSON in a text, as settings are.
#include "fabric/agent/drills.h"

#include "model/teaming/failover.h"

namespace simhost::fabric {

std::vector<Drill> drills_for(ovsdb::Replica const &replica, std::string const &host) {
  std::vector<Drill> found;
  for (auto const &[uuid, row] : replica.rows("Drill")) {
    if (row.at("host") == host && row.at("reply").get_ref<std::string const &>().empty()) {
      found.push_back({.id = row.at("id"), .switch_identifier = row.at("switch")});
    }
  }
  return found;
}

Json drilled(storage::Store &store, Drill const &drill) {
  storage::ReadingTransaction transaction(store);
  auto const found =
      storage::find_switch(transaction, storage::SwitchName::identifier, drill.switch_identifier);
  if (!found) {
    return {{"refused", "the host has no such switch"}};
  }
  auto all = Json::array();
  for (auto const &one : teaming::failovers(transaction, found->key)) {
    all.push_back({{"uplink", one.uplink},
                   {"port", one.port},
                   {"meanwhile", one.meanwhile ? Json(*one.meanwhile) : Json()}});
  }
  return {{"failovers", std::move(all)}};
}

Json reply_to(Drill const &drill, Json const &reply) {
  return Json::array({{{"op", "update"},
                       {"table", "Drill"},
                       {"where", Json::array({Json::array({"id", "==", drill.id})})},
                       {"row", {{"reply", reply.dump()}}}}});
}

}  // namespace simhost::fabric
