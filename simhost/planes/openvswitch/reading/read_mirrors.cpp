// From the sessions in the tables of ports and of uplinks to what frames have to know of them.
#include "planes/openvswitch/reading/read_mirrors.h"

#include <fmt/format.h>

#include <algorithm>
#include <cstdint>
#include <cstring>
#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "base/bytes.h"
#include "base/outcomes.h"
#include "model/mirror/properties.h"
#include "model/mirror/running.h"
#include "model/properties/properties.h"
#include "storage/ports.h"
#include "storage/running/devices.h"
#include "storage/tunnels/fabrics.h"

namespace simhost::openvswitch {
namespace {

// The numbers of a table's sessions begin with 1; the rest of an id is the table's port.
constexpr unsigned kSessionBits = 11;
static_assert(mirror::kMostSessions < 1U << kSessionBits);

constexpr auto *kTakesMore = "takes copies from uplinks, and mirrors from what is no VLAN of them";

template <typename Bytes, typename Address>
void copy_into(Bytes const &bytes, Address &address) {
  std::memcpy(address.data(), bytes.data(), address.size());
}

template <typename Bytes>
Collector collector_at(Bytes const &address) {
  Collector collector;
  if (address.size() == sizeof(openflow::Ipv6Address)) {
    copy_into(address, collector.address.emplace<openflow::Ipv6Address>());
  } else {
    copy_into(address, std::get<openflow::Ipv4Address>(collector.address));
  }
  return collector;
}

// A device that a session names, by its port or as an uplink.
struct Place {
  openflow::Port port;
  bool is_uplink;
};

class Sessions {
 public:
  Sessions(storage::Transaction &transaction, storage::SwitchKey key, Network &network)
      : transaction_(transaction), key_(key), network_(network) {}

  void add_table(std::uint32_t owner, mirror::Table const &table) {
    std::uint32_t number = 0;
    for (auto const &session : table.sessions) {
      ++number;
      MirrorSession const as_running{.port = {}, .record = session.record, .destinations = {}};
      if (as_running.runs() && !as_running.is_promiscuous()) {
        add(owner << kSessionBits | number, session);
      }
    }
  }

 private:
  void add(std::uint32_t id, mirror::Session const &session) {
    auto const &record = session.record;
    name_ = text_in(record.sid);
    check(record);
    Mirror mirror;
    mirror.id = id;
    mirror.sid = name_;
    mirror.most_bytes = snap_length(record.snapLen);
    mirror.keeps_vlan = (record.flags & VS_DVMIRROR_FLAG_DST_ORIG_VLAN) != 0;
    for (auto const &entity : session.to) {
      add_destination(mirror, record, entity);
    }
    if (record.type == VS_DVMIRROR_SESSIONTYPE_RMIRROR_DST) {
      take_copies(mirror, session);
    } else {
      mirror.received = sources(session.received_by, record.wildIn);
      mirror.sent = sources(session.sent_by, record.wildOut);
      mirror.remote_vlan = record.encapVlan;
    }
    network_.mirrors.push_back(std::move(mirror));
  }

  // The VLAN that the copies are wrapped in may be said as that of their encapsulation or as where
  // they come from.
  void take_copies(Mirror &mirror, mirror::Session const &session) const {
    auto const &record = session.record;
    if (!mirror.to_uplinks.empty() || !mirror.collectors.empty()) {
      refuse_session("takes copies from uplinks, and mirrors to others than ports");
    }
    if (!session.sent_by.empty() || (record.wildIn | record.wildOut) != 0) {
      refuse_session(kTakesMore);
    }
    auto const take = [&](std::uint16_t vlan) {
      if (vlan != 0 && std::ranges::find(mirror.taken_vlans, vlan) == mirror.taken_vlans.end()) {
        mirror.taken_vlans.push_back(vlan);
      }
    };
    take(record.encapVlan);
    for (auto const &entity : session.received_by) {
      if (entity.type != MIRROR_ENTTYPE_VLAN) {
        refuse_session(kTakesMore);
      }
      take(entity.vlan);
    }
  }

