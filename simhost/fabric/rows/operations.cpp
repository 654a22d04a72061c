// Transactions in the notation of RFC 7047.
#include "fabric/rows/operations.h"

#include <chrono>
#include <set>
#include <string>
#include <utility>

namespace simhost::fabric {
namespace {

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

// A server finds a row by its UUID at once, and by anything else it looks at all that there are.
// One that this host has not heard of is still found by its name.
Json where(Change const &change, RowNames const &ports) {
  if (auto const found = ports.find(change.name); found != ports.end()) {
    return conditions({{"_uuid", ovsdb::uuid(found->second)}});
  }
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

Json unchanged(Change const &change, Json const &where) {
  auto row = columns_of(change, change.was);
  auto columns = Json::array();
  for (auto const &[name, value] : row.items()) {
    columns.push_back(name);
  }
  return {{"op", "wait"},
          {"timeout", 0},
          {"table", table_of(change)},
          {"where", where},
          {"columns", columns},
          {"until", "=="},
          {"rows", Json::array({std::move(row)})}};
}

// Who shares a switch may write it; who else may the operators say.
Json first_writers(Change const &change) {
  auto writers = Json::object();
  for (auto const &host : change.now.at("hosts")) {
    writers[host.get<std::string>()] = host;
  }
  return map_of(writers);
}

Json insertion(Change const &change, Writers const &writers) {
  auto row = columns_of(change, change.now);
  row["writers"] = writers.at(change.name.switch_identifier);
  if (is_switch(change)) {
    row["id"] = change.name.switch_identifier;
    row["hosts"] = set_of(change.now.at("hosts"));
  } else {
    row["switch"] = change.name.switch_identifier;
    row["id"] = change.name.port;
  }
  return {{"op", "insert"}, {"table", table_of(change)}, {"row", std::move(row)}};
}

void add_update(Json &operations, Change const &change, Json const &where) {
  operations.push_back({{"op", "update"},
                        {"table", table_of(change)},
                        {"where", where},
                        {"row", columns_of(change, change.now)}});
  if (!is_switch(change)) {
    return;
  }
  for (auto const &host : change.was.at("hosts")) {
    auto const &left = change.now.at("hosts");
    if (std::find(left.begin(), left.end(), host) == left.end()) {
      operations.push_back(mutation("Switch", where, "hosts", "delete", ovsdb::set({host})));
    }
  }
}

std::int64_t seconds_now() {
  using std::chrono::seconds;
  return std::chrono::duration_cast<seconds>(std::chrono::system_clock::now().time_since_epoch())
      .count();
}

Json unchanged_writers(std::string const &switch_identifier, Json const &writers) {
  return {{"op", "wait"},
          {"timeout", 0},
          {"table", "Switch"},
          {"where", conditions({{"id", switch_identifier}})},
          {"columns", Json::array({"writers"})},
          {"until", "=="},
          {"rows", Json::array({{{"writers", writers}}})}};
}

// Of the switches of new ports, which take them over; adds those of new switches.
Json unchanged_writers(std::vector<Change> const &changes, Writers &writers) {
  auto operations = Json::array();
  std::set<std::string> seen;
  for (auto const &change : changes) {
    auto const &identifier = change.name.switch_identifier;
    if (!change.was.is_null() || !seen.insert(identifier).second) {
      continue;
    }
    // A switch comes before its ports.
    if (is_switch(change)) {
      writers[identifier] = first_writers(change);
    } else {
      auto const &known = writers.try_emplace(identifier, ovsdb::map({})).first->second;
      operations.push_back(unchanged_writers(identifier, known));
    }
  }
  return operations;
}

}  // namespace

Json only_for(Speaker const &speaker) {
  return Json::array({{{"op", "wait"},
                       {"timeout", 0},
                       {"table", "Host"},
                       {"where", conditions({{"name", speaker.host}})},
                       {"columns", Json::array({"session"})},
                       {"until", "=="},
                       {"rows", Json::array({{{"session", speaker.session}}})}}});
}

Json session_selection(std::string const &host) {
  return Json::array({{{"op", "select"},
                       {"table", "Host"},
                       {"where", conditions({{"name", host}})},
                       {"columns", Json::array({"session"})}}});
}

Json operations_of(std::vector<Change> const &changes, RowNames const &ports, Writers writers) {
  auto operations = unchanged_writers(changes, writers);
  for (auto const &change : changes) {
    if (change.was.is_null()) {
      operations.push_back(insertion(change, writers));
      continue;
    }
    auto const rows = where(change, ports);
    operations.push_back(unchanged(change, rows));
    if (change.now.is_null()) {
      operations.push_back({{"op", "delete"}, {"table", table_of(change)}, {"where", rows}});
    } else {
      add_update(operations, change, rows);
    }
  }
  return operations;
}

Json counts_update(std::string const &host, std::map<std::string, std::string> const &counts) {
  auto operations = Json::array();
  for (auto const &[uuid, text] : counts) {
    auto update = mutation("Port", conditions({{"_uuid", ovsdb::uuid(uuid)}}), "counters", "delete",
                           ovsdb::set({host}));
    update["mutations"].push_back(Json::array({"counters", "insert", ovsdb::map({{host, text}})}));
    operations.push_back(std::move(update));
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
  auto const where = conditions({{"alias", alias}});
  return Json::array({{{"op", "wait"},
                       {"timeout", 0},
                       {"table", "Switch"},
                       {"where", where},
                       {"columns", Json::array({"alias"})},
                       {"until", "=="},
                       {"rows", Json::array({{{"alias", alias}}})}},
                      mutation("Switch", where, "hosts", "insert", ovsdb::set({host}))});
}

Json leave(std::string const &switch_identifier, std::string const &host) {
  return Json::array({mutation("Switch", conditions({{"id", switch_identifier}}), "hosts", "delete",
                               ovsdb::set({host}))});
}

Json together(std::initializer_list<Json> lists) {
  auto all = Json::array();
  for (auto const &list : lists) {
    all.insert(all.end(), list.begin(), list.end());
  }
  return all;
}

}  // namespace simhost::fabric
