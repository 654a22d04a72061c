// Reading the tables that the ports hold.
#include "model/mirror/running.h"

#include <algorithm>
#include <cstring>
#include <optional>
#include <set>
#include <span>

#include "base/bytes.h"
#include "model/properties/properties.h"
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

void append_sessions(std::vector<MirrorSession> &sessions, storage::Port const &port,
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

std::optional<storage::Port> port_named_by(storage::Transaction &transaction,
                                           storage::SwitchKey key, DVMirrorEntity const &entity) {
  switch (entity.type) {
    case MIRROR_ENTTYPE_DVPORT:
      return storage::find_port(transaction, key, text_in(entity.dvPortId));
    case MIRROR_ENTTYPE_PORT: {
      auto port = storage::find_port(transaction, storage::PortNumber{entity.portId});
      return port && port->switch_key == key ? port : std::nullopt;
    }
    default:
      return std::nullopt;
  }
}

bool may_be_promiscuous(storage::Transaction &transaction, storage::Port const &port) {
  RecordProperty<VSPropSecurity> const security{.key = VSPROP_PORT_SECURITY, .unset = {}};
  auto const owner = storage::PropertyOwner::port(port.switch_key, port.number);
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

std::vector<MirrorSession> mirrors_of(storage::Transaction &transaction, storage::SwitchKey key) {
  std::vector<MirrorSession> sessions;
  for (auto const &port : storage::ports_of(transaction, key)) {
    auto const owner = storage::PropertyOwner::port(key, port.number);
    if (auto const table = get_property(transaction, owner, VSPROP_PORT_MIRROR_SESSIONS)) {
      append_sessions(sessions, port, table->value);
    }
  }
  return sessions;
}

std::vector<storage::PortNumber> promiscuous_ports(storage::Transaction &transaction,
                                                   storage::SwitchKey key) {
  std::set<storage::PortNumber> ports;
  auto const add = [&](std::optional<storage::Port> const &port) {
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
