// A host that shares a switch with others, without any: what tests of sharing begin with.
#pragma once

#include <gmock/gmock.h>

#include <map>
#include <optional>
#include <set>
#include <string>
#include <vector>

#include "fabric/shared/records.h"
#include "memory_state.h"
#include "model/ports/ports.h"
#include "model/switches/switches.h"
#include "storage/store.h"
#include "storage/tunnels/fabrics.h"

namespace simhost::fabric {

inline constexpr auto *kSwitch = "s-1";

inline SharedName port_name(std::string const &port) {
  return {.switch_identifier = kSwitch, .port = port};
}

inline Json in_json(std::vector<Change> const &changes) {
  std::map<SharedName, Json> sorted;
  for (auto const &change : changes) {
    sorted.emplace(change.name, change);
  }
  auto all = Json::array();
  for (auto const &[name, change] : sorted) {
    all.push_back(change);
  }
  return all;
}

// A host of the network 192.0.2.0/24.
inline storage::AddressBytes host_address(unsigned number) {
  return {std::byte{192}, std::byte{0}, std::byte{2}, std::byte(number)};
}

// A host that shares the switch s-1, which has the alias lab and the port a.
struct SharingHost : MemoryState {
  SharingHost() {
    storage::ChangingTransaction transaction(store);
    storage::put_membership(transaction, membership);
    begin(transaction);
    settle(transaction);
  }
  void TestBody() override {}

  static void begin(storage::ChangingTransaction &transaction) {
    create_switch(transaction, {.alias = "lab", .identifier = kSwitch, .persistent = true});
    add_client_port(transaction, found_in(transaction)->key, "a");
    storage::put_shared(transaction, {.name = port_name(""), .fabric = {}, .image = std::nullopt});
    storage::touch(transaction, kSwitch);
  }
  static std::optional<storage::FoundSwitch> found_in(storage::Transaction &transaction) {
    return storage::find_switch(transaction, storage::SwitchName::identifier, kSwitch);
  }
  static std::optional<storage::Port> port_in(storage::Transaction &transaction,
                                              std::string const &port) {
    auto const found = found_in(transaction);
    return found ? storage::find_port(transaction, found->key, port) : std::nullopt;
  }

  // As a call does before it commits. Returns what it changed.
  std::vector<Change> settle(storage::ChangingTransaction &transaction) const {
    auto changes = changes_of(transaction, membership);
    agree(transaction, changes);
    storage::forget_touched(transaction);
    transaction.commit();
    return changes;
  }
  template <typename Work>
  Json changes_by(Work const &work) {
    storage::ChangingTransaction transaction(store);
    work(transaction);
    return in_json(settle(transaction));
  }
  [[nodiscard]] Json whole_look(storage::ChangingTransaction &transaction) const {
    std::set<std::string> switches;
    for (auto const &row : storage::all_shared(transaction)) {
      switches.insert(row.name.switch_identifier);
    }
    for (auto const &one : switches) {
      storage::touch(transaction, one);
    }
    return in_json(changes_of(transaction, membership));
  }

  Membership membership{.host = "here", .state = "x"};
};

}  // namespace simhost::fabric
