// Addresses in SQL. What is too old is left out when it is read, and removed when the switch's
// table changes.
#include "planes/stored/mac_tables.h"

#include <algorithm>
#include <cstring>
#include <optional>
#include <span>

#include "base/outcomes.h"
#include "model/options/host_settings.h"
#include "planes/stored/counters.h"
#include "planes/stored/policies.h"
#include "qexapi/protocols.h"
#include "storage/store.h"
#include "vswitch/mac_learning.h"
#include "vswitch/port_mac_policies.h"
#include "vswitch/properties.h"

namespace simhost::stored {
namespace {

constexpr std::uint16_t kGreatestVlan = 4094;
constexpr std::uint32_t kGreatestNetwork = 0xFFFFFF;
constexpr unsigned kMulticastBit = 1;

std::int64_t port_or_none(Place const &place) {
  return place.port ? std::int64_t(*place.port) : 0;
}

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
  if (entry.vni > kGreatestNetwork) {
    throw Refused(QEX_BAD_PARAM);
  }
}

VSMACLearning learning_of(storage::Transaction &transaction, storage::SwitchKey key) {
  auto const own = policy<VSMACLearning>(transaction, storage::PropertyOwner::global(key),
                                         VSPROP_SWITCH_MAC_LEARNING);
  if (own) {
    return *own;
  }
  auto const global = global_mac_learning(transaction);
  VSMACLearning learning{};
  learning.agingTime = global.agingTime;
  learning.learnStatic = global.learnStatic != 0 ? 1 : 0;
  learning.macLimit = global.macLimit;
  return learning;
}

VSPMACLearning port_learning(storage::Transaction &transaction, Place const &place) {
  auto const own = policy<VSPMACManagement>(
      transaction, storage::PropertyOwner::port(place.switch_key, *place.port),
      VSPROP_PORT_MAC_MANAGEMENT);
  return own ? own->portMACLearning : VSPMACLearning{};
}

// The last time at which an address that ages may have been seen and be gone now.
std::int64_t gone_if_seen_by(storage::Transaction &transaction, VSMACLearning const &learning) {
  return (clock_now(transaction) - std::chrono::seconds(learning.agingTime)).count();
}

void remove_aged(storage::Transaction &transaction, storage::SwitchKey key,
                 VSMACLearning const &learning) {
  transaction.query("DELETE FROM address WHERE switch = ? AND ages AND seen <= ?")
      .with(std::int64_t(key))
      .with(gone_if_seen_by(transaction, learning))
      .run();
}

struct Known {
  std::int64_t row;
  bool here;
  VSMACAddrType type;
};

std::optional<Known> find_address(storage::Transaction &transaction, Place const &place,
                                  VSMACEntry const &entry) {
  auto select = transaction.query(
      "SELECT rowid, ifnull(port, 0), type FROM address"
      " WHERE switch = ? AND mac = ? AND vid = ? AND vni = ?");
  select.with(std::int64_t(place.switch_key)).with(mac_of(entry));
  if (!select.with(std::int64_t{entry.vid}).with(std::int64_t{entry.vni}).next()) {
    return std::nullopt;
  }
  return Known{.row = select.integer(0),
               .here = select.integer(1) == port_or_none(place),
               .type = static_cast<VSMACAddrType>(select.integer(2))};
}

// Puts the address here, wherever it was before.
void store_address(storage::Transaction &transaction, Place const &place, VSMACEntry const &entry,
                   ClockTime seen) {
  auto upsert = transaction.query(
      "INSERT INTO address (switch, port, mac, vid, vni, type, ages, seen)"
      " VALUES (?, nullif(?, 0), ?, ?, ?, ?, ?, ?)"
      " ON CONFLICT (switch, mac, vid, vni) DO UPDATE SET port = excluded.port,"
      " type = excluded.type, ages = excluded.ages, seen = excluded.seen");
  upsert.with(std::int64_t(place.switch_key)).with(port_or_none(place)).with(mac_of(entry));
  upsert.with(std::int64_t{entry.vid}).with(std::int64_t{entry.vni});
  upsert.with(std::int64_t{entry.macAddrType}).with(std::int64_t{entry.aging != 0});
  upsert.with(seen.count()).run();
}

static_assert(VS_MAC_ADDR_TYPE_LEARNED == 2, "the tables count what is of this type");

// At a place, or kEverywhere: with what is too old and has not been removed yet.
constexpr std::int64_t kEverywhere = -1;

std::int64_t count_learned(storage::Transaction &transaction, storage::SwitchKey key,
                           std::int64_t place) {
  auto select = transaction.query("SELECT addresses FROM learned WHERE switch = ? AND place = ?");
  return select.with(std::int64_t(key)).with(place).next() ? select.integer(0) : 0;
}

std::int64_t count_too_old(storage::Transaction &transaction, Place const &place,
                           VSMACLearning const &learning) {
  auto select = transaction.query(
      "SELECT count(*) FROM address WHERE switch = ? AND ages AND seen <= ?"
      " AND ifnull(port, 0) = ? AND type = ?");
  select.with(std::int64_t(place.switch_key)).with(gone_if_seen_by(transaction, learning));
  select.with(port_or_none(place)).with(std::int64_t{VS_MAC_ADDR_TYPE_LEARNED}).next();
  return select.integer(0);
}

// Of a switch from which what is too old has been removed.
bool has_room(storage::Transaction &transaction, Place const &place, VSMACLearning const &learning,
              VSPMACLearning const &port, bool new_to_switch) {
  auto const limit =
      place.port ? port.macLimit : std::uint32_t{TEAM_MAC_LEARNING_LIMIT_ENTRIES_DEFAULT};
  auto const key = place.switch_key;
  return count_learned(transaction, key, port_or_none(place)) < limit &&
         !(new_to_switch && count_learned(transaction, key, kEverywhere) >= learning.macLimit);
}

// A source that is not learned because there is no room.
Sighting turn_away(storage::Transaction &transaction, Place const &place,
                   VSPMACLearning const &port) {
  if (!place.port) {
    return Sighting::let_through;
  }
  bool const drop = port.macLimitPolicy == VSPORT_MAC_LEARNING_LIMIT_POLICY_DROP;
  CounterOwner const owner{.switch_key = place.switch_key, .port = place.port};
  add_to_counter(transaction, owner, drop ? "noLearningDroppedPkts" : "noLearningAllowedPkts", 1);
  return drop ? Sighting::dropped : Sighting::let_through;
}

}  // namespace

