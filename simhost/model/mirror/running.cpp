// Reading the tables that the ports hold.
#include "model/mirror/running.h"

#include <optional>
#include <set>
#include <utility>

#include "base/bytes.h"
#include "model/mirror/properties.h"
#include "model/properties/properties.h"
#include "model/security/properties.h"

namespace simhost {
namespace {

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
  auto const owner = storage::PropertyOwner::port(port.switch_key, port.number);
  auto const forbidden = effective(transaction, security::forbids, owner).flags;
  return (forbidden & VSPORT_SECURITY_DISALLOW_PROMISC) == 0;
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
  for (auto const &[number, table] : list_stored_at_ports(transaction, mirror::sessions, key)) {
    auto const port = storage::get_port_row(transaction, number);
    for (auto &session : mirror::Table::from(table).sessions) {
      sessions.push_back(
          {.port = port, .record = session.record, .destinations = std::move(session.to)});
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
