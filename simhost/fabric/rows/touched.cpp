// Names are what hosts share; rows of one name may follow one another.
#include "fabric/rows/touched.h"

#include <set>

#include "fabric/rows/rows.h"

namespace simhost::fabric {
namespace {

ovsdb::Row const *find_row(ovsdb::Replica const &replica, char const *table,
                           std::string const &uuid) {
  auto const &rows = replica.rows(table);
  auto const found = rows.find(uuid);
  return found == rows.end() ? nullptr : &found->second;
}

Records all_records(ovsdb::Replica const &replica, std::string const &host) {
  auto const switches = switches_of(replica, host);
  auto records = switches;
  for (auto const &[uuid, row] : replica.rows("Port")) {
    add_port(records, row, switches);
  }
  return records;
}

}  // namespace

void Touched::add_all() {
  is_all_ = true;
  rows_.clear();
}

void Touched::clear() {
  is_all_ = false;
  rows_.clear();
}

void Touched::add(ovsdb::Replica const &replica, std::vector<ovsdb::RowChange> const &changes) {
  for (auto const &change : changes) {
    if (is_all_) {
      return;
    }
    if (change.table == "Switch") {
      add_switch(replica, change);
    } else if (change.table == "Port") {
      add_port(replica, change);
    }
  }
}

// One that a host comes to belong to, or belongs to no longer, brings or takes its ports.
void Touched::add_switch(ovsdb::Replica const &replica, ovsdb::RowChange const &change) {
  auto const *const now = find_row(replica, "Switch", change.uuid);
  bool const was_here = change.before && has_host(*change.before, host_);
  bool const is_here = now != nullptr && has_host(*now, host_);
  if (was_here != is_here || (is_here && switch_in(*now) != switch_in(*change.before))) {
    add_all();
  } else if (is_here) {
    rows_[switch_in(*now)] = change.uuid;
  }
}

void Touched::add_port(ovsdb::Replica const &replica, ovsdb::RowChange const &change) {
  if (change.before) {
    rows_.emplace(port_in(*change.before), change.uuid);
  }
  if (auto const *const now = find_row(replica, "Port", change.uuid)) {
    rows_[port_in(*now)] = change.uuid;
  }
}

News Touched::news(ovsdb::Replica const &replica) const {
  if (is_all_) {
    return {.names = std::nullopt, .records = all_records(replica, host_)};
  }
  News news{.names = std::set<SharedName>(), .records = {}};
  auto const switches = switches_of(replica, host_);
  for (auto const &[name, uuid] : rows_) {
    news.names->insert(name);
    if (auto const found = switches.find(name); found != switches.end()) {
      news.records.insert(*found);
    } else if (auto const *const row = find_row(replica, "Port", uuid);
               row != nullptr && port_in(*row) == name) {
      fabric::add_port(news.records, *row, switches);
    }
  }
  return news;
}

}  // namespace simhost::fabric