std::vector<VSMACEntry> addresses(storage::Transaction &transaction, Place const &place,
                                  VSMACAddrType type) {
  auto const now = clock_now(transaction);
  auto select = transaction.query(
      "SELECT mac, type, ages, vid, vni, seen FROM address"
      " WHERE switch = ? AND ifnull(port, 0) = ? AND ? IN (type, ?)"
      " AND NOT (ages AND seen <= ?) ORDER BY mac, vid, vni");
  auto const gone = gone_if_seen_by(transaction, learning_of(transaction, place.switch_key));
  select.with(std::int64_t(place.switch_key)).with(port_or_none(place));
  select.with(std::int64_t{type}).with(std::int64_t{VS_MAC_ADDR_TYPE_ALL}).with(gone);
  std::vector<VSMACEntry> entries;
  while (select.next()) {
    VSMACEntry entry{};
    std::memcpy(entry.macAddress, select.bytes(0).data(), sizeof entry.macAddress);
    entry.macAddrType = static_cast<VSMACAddrType>(select.integer(1));
    entry.aging = static_cast<qex_Bool>(select.integer(2));
    entry.vid = static_cast<qex_VlanID>(select.integer(3));
    entry.vni = static_cast<qex_uint32>(select.integer(4));
    auto const since = std::max(now - ClockTime(select.integer(5)), ClockTime::zero());
    entry.elapsed = static_cast<qex_uint32>(since / std::chrono::seconds(1));
    entries.push_back(entry);
  }
  return entries;
}