  void check(DVMirrorSession const &record) const {
    if (((record.wildIn | record.wildOut) & ~VS_DVMIRROR_WILDCARD_PNIC) != 0) {
      refuse_session("mirrors clients of a kind, which are not told apart here");
    }
    auto const by_flag = (record.flags & VS_DVMIRROR_FLAG_SRC_UPLINK_MIRROR) != 0;
    if (by_flag || record.uplinkFilter != MIRROR_UPLINK_FILTER_NONE) {
      refuse_session("mirrors some traffic of uplinks, which is not told apart here");
    }
    if (record.type == VS_DVMIRROR_SESSIONTYPE_RMIRROR_SRC && record.encapVlan == 0) {
      refuse_session("mirrors to other hosts, and has no VLAN for that");
    }
    if (record.stack != 0) {
      refuse_session("mirrors on the side of the stack, which is not here");
    }
  }

  MirrorSources sources(std::vector<DVMirrorEntity> const &entities, std::uint32_t wild) {
    MirrorSources sources;
    for (auto const &entity : entities) {
      if (entity.type == MIRROR_ENTTYPE_IP) {
        refuse_session("mirrors from an address");
      }
      if (entity.type == MIRROR_ENTTYPE_VLAN) {
        sources.vlans.push_back(entity.vlan);
      } else if (auto const place = place_of(entity)) {
        (place->is_uplink ? sources.uplinks : sources.ports).push_back(place->port);
      }
    }
    if ((wild & VS_DVMIRROR_WILDCARD_PNIC) != 0) {
      sources.uplinks.clear();
      for (auto const &uplink : network_.uplinks) {
        sources.uplinks.push_back(uplink.port);
      }
    }
    return sources;
  }

  void add_collector(Mirror &mirror, DVMirrorSession const &record, DVMirrorEntity const &entity) {
    bool const wraps = (record.flags & VS_DVMIRROR_FLAG_DST_ENCAP) != 0 ||
                       record.type == VS_DVMIRROR_SESSIONTYPE_ERMIRROR_SRC;
    auto const underlay = storage::underlay_of(transaction_);
    if (!wraps) {
      refuse_session("mirrors to an address, and wraps nothing");
    }
    if (!underlay) {
      refuse_session("mirrors to an address, and the host has no underlay");
    }
    auto const address = mirror::Address::bytes(entity);
    if (underlay->address.size() != address.size()) {
      refuse_session(address.size() == sizeof(openflow::Ipv4Address)
                         ? "mirrors to an address of IPv4, and the underlay has one of IPv6"
                         : "mirrors to an address of IPv6, and the underlay has one of IPv4");
    }
    if (address == underlay->address) {
      refuse_session("mirrors to the address of this host");
    }
    auto const collector = collector_at(address);
    if (std::ranges::find(mirror.collectors, collector) == mirror.collectors.end()) {
      mirror.collectors.push_back(collector);
    }
    read_wrapping(mirror, record);
  }

  void read_wrapping(Mirror &mirror, DVMirrorSession const &record) const {
    constexpr std::uint32_t kGreatestErspan = 1023;
    mirror.wrapping = static_cast<Wrapping>(record.encapType);
    mirror.key = mirror.wrapping == Wrapping::gre ? record.greKey : record.erspanID;
    if (mirror.wrapping != Wrapping::gre && mirror.key > kGreatestErspan) {
      refuse_session(fmt::format("is session {} of ERSPAN, which has {} at most", mirror.key,
                                 kGreatestErspan));
    }
  }

