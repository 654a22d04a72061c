// Reading rows.
#include <fmt/format.h>

#include <algorithm>
#include <exception>
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

void add_device(PresentBridge &bridge, std::string const &port_id, Tables const &tables) {
  auto const &port = tables.ports.at(port_id);
  auto const name = port.at("name").get<std::string>();
  if (name == bridge.row.name) {
    return;  // the bridge's own
  }
  bridge.ports.emplace(name, port_id);
  auto const interfaces = ovsdb::atoms_of(port.at("interfaces"));
  auto const &interface = tables.interfaces.at(id_in(interfaces.at(0)));
  auto const requested = ovsdb::atoms_of(interface.at("ofport_request"));
  bool const is_ours = interfaces.size() == 1 && !requested.empty() && says(port, kPort) &&
                       says(interface, kInterface);
  // No device is wanted with that number, so that one that is not as it should be is put anew.
  bridge.row.devices[name] = is_ours ? requested.front().get<std::uint16_t>() : 0;
}

PresentBridge bridge_of(std::string const &id, ovsdb::Row const &row, Tables const &tables) {
  PresentBridge bridge{.id = id,
                       .row = {.name = row.at("name").get<std::string>(),
                               .datapath = row.at("datapath_type").get<std::string>()},
                       .ports = {},
                       .is_altered = !says(row, kBridge)};
  for (auto const &port : ovsdb::atoms_of(row.at("ports"))) {
    add_device(bridge, id_in(port), tables);
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
      {"Port", {"name", "interfaces", "tag", "trunks", "vlan_mode"}},
      {"Interface", {"name", "ofport_request", "type", "ingress_policing_rate"}},
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
      } else {
        for (auto const &port : ovsdb::atoms_of(row.at("ports"))) {
          present.elsewhere[tables.ports.at(id_in(port)).at("name").get<std::string>()] = name;
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
