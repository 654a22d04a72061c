// A port belongs to the switch that its row names, and so to a host or not.
#include "fabric/rows/rows.h"

#include <algorithm>
#include <utility>

namespace simhost::fabric {
namespace {

Json settings_in(ovsdb::Row const &row) {
  auto settings = Json::object();
  for (auto const &[name, value] : ovsdb::entries_of(row.at("settings"))) {
    settings[name.get<std::string>()] = value;
  }
  return settings;
}

}  // namespace

ovsdb::Selected selected_columns() {
  return {{"Fabric", {"revision"}},
          {"Switch", {"id", "alias", "hosts", "settings", "writers"}},
          {"Port", {"switch", "id", "host", "settings", "counters"}},
          {"Host", {"name", "state", "session"}},
          {"Drill", {"id", "host", "switch", "reply"}}};
}

Records switches_of(ovsdb::Replica const &replica, std::string const &host) {
  Records records;
  for (auto const &[uuid, row] : replica.rows("Switch")) {
    if (has_host(row, host)) {
      records[switch_in(row)] = {{"alias", row.at("alias")},
                                 {"hosts", ovsdb::atoms_of(row.at("hosts"))},
                                 {"settings", settings_in(row)}};
    }
  }
  return records;
}

bool has_switch(ovsdb::Replica const &replica, std::string const &alias) {
  return std::ranges::any_of(replica.rows("Switch"),
                             [&](auto const &row) { return row.second.at("alias") == alias; });
}

std::int64_t revision_of(ovsdb::Replica const &replica) {
  auto const &rows = replica.rows("Fabric");
  return rows.empty() ? 0 : rows.begin()->second.at("revision").get<std::int64_t>();
}

bool has_host(ovsdb::Row const &row, std::string const &host) {
  auto const hosts = ovsdb::atoms_of(row.at("hosts"));
  return std::find(hosts.begin(), hosts.end(), Json(host)) != hosts.end();
}

std::string words_of(SharedName const &name, Records const &switches) {
  auto const record = switches.find({name.switch_identifier, ""});
  auto const alias = record != switches.end() ? record->second.at("alias").get<std::string>()
                                              : name.switch_identifier;
  return name.port.empty() ? alias : alias + "/" + name.port;
}

Writers writers_in(ovsdb::Replica const &replica) {
  Writers writers;
  for (auto const &[uuid, row] : replica.rows("Switch")) {
    writers[row.at("id")] = row.at("writers");
  }
  return writers;
}

SharedName switch_in(ovsdb::Row const &row) {
  return {.switch_identifier = row.at("id").get<std::string>(), .port = {}};
}

SharedName port_in(ovsdb::Row const &row) {
  return {.switch_identifier = row.at("switch").get<std::string>(),
          .port = row.at("id").get<std::string>()};
}

CountsOfHosts counts_of_hosts(ovsdb::Row const &row) {
  CountsOfHosts counts;
  for (auto const &[host, text] : ovsdb::entries_of(row.at("counters"))) {
    counts[host.get<std::string>()] = counts_in(text.get_ref<std::string const &>());
  }
  return counts;
}

void add_port(Records &records, ovsdb::Row const &row, Records const &switches) {
  auto name = port_in(row);
  if (!name.port.empty() && switches.contains({name.switch_identifier, ""})) {
    records[std::move(name)] = {{"host", row.at("host")}, {"settings", settings_in(row)}};
  }
}

std::optional<HostRow> find_host(ovsdb::Replica const &replica, std::string const &name) {
  for (auto const &[uuid, row] : replica.rows("Host")) {
    if (row.at("name") == name) {
      return HostRow{.state = row.at("state"), .session = row.at("session")};
    }
  }
  return std::nullopt;
}

}  // namespace simhost::fabric