  void add_destination(Mirror &mirror, DVMirrorSession const &record,
                       DVMirrorEntity const &entity) {
    if (entity.type == MIRROR_ENTTYPE_VLAN) {
      refuse_session("mirrors to a VLAN");
    }
    if (entity.type == MIRROR_ENTTYPE_IP) {
      add_collector(mirror, record, entity);
      return;
    }
    if (record.type == VS_DVMIRROR_SESSIONTYPE_ERMIRROR_SRC) {
      refuse_session("is an encapsulated one, and mirrors to what is no address");
    }
    auto const flags = record.flags;
    auto const place = place_of(entity);
    if (!place) {
      return;
    }
    if (!place->is_uplink && (flags & VS_DVMIRROR_FLAG_DST_ENCAP) != 0) {
      refuse_session("wraps what it mirrors to a port, which is not done here");
    }
    auto &places = place->is_uplink ? mirror.to_uplinks : mirror.to_ports;
    if (std::ranges::find(places, place->port) == places.end()) {
      places.push_back(place->port);
    }
    for (auto &known : network_.ports) {
      if (known.port == place->port) {
        known.mirrors_only = known.mirrors_only || (flags & VS_DVMIRROR_FLAG_DST_NO_OUTPUT) != 0;
        known.sends_nothing = known.sends_nothing || (flags & VS_DVMIRROR_FLAG_DST_NO_INPUT) != 0;
      }
    }
  }

  // Without a device there is nothing to mirror.
  std::optional<Place> place_of(DVMirrorEntity const &entity) {
    if (entity.type == MIRROR_ENTTYPE_UPLINK) {
      auto const name = text_in(entity.uplink.string);
      auto const uplink = storage::find_uplink(transaction_, name);
      bool const is_here = uplink && uplink->port &&
                           storage::get_port_row(transaction_, *uplink->port).switch_key == key_;
      return is_here ? place_of_uplink(name) : std::nullopt;
    }
    auto const port =
        entity.type == MIRROR_ENTTYPE_DVPORT
            ? storage::find_port(transaction_, key_, text_in(entity.dvPortId))
            : storage::find_port(transaction_, key_, storage::PortNumber{entity.portId});
    if (!port) {
      return std::nullopt;
    }
    if (auto const uplink = storage::uplink_at(transaction_, port->number)) {
      return place_of_uplink(*uplink);
    }
    auto const device = storage::device_of(transaction_, port->number);
    return device ? std::optional(Place{.port = device->number, .is_uplink = false}) : std::nullopt;
  }
  std::optional<Place> place_of_uplink(std::string_view uplink) {
    if (storage::fabric_of(transaction_, uplink)) {
      refuse_session("names an uplink that is tunnels, which is not done here");
    }
    auto const device = storage::device_of(transaction_, uplink);
    return device ? std::optional(Place{.port = device->number, .is_uplink = true}) : std::nullopt;
  }

  // What no frame reaches is all of each.
  static std::uint16_t snap_length(std::uint32_t bytes) {
    return bytes < UINT16_MAX ? static_cast<std::uint16_t>(bytes) : 0;
  }
  [[noreturn]] void refuse_session(std::string const &why) const {
    throw Refused(QEX_NOT_SUPPORTED, "the mirror session '" + name_ + "' " + why);
  }

  storage::Transaction &transaction_;
  storage::SwitchKey key_;
  Network &network_;
  std::string name_;
};

}  // namespace

SessionAt session_at(std::uint32_t id) {
  auto const owner = id >> kSessionBits;
  auto const number = id & ((1U << kSessionBits) - 1);
  return {.port = owner == 0 ? std::nullopt : std::optional(storage::PortNumber{owner}),
          .index = std::size_t{number} - 1};
}

void read_mirrors(storage::Transaction &transaction, storage::SwitchKey key, Network &network) {
  Sessions sessions(transaction, key, network);
  sessions.add_table(
      0, effective(transaction, mirror::uplink_sessions, storage::PropertyOwner::global(key)));
  for (auto const &[port, table] : list_stored_at_ports(transaction, mirror::sessions, key)) {
    sessions.add_table(static_cast<std::uint32_t>(port), mirror::Table::from(table));
  }
}

bool has_mirror_sessions(storage::Transaction &transaction, storage::SwitchKey key) {
  auto const owner = storage::PropertyOwner::global(key);
  return !effective(transaction, mirror::uplink_sessions, owner).sessions.empty() ||
         !list_stored_at_ports(transaction, mirror::sessions, key).empty();
}

}  // namespace simhost::openvswitch
