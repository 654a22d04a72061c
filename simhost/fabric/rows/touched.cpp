// Names are what hosts share; rows of one name may follow one another.
#include "fabric/rows/touched.h"

#include <algorithm>
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

// Whether a port says what it said, whatever it has counted meanwhile.
bool is_same(ovsdb::Row const &before, ovsdb::Row const &now) {
  return std::ranges::all_of(now, [&](auto const &column) {
    return column.first == "counters" || before.at(column.first) == column.second;
  });
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
  counted_.clear();
}

void Touched::clear() {
  is_all_ = false;
  rows_.clear();
  counted_.clear();
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
  auto const *const now = find_row(replica, "Port", change.uuid);
  if (now != nullptr) {
    if (now->at("host") == host_) {
      counted_.insert(change.uuid);
    }
    if (change.before && is_same(*change.before, *now)) {
      return;
    }
  }
  if (change.before) {
    rows_.emplace(port_in(*change.before), change.uuid);
  }
  if (now != nullptr) {
    rows_[port_in(*now)] = change.uuid;
  }
}

void Touched::add_counts(ovsdb::Row const &row, News &news) const {
  if (row.at("host") == host_) {
    if (auto counts = counts_of_hosts(row); !counts.empty()) {
      news.counts[port_in(row)] = std::move(counts);
    }
  }
}

News Touched::news(ovsdb::Replica const &replica) const {
  if (is_all_) {
    News news{.names = std::nullopt, .records = all_records(replica, host_), .counts = {}};
    for (auto const &[uuid, row] : replica.rows("Port")) {
      add_counts(row, news);
    }
    return news;
  }
  News news{.names = std::set<SharedName>(), .records = {}, .counts = {}};
  for (auto const &uuid : counted_) {
    if (auto const *const row = find_row(replica, "Port", uuid)) {
      add_counts(*row, news);
    }
  }
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
