// Reading rows and writing operations.
#include "planes/openvswitch/rows/rows.h"

#include <fmt/format.h>

#include <algorithm>
#include <exception>
#include <set>
#include <stdexcept>
#include <utility>

namespace simhost::openvswitch {
namespace {

// In external_ids of a bridge: whose it is.
constexpr auto *kHost = "simhost";
// In external_ids of Open_vSwitch: who writes all of those.
constexpr auto *kOwner = "simhostd";
constexpr auto *kMostTags = "vlan-limit";

Json const kEverywhere = Json::array();

Json map_of(std::map<std::string, std::string> const &entries) {
  return ovsdb::map({entries.begin(), entries.end()});
}

Json is(Json const &id) {
  return Json::array({{"_uuid", "==", id}});
}

Json insert(std::string const &table, std::string const &name, Json row) {
  return {{"op", "insert"}, {"table", table}, {"row", std::move(row)}, {"uuid-name", name}};
}

Json update(std::string const &table, Json where, Json row) {
  return {{"op", "update"}, {"table", table}, {"where", std::move(where)}, {"row", std::move(row)}};
}

Json mutate(std::string const &table, Json where, Json mutations) {
  return {{"op", "mutate"},
          {"table", table},
          {"where", std::move(where)},
          {"mutations", std::move(mutations)}};
}

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

// What each row of this host's says, whoever else writes there; as a replica has it.
ovsdb::Row const kBridge{{"fail_mode", ovsdb::set({"secure"})},
                         {"protocols", ovsdb::set({"OpenFlow15"})},
                         {"controller", ovsdb::set({})},
                         {"mirrors", ovsdb::set({})},
                         {"other_config", map_of({{"disable-in-band", "true"}})}};
ovsdb::Row const kPort{
    {"tag", ovsdb::set({})}, {"trunks", ovsdb::set({})}, {"vlan_mode", ovsdb::set({})}};
ovsdb::Row const kInterface{{"type", ""}, {"ingress_policing_rate", 0}};

bool says(ovsdb::Row const &row, ovsdb::Row const &what) {
  return std::ranges::all_of(
      what, [&](auto const &column) { return row.at(column.first) == column.second; });
}

Json json_of(ovsdb::Row const &row) {
  Json all = Json::object();
  for (auto const &[column, value] : row) {
    all[column] = value;
  }
  return all;
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

// Names of rows within one transaction.
class Names {
 public:
  std::string next() { return fmt::format("row{}", next_++); }

 private:
  int next_ = 0;
};

class Writer {
 public:
  explicit Writer(std::string_view host) : host_(host) {}

  void begin() { told_.push_back(insert("Open_vSwitch", names_.next(), Json::object())); }

  void add(BridgeRow const &wanted) {
    auto const own = added_port(wanted.name, 0);
    auto ports = added_ports(wanted.devices, {});
    ports.push_back(ovsdb::named_uuid(own));
    auto const name = names_.next();
    auto row = json_of(kBridge);
    row.update({{"name", wanted.name},
                {"datapath_type", wanted.datapath},
                {"external_ids", map_of({{kHost, host_}})},
                {"flow_tables", flow_tables(wanted)},
                {"ports", ovsdb::set(ports)}});
    told_.push_back(insert("Bridge", name, std::move(row)));
    told_.push_back(
        mutate("Open_vSwitch", kEverywhere,
               Json::array({{"bridges", "insert", ovsdb::set({ovsdb::named_uuid(name)})}})));
  }

  // The rows of its parts go with it: nothing refers to them any more.
  void remove(PresentBridge const &present) {
    told_.push_back(
        mutate("Open_vSwitch", kEverywhere,
               Json::array({{"bridges", "delete", ovsdb::set({ovsdb::uuid(present.id)})}})));
  }

  void change(PresentBridge const &present, BridgeRow const &wanted) {
    if (present.is_altered) {
      told_.push_back(update("Bridge", is(ovsdb::uuid(present.id)), json_of(kBridge)));
    }
    Json mutations = Json::array();
    std::vector<Json> gone;
    for (auto const &[device, number] : present.row.devices) {
      auto const kept = wanted.devices.find(device);
      if (kept == wanted.devices.end() || kept->second != number) {
        gone.push_back(ovsdb::uuid(present.ports.at(device)));
      }
    }
    if (!gone.empty()) {
      mutations.push_back({"ports", "delete", ovsdb::set(gone)});
    }
    if (auto const added = added_ports(wanted.devices, present.row.devices); !added.empty()) {
      mutations.push_back({"ports", "insert", ovsdb::set(added)});
    }
    if (!mutations.empty()) {
      told_.push_back(mutate("Bridge", is(ovsdb::uuid(present.id)), std::move(mutations)));
    }
    if (wanted.limits != present.row.limits) {
      auto tables = flow_tables(wanted);
      told_.push_back(
          update("Bridge", is(ovsdb::uuid(present.id)), {{"flow_tables", std::move(tables)}}));
    }
  }

  void sign(std::string const &owner) {
    std::string const key = kOwner;
    told_.push_back(mutate("Open_vSwitch", kEverywhere,
                           Json::array({{"external_ids", "delete", ovsdb::set({key})},
                                        {"external_ids", "insert", map_of({{key, owner}})}})));
  }

  void allow_tags(std::uint32_t most_tags) {
    std::string const key = kMostTags;
    told_.push_back(mutate(
        "Open_vSwitch", kEverywhere,
        Json::array({{"other_config", "delete", ovsdb::set({key})},
                     {"other_config", "insert", map_of({{key, std::to_string(most_tags)}})}})));
  }

  Json told() && { return std::move(told_); }

 private:
  // The row of a port, with that of its interface; 0 is the bridge's own.
  std::string added_port(std::string const &device, std::uint16_t number) {
    auto const interface = names_.next();
    Json row{{"name", device}};
    if (number == 0) {
      row["type"] = "internal";
    } else {
      row["ofport_request"] = number;
    }
    told_.push_back(insert("Interface", interface, std::move(row)));
    auto port = names_.next();
    told_.push_back(
        insert("Port", port, {{"name", device}, {"interfaces", ovsdb::named_uuid(interface)}}));
    return port;
  }

  // Those that are not there with their number.
  std::vector<Json> added_ports(std::map<std::string, std::uint16_t> const &wanted,
                                std::map<std::string, std::uint16_t> const &present) {
    std::vector<Json> added;
    for (auto const &[device, number] : wanted) {
      auto const found = present.find(device);
      if (found == present.end() || found->second != number) {
        added.push_back(ovsdb::named_uuid(added_port(device, number)));
      }
    }
    return added;
  }

  Json flow_tables(BridgeRow const &wanted) {
    std::vector<std::pair<Json, Json>> tables;
    for (auto const &[table, limit] : wanted.limits) {
      auto const name = names_.next();
      told_.push_back(
          insert("Flow_Table", name, {{"flow_limit", limit}, {"overflow_policy", "refuse"}}));
      tables.emplace_back(table, ovsdb::named_uuid(name));
    }
    return ovsdb::map(tables);
  }

  std::string host_;
  Names names_;
  Json told_ = Json::array();
};

// What is fixed once the bridge is there.
bool is_same_bridge(PresentBridge const &present, BridgeRow const &wanted) {
  return present.row.name == wanted.name && present.row.datapath == wanted.datapath;
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

Json operations(PresentRows const &present, std::span<BridgeRow const> wanted,
                std::string_view host, std::string_view owner, std::uint32_t most_tags) {
  Writer writer(host);
  if (present.is_new) {
    writer.begin();
  }
  std::set<std::string> kept;
  for (auto const &bridge : wanted) {
    auto const found = std::ranges::find_if(
        present.bridges, [&](auto const &there) { return is_same_bridge(there, bridge); });
    if (found == present.bridges.end()) {
      writer.add(bridge);
    } else {
      kept.insert(found->id);
      writer.change(*found, bridge);
    }
  }
  for (auto const &bridge : present.bridges) {
    if (!kept.contains(bridge.id)) {
      writer.remove(bridge);
    }
  }
  if (present.owner != owner) {
    writer.sign(std::string(owner));
  }
  if (present.most_tags != most_tags && !wanted.empty()) {
    writer.allow_tags(most_tags);
  }
  return std::move(writer).told();
}

}  // namespace simhost::openvswitch
