// What is too old is left out when it is read, and removed when the switch's table changes.
#include "planes/stored/mac_tables.h"

#include <algorithm>
#include <cstring>
#include <optional>
#include <span>

#include "base/outcomes.h"
#include "base/vlan.h"
#include "model/mac/learning.h"
#include "model/mac/properties.h"
#include "model/properties/properties.h"
#include "planes/stored/counters.h"
#include "qexapi/protocols.h"
#include "storage/store.h"
#include "vswitch/mac_learning.h"

namespace simhost::stored {
namespace {

constexpr unsigned kMulticastBit = 1;

std::span<std::byte const> mac_of(VSMACEntry const &entry) {
  return std::as_bytes(std::span(entry.macAddress));
}

void check_source(VSMACEntry const &entry) {
  auto const mac = mac_of(entry);
  bool const zero =
      std::all_of(mac.begin(), mac.end(), [](std::byte byte) { return byte == std::byte{0}; });
  if (zero || (std::to_integer<unsigned>(mac[0]) & kMulticastBit) != 0) {
    throw Refused(QEX_INVALID_ADDRESS);
  }
  if (entry.vid > kGreatestVlan) {
    throw Refused(QEX_BAD_VLANID);
  }
  if (entry.vni > QEX_VIRTUAL_NETWORK_ID_MAX) {
    throw Refused(QEX_BAD_PARAM);
  }
}

VSPMACLearning port_learning(storage::Transaction &transaction, Place const &place) {
  auto const owner = storage::PropertyOwner::port(place.switch_key, *place.port);
  return effective(transaction, mac::management, owner).portMACLearning;
}

// The last time at which an address that ages may have been seen and be gone now.
ClockTime gone_if_seen_by(storage::Transaction &transaction, VSMACLearning const &learning) {
  return clock_now(transaction) - std::chrono::seconds(learning.agingTime);
}

void remove_aged(storage::ChangingTransaction &transaction, storage::SwitchKey key,
                 VSMACLearning const &learning) {
  storage::remove_aged(transaction, key, gone_if_seen_by(transaction, learning));
}

storage::AddressName name_of(VSMACEntry const &entry) {
  storage::AddressName name{.mac = {}, .vid = entry.vid, .vni = entry.vni};
  std::memcpy(name.mac.data(), entry.macAddress, name.mac.size());
  return name;
}

bool is_at(Place const &place, storage::FoundAddress const &address) {
  return address.port == place.port;
}

VSMACEntry entry_of(storage::Address const &address, ClockTime now) {
  VSMACEntry entry{};
  std::memcpy(entry.macAddress, address.name.mac.data(), sizeof entry.macAddress);
  entry.macAddrType = address.type;
  entry.aging = address.ages ? 1 : 0;
  entry.vid = address.name.vid;
  entry.vni = address.name.vni;
  auto const since = std::max(now - address.seen, ClockTime::zero());
  entry.elapsed = static_cast<qex_uint32>(since / std::chrono::seconds(1));
  return entry;
}

// Of a switch from which what is too old has been removed.
bool has_room(storage::Transaction &transaction, Place const &place, VSMACLearning const &learning,
              VSPMACLearning const &port, bool new_to_switch) {
  auto const limit =
      place.port ? port.macLimit : std::uint32_t{TEAM_MAC_LEARNING_LIMIT_ENTRIES_DEFAULT};
  return storage::count_learned(transaction, place) < limit &&
         !(new_to_switch &&
           storage::count_learned(transaction, place.switch_key) >= learning.macLimit);
}

// A source that is not learned because there is no room.
Sighting turn_away(storage::ChangingTransaction &transaction, Place const &place,
                   VSPMACLearning const &port) {
  if (!place.port) {
    return Sighting::let_through;
  }
  bool const drop = port.macLimitPolicy == VSPORT_MAC_LEARNING_LIMIT_POLICY_DROP;
  CounterOwner const owner{.switch_key = place.switch_key, .port = place.port};
  add_to_counter(transaction, owner,
                 drop ? counter_in(&VSPMACLearningStats::noLearningDroppedPkts)
                      : counter_in(&VSPMACLearningStats::noLearningAllowedPkts),
                 1);
  return drop ? Sighting::dropped : Sighting::let_through;
}

}  // namespace

std::vector<VSMACEntry> addresses(storage::Transaction &transaction, Place const &place,
                                  VSMACAddrType type) {
  auto const now = clock_now(transaction);
  auto const gone = gone_if_seen_by(transaction, mac::learning_of(transaction, place.switch_key));
  std::vector<VSMACEntry> entries;
  for (auto const &address : storage::addresses_at(transaction, place, type, gone)) {
    entries.push_back(entry_of(address, now));
  }
  return entries;
}

void put_address(storage::ChangingTransaction &transaction, Place const &place,
                 VSMACEntry const &entry) {
  if (entry.macAddrType != VS_MAC_ADDR_TYPE_STATIC && entry.macAddrType != VS_MAC_ADDR_TYPE_USER) {
    throw Refused(QEX_BAD_PARAM);
  }
  VSMACEntry just_seen = entry;
  just_seen.elapsed = 0;
  describe_address(transaction, place, just_seen);
}

void describe_address(storage::ChangingTransaction &transaction, Place const &place,
                      VSMACEntry const &entry) {
  check_source(entry);
  if (entry.macAddrType > VS_MAC_ADDR_TYPE_LEARNED) {
    throw Refused(QEX_BAD_PARAM);
  }
  remove_aged(transaction, place.switch_key, mac::learning_of(transaction, place.switch_key));
  auto const known = storage::find_address(transaction, place.switch_key, name_of(entry));
  if (known && !is_at(place, *known) && known->type != VS_MAC_ADDR_TYPE_LEARNED) {
    throw Refused(QEX_EXISTS);
  }
  // By value: a field of a packed record may lie where no reference can.
  qex_uint32 const elapsed = entry.elapsed;
  storage::place_address(transaction, place,
                         {.name = name_of(entry),
                          .type = entry.macAddrType,
                          .ages = entry.aging != 0,
                          .seen = clock_now(transaction) - std::chrono::seconds(elapsed)});
}

void remove_address(storage::ChangingTransaction &transaction, Place const &place,
                    VSMACEntry const &entry) {
  remove_aged(transaction, place.switch_key, mac::learning_of(transaction, place.switch_key));
  auto const known = storage::find_address(transaction, place.switch_key, name_of(entry));
  if (!known || !is_at(place, *known) ||
      (entry.macAddrType != VS_MAC_ADDR_TYPE_ALL && entry.macAddrType != known->type)) {
    throw Refused(QEX_NOT_FOUND);
  }
  storage::remove_address(transaction, known->row);
}

Sighting learn(storage::ChangingTransaction &transaction, Place const &place,
               VSMACEntry const &source) {
  check_source(source);
  auto const learning = mac::learning_of(transaction, place.switch_key);
  auto const port = place.port ? port_learning(transaction, place) : VSPMACLearning{};
  if (place.port && port.learning == 0) {
    return Sighting::learning_off;
  }
  remove_aged(transaction, place.switch_key, learning);
  auto const now = clock_now(transaction);
  auto const known = storage::find_address(transaction, place.switch_key, name_of(source));
  if (known && is_at(place, *known)) {
    storage::set_seen(transaction, known->row, now);
    return Sighting::refreshed;
  }
  if (known && known->type != VS_MAC_ADDR_TYPE_LEARNED &&
      !(known->type == VS_MAC_ADDR_TYPE_STATIC && learning.learnStatic != 0)) {
    return Sighting::fixed_elsewhere;
  }
  bool const new_to_switch = !known || known->type != VS_MAC_ADDR_TYPE_LEARNED;
  if (!has_room(transaction, place, learning, port, new_to_switch)) {
    return turn_away(transaction, place, port);
  }
  storage::place_address(
      transaction, place,
      {.name = name_of(source), .type = VS_MAC_ADDR_TYPE_LEARNED, .ages = true, .seen = now});
  if (known && place.port) {
    CounterOwner const owner{.switch_key = place.switch_key, .port = place.port};
    add_to_counter(transaction, owner, counter_in(&VSPMACLearningStats::numMACsMoved), 1);
  }
  return known ? Sighting::moved : Sighting::learned;
}

VSPMACLearningStats learning_stats(storage::Transaction &transaction, Place const &place) {
  auto const gone = gone_if_seen_by(transaction, mac::learning_of(transaction, place.switch_key));
  VSPMACLearningStats stats{};
  stats.numMACsLearned = static_cast<qex_uint32>(storage::count_learned(transaction, place) -
                                                 storage::count_aged(transaction, place, gone));
  if (place.port) {
    show(counters_of(transaction, {.switch_key = place.switch_key, .port = place.port}), stats);
  }
  return stats;
}

}  // namespace simhost::stored
