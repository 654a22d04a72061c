// Writing operations: no more than what differs.
#include <fmt/format.h>

#include <algorithm>
#include <set>
#include <utility>

#include "planes/openvswitch/rows/columns.h"
#include "planes/openvswitch/rows/rows.h"

namespace simhost::openvswitch {
namespace {

Json const kEverywhere = Json::array();

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

Json json_of(ovsdb::Row const &row) {
  Json all = Json::object();
  for (auto const &[column, value] : row) {
    all[column] = value;
  }
  return all;
}

// Names of rows within one transaction.
class Names {
 public:
  std::string next() { return fmt::format("row{}", next_++); }

 private:
  int next_ = 0;
};

// The devices of a port, and the numbers that they have.
using Interfaces = std::map<std::string, std::uint16_t>;

struct PortRow {
  Interfaces interfaces;
  LagRow const *lag = nullptr;        // null for a device by itself
  TunnelRow const *tunnel = nullptr;  // null for a device
};

// Groups without a device are not there.
std::map<std::string, PortRow> ports_of(BridgeRow const &bridge) {
  std::map<std::string, PortRow> ports;
  auto alone = bridge.devices;
  for (auto const &[name, lag] : bridge.lags) {
    for (auto const &device : lag.devices) {
      if (auto node = alone.extract(device)) {
        auto &port = ports[name];
        port.lag = &lag;
        port.interfaces.insert(std::move(node));
      }
    }
  }
  for (auto const &[name, tunnel] : bridge.tunnels) {
    ports.emplace(name, PortRow{.interfaces = {{name, tunnel.number}}, .tunnel = &tunnel});
  }
  for (auto const &[device, number] : alone) {
    ports.emplace(device, PortRow{.interfaces = {{device, number}}});
  }
  return ports;
}

// Whether a port can stay: what is different between two groups is changed in place, so that the
// partners of the others are kept.
bool can_stay(PortRow const &present, PortRow const &wanted) {
  if (present.tunnel != nullptr || wanted.tunnel != nullptr) {
    return present.tunnel != nullptr && wanted.tunnel != nullptr &&
           *present.tunnel == *wanted.tunnel;
  }
  if (present.lag == nullptr || wanted.lag == nullptr) {
    return present.lag == wanted.lag && present.interfaces == wanted.interfaces;
  }
  return true;
}

class Writer {
 public:
  explicit Writer(std::string_view host) : host_(host) {}

  void begin() { told_.push_back(insert("Open_vSwitch", names_.next(), Json::object())); }