void put_address(storage::Transaction &transaction, Place const &place, VSMACEntry const &entry) {
  if (entry.macAddrType != VS_MAC_ADDR_TYPE_STATIC && entry.macAddrType != VS_MAC_ADDR_TYPE_USER) {
    throw Refused(QEX_BAD_PARAM);
  }
  VSMACEntry just_seen = entry;
  just_seen.elapsed = 0;
  describe_address(transaction, place, just_seen);
}

void describe_address(storage::Transaction &transaction, Place const &place,
                      VSMACEntry const &entry) {
  check_source(entry);
  if (entry.macAddrType > VS_MAC_ADDR_TYPE_LEARNED) {
    throw Refused(QEX_BAD_PARAM);
  }
  remove_aged(transaction, place.switch_key, learning_of(transaction, place.switch_key));
  auto const known = find_address(transaction, place, entry);
  if (known && !known->here && known->type != VS_MAC_ADDR_TYPE_LEARNED) {
    throw Refused(QEX_EXISTS);
  }
  // By value: a field of a packed record may lie where no reference can.
  qex_uint32 const elapsed = entry.elapsed;
  store_address(transaction, place, entry, clock_now(transaction) - std::chrono::seconds(elapsed));
}

void remove_address(storage::Transaction &transaction, Place const &place,
                    VSMACEntry const &entry) {
  remove_aged(transaction, place.switch_key, learning_of(transaction, place.switch_key));
  auto const known = find_address(transaction, place, entry);
  if (!known || !known->here ||
      (entry.macAddrType != VS_MAC_ADDR_TYPE_ALL && entry.macAddrType != known->type)) {
    throw Refused(QEX_NOT_FOUND);
  }
  transaction.query("DELETE FROM address WHERE rowid = ?").with(known->row).run();
}

Sighting learn(storage::Transaction &transaction, Place const &place, VSMACEntry const &source) {
  check_source(source);
  auto const learning = learning_of(transaction, place.switch_key);
  auto const port = place.port ? port_learning(transaction, place) : VSPMACLearning{};
  if (place.port && port.learning == 0) {
    return Sighting::learning_off;
  }
  remove_aged(transaction, place.switch_key, learning);
  auto const now = clock_now(transaction);
  auto const known = find_address(transaction, place, source);
  if (known && known->here) {
    transaction.query("UPDATE address SET seen = ? WHERE rowid = ?")
        .with(now.count())
        .with(known->row)
        .run();
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
  VSMACEntry entry = source;
  entry.macAddrType = VS_MAC_ADDR_TYPE_LEARNED;
  entry.aging = 1;
  store_address(transaction, place, entry, now);
  if (known && place.port) {
    CounterOwner const owner{.switch_key = place.switch_key, .port = place.port};
    add_to_counter(transaction, owner, "numMACsMoved", 1);
  }
  return known ? Sighting::moved : Sighting::learned;
}

VSPMACLearningStats learning_stats(storage::Transaction &transaction, Place const &place) {
  auto counters = counters_of(transaction, {.switch_key = place.switch_key, .port = place.port});
  auto const learning = learning_of(transaction, place.switch_key);
  VSPMACLearningStats stats{};
  stats.numMACsLearned =
      static_cast<qex_uint32>(count_learned(transaction, place.switch_key, port_or_none(place)) -
                              count_too_old(transaction, place, learning));
  stats.noLearningAllowedPkts = counters["noLearningAllowedPkts"];
  stats.noLearningDroppedPkts = counters["noLearningDroppedPkts"];
  stats.numMACsMoved = counters["numMACsMoved"];
  return stats;
}

void forget_learned(storage::Transaction &transaction) {
  transaction.query("DELETE FROM address WHERE type = ?")
      .with(std::int64_t{VS_MAC_ADDR_TYPE_LEARNED})
      .run();
}

}  // namespace simhost::stored
