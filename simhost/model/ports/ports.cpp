// Ports over the store: bounds, what they are called, which uplink is where.
#include "model/ports/ports.h"

#include <fmt/format.h>

#include <algorithm>
#include <set>

#include "base/outcomes.h"
#include "base/utf8.h"
#include "model/lookup.h"
#include "model/ports/properties.h"
#include "model/properties/properties.h"
#include "qexapi/switch_ports.h"
#include "storage/store.h"
#include "storage/switches.h"
#include "storage/tunnels/fabrics.h"
#include "vswitch/teaming.h"
#include "vswitch/uplinks.h"

namespace simhost {
namespace {

static_assert(QEX_NEB_PORT_ALIAS_MAX_LEN == QEX_NEB_NAME_MAX_LEN,
              "an uplink port's alias is its name");

void check_name(std::string_view name, std::size_t longest) {
  if (name.empty()) {
    throw Refused(QEX_BAD_PARAM);
  }
  if (name.size() > longest) {
    throw Refused(QEX_NAME_TOO_LONG);
  }
  require_utf8(name);
}

storage::Port added_port(storage::ChangingTransaction &transaction, storage::SwitchKey switch_key,
                         std::string_view identifier, storage::PortKind kind) {
  check_name(identifier, kLongestIdentifier);
  auto const number = storage::add_port(transaction, switch_key, identifier, kind);
  if (!number) {
    throw Refused(QEX_EXISTS);
  }
  return {.number = *number,
          .switch_key = switch_key,
          .identifier = std::string(identifier),
          .kind = kind};
}

std::string name_of(storage::Transaction &transaction, storage::Port const &port) {
  return alias_of(transaction, port).value_or(port.identifier);
}

void check_uplink_ports(std::vector<UplinkPort> const &ports) {
  if (ports.size() > QEX_TEAM_MAX_UPLINKS) {
    throw Refused(QEX_LIMIT_EXCEEDED);
  }
  std::set<std::string_view> names;
  std::set<std::string_view> identifiers;
  for (auto const &port : ports) {
    check_name(port.name, kLongestName);
    check_name(port.identifier, kLongestIdentifier);
    if (!names.insert(port.name).second || !identifiers.insert(port.identifier).second) {
      throw Refused(QEX_EXISTS);
    }
  }
}

// An uplink port of that identifier, whether or not the switch has it yet.
storage::Port uplink_port(storage::ChangingTransaction &transaction, storage::SwitchKey switch_key,
                          std::string const &identifier) {
  auto const found = storage::find_port(transaction, switch_key, identifier);
  if (!found) {
    return add_vacant_uplink_port(transaction, switch_key, identifier);
  }
  if (found->kind != storage::PortKind::uplink) {
    throw Refused(QEX_EXISTS);
  }
  return *found;
}

bool is_name_of(std::vector<UplinkPort> const &ports, std::string_view name) {
  return std::any_of(ports.begin(), ports.end(),
                     [&](UplinkPort const &port) { return port.name == name; });
}

// "uplink1", "uplink2", ...: the first that no port of the switch is called.
std::string fresh_uplink_identifier(storage::Transaction &transaction,
                                    storage::SwitchKey switch_key) {
  auto const ports = named_uplink_ports(transaction, switch_key);
  for (unsigned number = 1;; ++number) {
    auto identifier = "uplink" + std::to_string(number);
    if (!storage::find_port(transaction, switch_key, identifier) &&
        !is_name_of(ports, identifier)) {
      return identifier;
    }
  }
}

storage::Port vacant_uplink_port(storage::ChangingTransaction &transaction,
                                 storage::SwitchKey switch_key) {
  auto const ports = storage::uplink_ports_of(transaction, switch_key);
  auto const vacant = std::find_if(ports.begin(), ports.end(), [&](storage::Port const &port) {
    return !storage::uplink_at(transaction, port.number);
  });
  if (vacant != ports.end()) {
    return *vacant;
  }
  return add_vacant_uplink_port(transaction, switch_key,
                                fresh_uplink_identifier(transaction, switch_key));
}

// A count and as many texts of `Width` bytes.
template <std::size_t Width>
Bytes list_of(std::vector<UplinkPort> const &ports, std::string UplinkPort::*text) {
  auto const count = static_cast<qex_uint32>(ports.size());
  auto list = copied(bytes_of(count));
  for (auto const &port : ports) {
    auto const field = list.insert(list.end(), Width, std::byte{0});
    auto const bytes = std::as_bytes(std::span(port.*text));
    std::copy(bytes.begin(), bytes.end(), field);
  }
  return list;
}

template <std::size_t Width>
std::vector<std::string> texts_of(BytesView list) {
  auto const count = record_at<qex_uint32>(list);
  auto const fields = list.subspan(sizeof count);
  if (fields.size() != std::size_t{count} * Width) {
    throw Refused(QEX_BAD_PARAM);
  }
  std::vector<std::string> texts;
  for (std::size_t at = 0; at < fields.size(); at += Width) {
    auto const *const text = reinterpret_cast<char const *>(&fields[at]);
    texts.emplace_back(text_in(std::span(text, Width)));
  }
  return texts;
}

}  // namespace

storage::Port add_client_port(storage::ChangingTransaction &transaction,
                              storage::SwitchKey switch_key, std::string_view identifier) {
  auto port = added_port(transaction, switch_key, identifier, storage::PortKind::client);
  auto const count = storage::count_ports(transaction, switch_key, storage::PortKind::client);
  auto const most = storage::get_switch_row(transaction, switch_key).row.max_ports;
  if (count > most) {
    throw Refused(QEX_LIMIT_EXCEEDED,
                  fmt::format("the switch has the {} ports that max_ports allows", most));
  }
  return port;
}

storage::Port add_vacant_uplink_port(storage::ChangingTransaction &transaction,
                                     storage::SwitchKey switch_key, std::string_view identifier) {
  auto port = added_port(transaction, switch_key, identifier, storage::PortKind::uplink);
  auto const count = storage::count_ports(transaction, switch_key, storage::PortKind::uplink);
  if (count > QEX_TEAM_MAX_UPLINKS) {
    throw Refused(QEX_LIMIT_EXCEEDED);
  }
  return port;
}

void set_external_id(storage::ChangingTransaction &transaction, storage::Port const &port,
                     std::string_view external_id) {
  check_name(external_id, kLongestIdentifier);
  if (!storage::set_external_id(transaction, port.number, external_id)) {
    throw Refused(QEX_EXISTS);
  }
}

void remove_port(storage::ChangingTransaction &transaction, storage::Port const &port) {
  if (storage::uplink_at(transaction, port.number)) {
    throw Refused(QEX_BUSY);
  }
  storage::remove_port(transaction, port.number);
}

storage::Port get_external_port(storage::Transaction &transaction, storage::SwitchKey switch_key,
                                std::string_view external_id) {
  auto port = storage::find_port_by_external_id(transaction, switch_key, external_id);
  if (!port) {
    throw Refused(QEX_NOT_FOUND);
  }
  return *std::move(port);
}

storage::Port get_uplink_port(storage::Transaction &transaction, storage::SwitchKey switch_key,
                              std::uint32_t number) {
  auto port = storage::find_port(transaction, storage::PortNumber(number));
  if (!port || port->switch_key != switch_key || port->kind != storage::PortKind::uplink) {
    throw Refused(QEX_NOT_FOUND);
  }
  return *std::move(port);
}

DVSPortType type_of(storage::Transaction &transaction, storage::Port const &port) {
  return static_cast<DVSPortType>(effective(transaction, ports::type, owner_of(port)));
}

std::uint32_t connect_id_of(storage::Transaction &transaction, storage::Port const &port) {
  return effective(transaction, ports::connection, owner_of(port));
}

std::vector<DVPortData> ports_of_type(storage::Transaction &transaction,
                                      storage::SwitchKey switch_key, DVSPortType type) {
  std::vector<DVPortData> entries;
  for (auto const &port : storage::ports_of(transaction, switch_key)) {
    if (type_of(transaction, port) == type) {
      auto &entry = entries.emplace_back();
      put_text(entry.dvPortId, port.identifier);
      entry.connectId = connect_id_of(transaction, port);
    }
  }
  return entries;
}

std::optional<std::string> alias_of(storage::Transaction &transaction, storage::Port const &port) {
  return find_value(transaction, ports::alias, owner_of(port));
}

std::vector<UplinkPort> named_uplink_ports(storage::Transaction &transaction,
                                           storage::SwitchKey switch_key) {
  std::vector<UplinkPort> ports;
  for (auto const &port : storage::uplink_ports_of(transaction, switch_key)) {
    ports.push_back({.name = name_of(transaction, port), .identifier = port.identifier});
  }
  return ports;
}

void check_port_alias(Setting const &setting) {
  auto const alias = text_of(setting.value);
  auto const port = storage::get_port_row(setting.transaction, setting.owner.port_number.value());
  if (port.kind != storage::PortKind::uplink) {
    return;
  }
  check_name(alias, kLongestName);
  auto others = named_uplink_ports(setting.transaction, port.switch_key);
  std::erase_if(others,
                [&](UplinkPort const &other) { return other.identifier == port.identifier; });
  if (is_name_of(others, alias)) {
    throw Refused(QEX_EXISTS, fmt::format("another uplink port is called '{}'", alias));
  }
}

void set_uplink_ports(storage::ChangingTransaction &transaction, storage::SwitchKey switch_key,
                      std::vector<UplinkPort> const &ports) {
  check_uplink_ports(ports);
  for (auto const &port : storage::uplink_ports_of(transaction, switch_key)) {
    if (std::none_of(ports.begin(), ports.end(),
                     [&](UplinkPort const &kept) { return kept.identifier == port.identifier; })) {
      storage::remove_port(transaction, port.number);
    }
  }
  for (auto const &[name, identifier] : ports) {
    auto const port = uplink_port(transaction, switch_key, identifier);
    if (name_of(transaction, port) != name) {
      // They are right together, if not one after the other: two may exchange their names.
      storage::put_property(transaction, owner_of(port), ports::alias.key, bytes_of_text(name),
                            ports::alias.type);
    }
  }
}

void add_uplink_port(storage::ChangingTransaction &transaction, storage::SwitchKey switch_key,
                     std::string_view uplink) {
  auto const found = get_uplink(transaction, uplink);
  if (found.port) {
    bool const here = get_port(transaction, *found.port).switch_key == switch_key;
    throw Refused(here ? QEX_EXISTS : QEX_BUSY,
                  fmt::format("the uplink '{}' is at {}", uplink,
                              here ? "this switch already" : "another switch"));
  }
  if (auto const fabric = storage::fabric_of(transaction, uplink);
      fabric && fabric->switch_key != switch_key) {
    throw Refused(QEX_BUSY,
                  fmt::format("the uplink '{}' is the tunnels of another switch", uplink));
  }
  storage::attach_uplink(transaction, uplink, vacant_uplink_port(transaction, switch_key).number);
}

void remove_uplink_port(storage::ChangingTransaction &transaction, storage::SwitchKey switch_key,
                        std::string_view uplink) {
  auto const found = storage::find_uplink(transaction, uplink);
  if (!found || !found->port ||
      storage::get_port_row(transaction, *found->port).switch_key != switch_key) {
    throw Refused(QEX_NOT_FOUND);
  }
  storage::remove_port(transaction, *found->port);
}

std::vector<UplinkPort> uplink_ports_in(BytesView names, BytesView identifiers) {
  auto const name_texts = texts_of<QEX_NEB_NAME_MAX_LEN>(names);
  auto const identifier_texts = texts_of<QEX_NEB_PORT_ID_MAX_LEN>(identifiers);
  if (name_texts.size() != identifier_texts.size()) {
    throw Refused(QEX_BAD_PARAM);
  }
  std::vector<UplinkPort> ports;
  for (std::size_t at = 0; at < name_texts.size(); ++at) {
    ports.push_back({.name = name_texts[at], .identifier = identifier_texts[at]});
  }
  return ports;
}

Bytes read_uplink_names(storage::Transaction &transaction, storage::PropertyOwner const &owner) {
  return list_of<QEX_NEB_NAME_MAX_LEN>(named_uplink_ports(transaction, owner.switch_key),
                                       &UplinkPort::name);
}

Bytes read_uplink_ids(storage::Transaction &transaction, storage::PropertyOwner const &owner) {
  return list_of<QEX_NEB_PORT_ID_MAX_LEN>(named_uplink_ports(transaction, owner.switch_key),
                                          &UplinkPort::identifier);
}

void write_uplink_names(Setting const &setting) {
  auto const names = texts_of<QEX_NEB_NAME_MAX_LEN>(setting.value);
  auto ports = named_uplink_ports(setting.transaction, setting.owner.switch_key);
  ports.resize(std::min(ports.size(), names.size()));
  for (std::size_t at = 0; at < names.size(); ++at) {
    if (at < ports.size()) {
      ports[at].name = names[at];
    } else {
      ports.push_back({.name = names[at], .identifier = names[at]});
    }
  }
  set_uplink_ports(setting.transaction, setting.owner.switch_key, ports);
}

void write_uplink_ids(Setting const &setting) {
  auto const before = named_uplink_ports(setting.transaction, setting.owner.switch_key);
  std::vector<UplinkPort> ports;
  for (auto const &identifier : texts_of<QEX_NEB_PORT_ID_MAX_LEN>(setting.value)) {
    auto const kept = std::find_if(before.begin(), before.end(), [&](UplinkPort const &port) {
      return port.identifier == identifier;
    });
    ports.push_back(
        kept != before.end() ? *kept : UplinkPort{.name = identifier, .identifier = identifier});
  }
  set_uplink_ports(setting.transaction, setting.owner.switch_key, ports);
}

}  // namespace simhost