  void add(BridgeRow const &wanted) {
    std::vector<Json> ports{added_port(wanted.name, {.interfaces = {{wanted.name, 0}}})};
    for (auto const &[name, port] : ports_of(wanted)) {
      ports.push_back(added_port(name, port));
    }
    auto const name = names_.next();
    std::map<std::string, std::string> whose{{kHost, host_}};
    if (wanted.is_underlay) {
      whose.emplace(kRole, kUnderlay);
    }
    auto row = json_of(settings_of(wanted));
    row.update({{"name", wanted.name},
                {"datapath_type", wanted.datapath},
                {"external_ids", map_of(whose)},
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
      told_.push_back(update("Bridge", is(ovsdb::uuid(present.id)), json_of(settings_of(wanted))));
    }
    change_ports(present, wanted);
    if (wanted.limits != present.row.limits) {
      auto tables = flow_tables(wanted);
      told_.push_back(
          update("Bridge", is(ovsdb::uuid(present.id)), {{"flow_tables", std::move(tables)}}));
    }
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
  void change_ports(PresentBridge const &present, BridgeRow const &wanted) {
    auto there = ports_of(present.row);
    std::vector<Json> added;
    for (auto const &[name, port] : ports_of(wanted)) {
      auto const found = there.find(name);
      if (found != there.end() && can_stay(found->second, port)) {
        if (port.lag != nullptr) {
          change_lag(present, name, found->second, port);
        }
        there.erase(found);
      } else {
        added.push_back(added_port(name, port));
      }
    }
    std::vector<Json> gone;
    gone.reserve(there.size());
    for (auto const &[name, port] : there) {
      gone.push_back(ovsdb::uuid(present.ports.at(name)));
    }
    replace_in("Bridge", present.id, "ports", gone, added);
  }

  void change_lag(PresentBridge const &present, std::string const &name, PortRow const &there,
                  PortRow const &wanted) {
    auto const &id = present.ports.at(name);
    if (present.altered_lags.contains(name) || there.lag->system != wanted.lag->system ||
        there.lag->is_fast != wanted.lag->is_fast) {
      told_.push_back(update("Port", is(ovsdb::uuid(id)), json_of(lag_columns(*wanted.lag))));
    }
    bool const has_key = there.lag->key == wanted.lag->key;
    std::vector<Json> gone;
    std::vector<Json> added;
    auto const is_in = [&](auto const &interface, Interfaces const &others) {
      auto const found = others.find(interface.first);
      return has_key && found != others.end() && found->second == interface.second;
    };
    for (auto const &interface : there.interfaces) {
      if (!is_in(interface, wanted.interfaces)) {
        gone.push_back(ovsdb::uuid(present.interfaces.at(interface.first)));
      }
    }
    for (auto const &[device, number] : wanted.interfaces) {
      if (!is_in(std::pair(device, number), there.interfaces)) {
        added.push_back(added_interface(device, number, wanted));
      }
    }
    replace_in("Port", id, "interfaces", gone, added);
  }

  void replace_in(std::string const &table, std::string const &id, std::string const &column,
                  std::vector<Json> const &gone, std::vector<Json> const &added) {
    Json mutations = Json::array();
    if (!gone.empty()) {
      mutations.push_back({column, "delete", ovsdb::set(gone)});
    }
    if (!added.empty()) {
      mutations.push_back({column, "insert", ovsdb::set(added)});
    }
    if (!mutations.empty()) {
      told_.push_back(mutate(table, is(ovsdb::uuid(id)), std::move(mutations)));
    }
  }

  // 0 is the number of the bridge's own.
  Json added_interface(std::string const &device, std::uint16_t number, PortRow const &port) {
    auto row = port.lag != nullptr ? json_of(member_columns(*port.lag)) : Json::object();
    if (port.tunnel != nullptr) {
      row.update({{"type", port.tunnel->type}, {"options", map_of(port.tunnel->options)}});
    }
    row["name"] = device;
    if (number == 0) {
      row["type"] = "internal";
    } else {
      row["ofport_request"] = number;
    }
    auto const name = names_.next();
    told_.push_back(insert("Interface", name, std::move(row)));
    return ovsdb::named_uuid(name);
  }

  // The row of a port, with those of its interfaces.
  Json added_port(std::string const &name, PortRow const &port) {
    std::vector<Json> interfaces;
    for (auto const &[device, number] : port.interfaces) {
      interfaces.push_back(added_interface(device, number, port));
    }
    auto row = port.lag != nullptr ? json_of(lag_columns(*port.lag)) : Json::object();
    row.update({{"name", name}, {"interfaces", ovsdb::set(interfaces)}});
    auto const id = names_.next();
    told_.push_back(insert("Port", id, std::move(row)));
    return ovsdb::named_uuid(id);
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
  return present.row.name == wanted.name && present.row.datapath == wanted.datapath &&
         present.row.is_underlay == wanted.is_underlay && present.row.address == wanted.address;
}

}  // namespace

Json operations(PresentRows const &present, std::span<BridgeRow const> wanted,
                std::string_view host, std::uint32_t most_tags) {
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
  if (present.most_tags != most_tags && !wanted.empty()) {
    writer.allow_tags(most_tags);
  }
  return std::move(writer).told();
}

Json signature(std::string const &owner) {
  std::string const key = kOwner;
  return mutate("Open_vSwitch", kEverywhere,
                Json::array({{"external_ids", "delete", ovsdb::set({key})},
                             {"external_ids", "insert", map_of({{key, owner}})}}));
}

}  // namespace simhost::openvswitch
