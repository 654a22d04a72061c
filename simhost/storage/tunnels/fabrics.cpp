// Fabrics and the underlay in SQL.
#include "storage/tunnels/fabrics.h"

#include <algorithm>
#include <utility>

#include "qexapi/protocols.h"
#include "qexapi/types.h"
#include "storage/query.h"
#include "storage/running/devices.h"

namespace simhost::storage {
namespace {

AddressBytes address_at(Query const &row, int column) {
  auto address = row.bytes(column);
  if (address.size() != sizeof(qex_IPv4Address) && address.size() != sizeof(qex_IPv6Address)) {
    row.refuse(column, "an address of " + std::to_string(address.size()) + " bytes");
  }
  return address;
}

// What a fabric is read with; a macro, so that a statement is one literal.
#define SELECT_FABRIC "SELECT switch, uplink, encapsulation, key FROM fabric"

Fabric fabric_at(Query const &row) {
  return {.switch_key = SwitchKey{row.integer(0)},
          .uplink = row.name(1),
          .encapsulation = row.choice(2, Encapsulation::geneve),
          .key = static_cast<std::uint32_t>(row.integer(3, 0, kGreatestTunnelKey)),
          .peers = {},
          .tunnels = {}};
}

struct Peer {
  Tunnel tunnel;
  bool is_this_host = false;
};

// By their places.
std::vector<Peer> peers_of(Transaction &transaction, SwitchKey key) {
  Query select(transaction,
               "SELECT place, peer, EXISTS (SELECT 1 FROM underlay WHERE address = peer)"
               " FROM tunnel WHERE switch = ? ORDER BY place");
  return select.with(key).all([](Query const &row) {
    auto const place = row.integer(0, 0, kMostTunnels - 1);
    return Peer{.tunnel = {.number = static_cast<std::uint16_t>(kFirstTunnel + place),
                           .peer = address_at(row, 1)},
                .is_this_host = row.flag(2)};
  });
}

std::optional<Fabric> with_tunnels(Transaction &transaction, std::optional<Fabric> fabric) {
  if (fabric) {
    for (auto &[tunnel, is_this_host] : peers_of(transaction, fabric->switch_key)) {
      fabric->peers.push_back(tunnel.peer);
      if (!is_this_host) {
        fabric->tunnels.push_back(std::move(tunnel));
      }
    }
    std::ranges::sort(fabric->peers, [](AddressBytes const &one, AddressBytes const &other) {
      return one.size() == other.size() ? one < other : one.size() < other.size();
    });
  }
  return fabric;
}

// The first place that is free.
std::size_t free_place(std::vector<Peer> const &taken) {
  std::size_t place = 0;
  while (std::ranges::any_of(
      taken, [&](Peer const &peer) { return peer.tunnel.number == kFirstTunnel + place; })) {
    ++place;
  }
  return place;
}

void remove_tunnel(ChangingTransaction &transaction, SwitchKey key, AddressBytes const &peer) {
  Change erase(transaction, "DELETE FROM tunnel WHERE switch = ? AND peer = ?");
  erase.with(key).with(peer).run();
}

void put_tunnel(ChangingTransaction &transaction, SwitchKey key, std::size_t place,
                AddressBytes const &peer) {
  Change insert(transaction, "INSERT INTO tunnel (switch, place, peer) VALUES (?, ?, ?)");
  insert.with(key).with(static_cast<std::int64_t>(place)).with(peer).run();
}

}  // namespace

std::optional<Fabric> fabric_of(Transaction &transaction, SwitchKey key) {
  Query select(transaction, SELECT_FABRIC " WHERE switch = ?");
  return with_tunnels(transaction, select.with(key).first(fabric_at));
}

std::optional<Fabric> fabric_of(Transaction &transaction, std::string_view uplink) {
  Query select(transaction, SELECT_FABRIC " WHERE uplink = ?");
  return with_tunnels(transaction, select.with(uplink).first(fabric_at));
}

std::optional<SwitchKey> find_fabric(Transaction &transaction, Encapsulation encapsulation,
                                     std::uint32_t key) {
  Query select(transaction, "SELECT switch FROM fabric WHERE encapsulation = ? AND key = ?");
  select.with(encapsulation).with(std::int64_t{key});
  return select.first([](Query const &row) { return SwitchKey{row.integer(0)}; });
}

std::optional<std::string> first_fabric(Transaction &transaction) {
  Query select(transaction, "SELECT uplink FROM fabric ORDER BY uplink LIMIT 1");
  return select.first([](Query const &row) { return row.name(0); });
}

void put_fabric(ChangingTransaction &transaction, SwitchKey key, std::string_view uplink,
                Encapsulation encapsulation, std::uint32_t tunnel_key,
                std::vector<AddressBytes> const &peers) {
  Change upsert(transaction,
                "INSERT INTO fabric (switch, uplink, encapsulation, key) VALUES (?, ?, ?, ?)"
                " ON CONFLICT (switch) DO UPDATE SET uplink = excluded.uplink,"
                " encapsulation = excluded.encapsulation, key = excluded.key");
  upsert.with(key).with(uplink).with(encapsulation).with(std::int64_t{tunnel_key}).run();
  auto kept = peers_of(transaction, key);
  std::erase_if(kept, [&](Peer const &one) {
    bool const goes = std::ranges::find(peers, one.tunnel.peer) == peers.end();
    if (goes) {
      remove_tunnel(transaction, key, one.tunnel.peer);
    }
    return goes;
  });
  for (auto const &peer : peers) {
    if (std::ranges::none_of(kept, [&](Peer const &one) { return one.tunnel.peer == peer; })) {
      auto const place = free_place(kept);
      put_tunnel(transaction, key, place, peer);
      kept.push_back(
          {.tunnel = {.number = static_cast<std::uint16_t>(kFirstTunnel + place), .peer = peer}});
    }
  }
}

void remove_fabric(ChangingTransaction &transaction, SwitchKey key) {
  Change(transaction, "DELETE FROM fabric WHERE switch = ?").with(key).run();
}

std::optional<Underlay> underlay_of(Transaction &transaction) {
  Query select(transaction, "SELECT device, address, prefix, gateway FROM underlay LIMIT 1");
  return select.first([](Query const &row) {
    Underlay underlay{.device = row.name(0), .address = address_at(row, 1)};
    auto const bits = static_cast<std::int64_t>(underlay.address.size() * 8);
    underlay.prefix = static_cast<std::uint8_t>(row.integer(2, 0, bits));
    if (!row.is_null(3)) {
      underlay.gateway = row.bytes(3, underlay.address.size());
    }
    return underlay;
  });
}

void put_underlay(ChangingTransaction &transaction, Underlay const &underlay) {
  remove_underlay(transaction);
  Change insert(transaction, "INSERT INTO underlay (device, address, prefix) VALUES (?, ?, ?)");
  insert.with(underlay.device).with(underlay.address).with(std::int64_t{underlay.prefix}).run();
  if (!underlay.gateway.empty()) {
    Change(transaction, "UPDATE underlay SET gateway = ?").with(underlay.gateway).run();
  }
}

void remove_underlay(ChangingTransaction &transaction) {
  Change(transaction, "DELETE FROM underlay").run();
}

bool carries_frames(Transaction &transaction, std::string_view uplink) {
  return device_of(transaction, uplink).has_value() || fabric_of(transaction, uplink).has_value();
}

}  // namespace simhost::storage
