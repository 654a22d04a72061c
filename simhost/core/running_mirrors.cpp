// Reading the tables that the ports hold.
#include "core/running_mirrors.h"

#include <algorithm>
#include <cstring>
#include <optional>
#include <set>
#include <span>

#include "core/bytes.h"
#include "core/properties.h"
#include "vswitch/port_policies.h"
#include "vswitch/properties.h"

namespace simhost {
namespace {

// The records from the first on; those of them that are there.
template <typename Record>
std::vector<Record> records(std::span<std::byte const> bytes, std::size_t first,
                            std::size_t count) {
  auto const there = bytes.size() / sizeof(Record);
  auto const begin = std::min(first, there);
  std::vector<Record> found(std::min(count, there - begin));
  if (!found.empty()) {
    std::memcpy(found.data(), &bytes[begin * sizeof(Record)], found.size() * sizeof(Record));
  }
  return found;
}

void append_sessions(std::vector<MirrorSession> &sessions, store::Port const &port,
                     std::span<std::byte const> table) {
  DVMirrorSessionTable head;
  if (table.size() < sizeof head) {
    return;
  }
  std::memcpy(&head, table.data(), sizeof head);
  auto const rest = table.subspan(sizeof head);
  auto const records_found = records<DVMirrorSession>(rest, 0, head.numSessions);
  auto const entities = rest.subspan(records_found.size() * sizeof(DVMirrorSession));
  for (auto const &record : records_found) {
    sessions.push_back({.port = port,
                        .record = record,
                        .destinations = records<DVMirrorEntity>(entities, record.startIdx,
                                                                record.numDstEntities)});
  }
}

std::optional<store::Port> port_named_by(store::Transaction &transaction, store::SwitchKey key,
                                         DVMirrorEntity const &entity) {
  switch (entity.type) {
    case MIRROR_ENTTYPE_DVPORT:
      return store::find_port(transaction, key, text_in(entity.dvPortId));
    case MIRROR_ENTTYPE_PORT: {
      auto port = store::find_port(transaction, store::PortNumber{entity.portId});
      return port && port->switch_key == key ? port : std::nullopt;
    }
    default:
      return std::nullopt;
  }
}

bool may_be_promiscuous(store::Transaction &transaction, store::Port const &port) {
  RecordProperty<VSPropSecurity> const security{.key = VSPROP_PORT_SECURITY, .unset = {}};
  auto const owner = store::PropertyOwner::port(port.switch_key, port.number);
  return (read(transaction, owner, security).flags & VSPORT_SECURITY_DISALLOW_PROMISC) == 0;
}

}  // namespace

std::string MirrorSession::sid() const {
  return std::string(text_in(record.sid));
}

bool MirrorSession::runs() const {
  return (record.flags & VS_DVMIRROR_FLAG_DISABLED) == 0;
}

bool MirrorSession::is_promiscuous() const {
  return (record.flags & VS_DVMIRROR_FLAG_LEGACY) != 0 ||
         sid() == VS_DVMIRROR_DEFAULT_LEGACY_SESSION_SID;
}

std::vector<MirrorSession> mirrors_of(store::Transaction &transaction, store::SwitchKey key) {
  std::vector<MirrorSession> sessions;
  for (auto const &port : store::ports_of(transaction, key)) {
    auto const owner = store::PropertyOwner::port(key, port.number);
    if (auto const table = get_property(transaction, owner, VSPROP_PORT_MIRROR_SESSIONS)) {
      append_sessions(sessions, port, table->value);
    }
  }
  return sessions;
}

std::vector<store::PortNumber> promiscuous_ports(store::Transaction &transaction,
                                                 store::SwitchKey key) {
  std::set<store::PortNumber> ports;
  auto const add = [&](std::optional<store::Port> const &port) {
    if (port && may_be_promiscuous(transaction, *port)) {
      ports.insert(port->number);
    }
  };
  for (auto const &session : mirrors_of(transaction, key)) {
    if (!session.runs() || !session.is_promiscuous()) {
      continue;
    }
    if (session.destinations.empty()) {
      add(session.port);
    }
    for (auto const &entity : session.destinations) {
      add(port_named_by(transaction, key, entity));
    }
  }
  return {ports.begin(), ports.end()};
}

}  // namespace simhost
