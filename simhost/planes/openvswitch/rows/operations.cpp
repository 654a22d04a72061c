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
