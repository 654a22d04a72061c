// Transactions in the notation of RFC 7047.
#include "fabric/agent/operations.h"

#include <chrono>
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

Json map_of(Json const &object) {
  std::vector<std::pair<Json, Json>> entries;
  for (auto const &[name, value] : object.items()) {
    entries.emplace_back(name, value);
  }
  return ovsdb::map(entries);
}

Json set_of(Json const &array) {
  return ovsdb::set(array.get<std::vector<Json>>());
}

Json conditions(std::initializer_list<std::pair<char const *, Json>> equal) {
  auto all = Json::array();
  for (auto const &[column, value] : equal) {
    all.push_back(Json::array({column, "==", value}));
  }
  return all;
}

Json mutation(std::string const &table, Json where, char const *column, char const *mutator,
              Json value) {
  return {{"op", "mutate"},
          {"table", table},
          {"where", std::move(where)},
          {"mutations", Json::array({Json::array({column, mutator, std::move(value)})})}};
}

bool is_switch(Change const &change) {
  return change.name.port.empty();
}

char const *table_of(Change const &change) {
  return is_switch(change) ? "Switch" : "Port";
}

Json where(Change const &change) {
  return is_switch(change)
             ? conditions({{"id", change.name.switch_identifier}})
             : conditions({{"switch", change.name.switch_identifier}, {"id", change.name.port}});
}

// Who belongs to a switch is not of what it is set to.
Json columns_of(Change const &change, Json const &record) {
  Json row{{"settings", map_of(record.at("settings"))}};
  auto const *const other = is_switch(change) ? "alias" : "host";
  row[other] = record.at(other);
  return row;
}

Json unchanged(Change const &change) {
  auto row = columns_of(change, change.was);
  auto columns = Json::array();
  for (auto const &[name, value] : row.items()) {
    columns.push_back(name);
  }
  return {{"op", "wait"},
          {"timeout", 0},
          {"table", table_of(change)},
          {"where", where(change)},
          {"columns", columns},
          {"until", "=="},
          {"rows", Json::array({std::move(row)})}};
}

Json insertion(Change const &change) {
  auto row = columns_of(change, change.now);
  if (is_switch(change)) {
    row["id"] = change.name.switch_identifier;
    row["hosts"] = set_of(change.now.at("hosts"));
  } else {
    row["switch"] = change.name.switch_identifier;
    row["id"] = change.name.port;
  }
  return {{"op", "insert"}, {"table", table_of(change)}, {"row", std::move(row)}};
}

void add_update(Json &operations, Change const &change) {
  operations.push_back({{"op", "update"},
                        {"table", table_of(change)},
                        {"where", where(change)},
                        {"row", columns_of(change, change.now)}});
  if (!is_switch(change)) {
    return;
  }
  for (auto const &host : change.was.at("hosts")) {
    auto const &left = change.now.at("hosts");
    if (std::find(left.begin(), left.end(), host) == left.end()) {
      operations.push_back(
          mutation("Switch", where(change), "hosts", "delete", ovsdb::set({host})));
    }
  }
}

std::int64_t seconds_now() {
  using std::chrono::seconds;
  return std::chrono::duration_cast<seconds>(std::chrono::system_clock::now().time_since_epoch())
      .count();
}

}  // namespace

ovsdb::Selected selected_columns() {
  return {{"Fabric", {"revision"}},
          {"Switch", {"id", "alias", "hosts", "settings"}},
          {"Port", {"switch", "id", "host", "settings"}},
          {"Host", {"name", "state", "session"}}};
}

Records records_of(ovsdb::Replica const &replica, std::string const &host) {
  Records records;
  for (auto const &[uuid, row] : replica.rows("Switch")) {
    auto const hosts = ovsdb::atoms_of(row.at("hosts"));
    if (std::find(hosts.begin(), hosts.end(), Json(host)) != hosts.end()) {
      records[{row.at("id"), ""}] = {
          {"alias", row.at("alias")}, {"hosts", hosts}, {"settings", settings_in(row)}};
    }
  }
  for (auto const &[uuid, row] : replica.rows("Port")) {
    bool const is_named = !row.at("id").get_ref<std::string const &>().empty();
    if (is_named && records.contains({row.at("switch"), ""})) {
      records[{row.at("switch"), row.at("id")}] = {{"host", row.at("host")},
                                                   {"settings", settings_in(row)}};
    }
  }
  return records;
}

std::int64_t revision_of(ovsdb::Replica const &replica) {
  auto const &rows = replica.rows("Fabric");
  return rows.empty() ? 0 : rows.begin()->second.at("revision").get<std::int64_t>();
}

std::optional<HostRow> find_host(ovsdb::Replica const &replica, std::string const &name) {
  for (auto const &[uuid, row] : replica.rows("Host")) {
    if (row.at("name") == name) {
      return HostRow{.state = row.at("state"), .session = row.at("session")};
    }
  }
  return std::nullopt;
}

Json only_for(Speaker const &speaker) {
  return Json::array({{{"op", "wait"},
                       {"timeout", 0},
                       {"table", "Host"},
                       {"where", conditions({{"name", speaker.host}})},
                       {"columns", Json::array({"session"})},
                       {"until", "=="},
                       {"rows", Json::array({{{"session", speaker.session}}})}}});
}

Json operations_of(std::vector<Change> const &changes) {
  auto operations = Json::array();
  for (auto const &change : changes) {
    if (change.was.is_null()) {
      operations.push_back(insertion(change));
      continue;
    }
    operations.push_back(unchanged(change));
    if (change.now.is_null()) {
      operations.push_back(
          {{"op", "delete"}, {"table", table_of(change)}, {"where", where(change)}});
    } else {
      add_update(operations, change);
    }
  }
  return operations;
}

Json next_revision() {
  return Json::array({mutation("Fabric", Json::array(), "revision", "+=", 1)});
}

Json change_insertion(std::string const &id, std::string const &host, bool revoked) {
  return Json::array(
      {{{"op", "insert"},
        {"table", "Change"},
        {"row", {{"id", id}, {"host", host}, {"time", seconds_now()}, {"revoked", revoked}}}}});
}

Json change_selection(std::string const &id) {
  return Json::array({{{"op", "select"},
                       {"table", "Change"},
                       {"where", conditions({{"id", id}})},
                       {"columns", Json::array({"revoked"})}}});
}

Json old_changes_deletion(std::string const &host, std::int64_t time) {
  return Json::array({{{"op", "delete"},
                       {"table", "Change"},
                       {"where", Json::array({Json::array({"host", "==", host}),
                                              Json::array({"time", "<", time})})}}});
}

Json join(std::string const &alias, std::string const &host) {
  return Json::array(
      {mutation("Switch", conditions({{"alias", alias}}), "hosts", "insert", ovsdb::set({host}))});
}

Json together(std::initializer_list<Json> lists) {
  auto all = Json::array();
  for (auto const &list : lists) {
    all.insert(all.end(), list.begin(), list.end());
  }
  return all;
}

}  // namespace simhost::fabric
