// Reading rows.
#include <fmt/format.h>

#include <algorithm>
#include <exception>
#include <optional>
#include <stdexcept>

#include "planes/openvswitch/rows/columns.h"
#include "planes/openvswitch/rows/rows.h"

namespace simhost::openvswitch {
namespace {

std::string text_under(Json const &column, std::string const &wanted) {
  for (auto const &[key, value] : ovsdb::entries_of(column)) {
    if (key == wanted) {
      return value.get<std::string>();
    }
  }
  return {};
}

std::map<std::string, std::string> texts_of(Json const &column) {
  std::map<std::string, std::string> texts;
  for (auto const &[key, value] : ovsdb::entries_of(column)) {
    texts.emplace(key.get<std::string>(), value.get<std::string>());
  }
  return texts;
}

std::string id_in(Json const &column) {
  return column.at(1).get<std::string>();
}

[[noreturn]] void refuse(std::exception const &error) {
  throw std::runtime_error(
      fmt::format("Open vSwitch's database has rows that do not fit together: {}", error.what()));
}

bool says(ovsdb::Row const &row, ovsdb::Row const &what) {
  return std::ranges::all_of(
      what, [&](auto const &column) { return row.at(column.first) == column.second; });
}

struct Tables {
  ovsdb::Rows const &ports;
  ovsdb::Rows const &interfaces;
  ovsdb::Rows const &flow_tables;
};

// No device is wanted with the number 0, so that one that is not as it should be is put anew.
std::uint16_t number_of(ovsdb::Row const &interface, bool is_ours) {
  auto const requested = ovsdb::atoms_of(interface.at("ofport_request"));
  return is_ours && !requested.empty() ? requested.front().get<std::uint16_t>() : 0;
}

LagRow lag_of(ovsdb::Row const &port) {
  auto const &config = port.at("other_config");
  return {.devices = {},
          .system = text_under(config, "lacp-system-id"),
          .is_fast = text_under(config, "lacp-time") == "fast"};
}

std::uint16_t key_of(ovsdb::Row const &interface) {
  auto const key = text_under(interface.at("other_config"), "lacp-aggregation-key");
  return key.empty() ? 0 : static_cast<std::uint16_t>(std::stoul(key));
}

void add_lag(PresentBridge &bridge, std::string const &name, ovsdb::Row const &port,
             Tables const &tables) {
  auto &lag = bridge.row.lags[name];
  lag = lag_of(port);
  if (!says(port, lag_columns(lag))) {
    bridge.altered_lags.insert(name);
  }
  for (auto const &atom : ovsdb::atoms_of(port.at("interfaces"))) {
    auto const &interface = tables.interfaces.at(id_in(atom));
    auto const device = interface.at("name").get<std::string>();
    if (lag.devices.empty()) {
      lag.key = key_of(interface);
    }
    lag.devices.insert(device);
    bridge.interfaces.emplace(device, id_in(atom));
    bridge.row.devices[device] = number_of(interface, says(interface, member_columns(lag)));
  }
}

void add_port(PresentBridge &bridge, std::string const &port_id, Tables const &tables) {
  auto const &port = tables.ports.at(port_id);
  auto const name = port.at("name").get<std::string>();
  if (name == bridge.row.name) {
    return;  // the bridge's own
  }
  bridge.ports.emplace(name, port_id);
  if (is_name_of_lag(name, bridge.row.name)) {
    add_lag(bridge, name, port, tables);
    return;
  }
  auto const interfaces = ovsdb::atoms_of(port.at("interfaces"));
  auto const &interface = tables.interfaces.at(id_in(interfaces.at(0)));
  bool const is_ours = interfaces.size() == 1 && says(port, kPort) && says(interface, kInterface);
  auto const number = number_of(interface, is_ours);
  if (auto const type = interface.at("type").get<std::string>(); type.empty()) {
    bridge.row.devices[name] = number;
  } else {
    bridge.row.tunnels[name] = {
        .number = number, .type = type, .options = texts_of(interface.at("options"))};
  }
}

// Nothing if it can be used, or was not tried yet.
std::optional<std::string> error_of(ovsdb::Row const &interface) {
  if (auto const errors = ovsdb::atoms_of(interface.at("error")); !errors.empty()) {
    return errors.front().get<std::string>();
  }
  constexpr int kNone = -1;
  auto const numbers = ovsdb::atoms_of(interface.at("ofport"));
  bool const has_number = numbers.empty() || numbers.front() != kNone;
  return has_number ? std::nullopt : std::optional<std::string>("its log says why");
}

void add_errors(ovsdb::Row const &bridge, Tables const &tables,
                std::map<std::string, std::string> &errors) {
  for (auto const &port : ovsdb::atoms_of(bridge.at("ports"))) {
    for (auto const &id : ovsdb::atoms_of(tables.ports.at(id_in(port)).at("interfaces"))) {
      auto const &interface = tables.interfaces.at(id_in(id));
      if (auto error = error_of(interface)) {
        errors.emplace(interface.at("name").get<std::string>(), *std::move(error));
      }
    }
  }
}

std::vector<std::string> devices_at(ovsdb::Row const &bridge, Tables const &tables) {
  std::vector<std::string> devices;
  for (auto const &port : ovsdb::atoms_of(bridge.at("ports"))) {
    for (auto const &interface : ovsdb::atoms_of(tables.ports.at(id_in(port)).at("interfaces"))) {
      devices.push_back(tables.interfaces.at(id_in(interface)).at("name").get<std::string>());
    }
  }
  return devices;
}

PresentBridge bridge_of(std::string const &id, ovsdb::Row const &row, Tables const &tables) {
  PresentBridge bridge{
      .id = id,
      .row = {.name = row.at("name").get<std::string>(),
              .datapath = row.at("datapath_type").get<std::string>(),
              .is_underlay = text_under(row.at("external_ids"), kRole) == kUnderlay,
              .address = text_under(row.at("other_config"), kAddress)},
      .ports = {}};
  bridge.is_altered = !says(row, settings_of(bridge.row));
  for (auto const &port : ovsdb::atoms_of(row.at("ports"))) {
    add_port(bridge, id_in(port), tables);
  }
  for (auto const &[number, table] : ovsdb::entries_of(row.at("flow_tables"))) {
    for (auto const &limit :
         ovsdb::atoms_of(tables.flow_tables.at(id_in(table)).at("flow_limit"))) {
      bridge.row.limits[number.get<std::uint8_t>()] = limit.get<std::uint32_t>();
    }
  }
  return bridge;
}

}  // namespace

void select_rows(ovsdb::Selected &selected) {
  ovsdb::Selected const read{
      {"Open_vSwitch", {"external_ids", "other_config"}},
      {"Bridge",
       {"name", "datapath_type", "ports", "external_ids", "flow_tables", "fail_mode", "protocols",
        "controller", "mirrors", "other_config"}},
      {"Port", {"name", "interfaces", "tag", "trunks", "vlan_mode", "lacp", "other_config"}},
      {"Interface",
       {"name", "ofport_request", "type", "options", "ingress_policing_rate", "other_config",
        "error", "ofport"}},
      {"Flow_Table", {"flow_limit"}}};
  for (auto const &[table, columns] : read) {
    auto &known = selected[table];
    known.insert(known.end(), columns.begin(), columns.end());
  }
}

PresentRows present_rows(ovsdb::Replica const &replica, std::string_view host) {
  try {
    PresentRows present;
    for (auto const &[id, row] : replica.rows("Open_vSwitch")) {
      present.is_new = false;
      present.owner = text_under(row.at("external_ids"), kOwner);
      auto const tags = text_under(row.at("other_config"), kMostTags);
      present.most_tags = tags.empty() ? 0 : static_cast<std::uint32_t>(std::stoul(tags));
    }
    Tables const tables{.ports = replica.rows("Port"),
                        .interfaces = replica.rows("Interface"),
                        .flow_tables = replica.rows("Flow_Table")};
    for (auto const *const device : {"ovs-netdev", "ovs-system"}) {
      present.elsewhere[device] = device;
    }
    for (auto const &[id, row] : replica.rows("Bridge")) {
      auto const name = row.at("name").get<std::string>();
      if (text_under(row.at("external_ids"), kHost) == host) {
        present.bridges.push_back(bridge_of(id, row, tables));
        present.elsewhere[name] = name;
        add_errors(row, tables, present.errors);
      } else {
        for (auto const &device : devices_at(row, tables)) {
          present.elsewhere[device] = name;
        }
      }
    }
    return present;
  } catch (std::logic_error const &error) {
    refuse(error);
  } catch (Json::exception const &error) {
    refuse(error);
  }
}

}  // namespace simhost::openvswitch
