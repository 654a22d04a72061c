// A replica may be ahead of what is told of it.
#include "fabric/rows/port_rows.h"

namespace simhost::fabric {
namespace {

constexpr auto *kTable = "Port";

}  // namespace

void PortRows::begin(ovsdb::Replica const &replica) {
  uuids_.clear();
  for (auto const &[uuid, row] : replica.rows(kTable)) {
    uuids_[port_in(row)] = uuid;
  }
}

void PortRows::follow(ovsdb::Replica const &replica, std::vector<ovsdb::RowChange> const &changes) {
  auto const &rows = replica.rows(kTable);
  for (auto const &change : changes) {
    if (change.table != kTable) {
      continue;
    }
    if (change.before) {
      auto const known = uuids_.find(port_in(*change.before));
      // Another row may have its name by now.
      if (known != uuids_.end() && known->second == change.uuid) {
        uuids_.erase(known);
      }
    }
    if (auto const now = rows.find(change.uuid); now != rows.end()) {
      uuids_[port_in(now->second)] = change.uuid;
    }
  }
}

RowNames PortRows::of(ovsdb::Replica const &replica, std::vector<Change> const &changes) const {
  auto const &rows = replica.rows(kTable);
  RowNames found;
  for (auto const &change : changes) {
    auto const known = uuids_.find(change.name);
    if (known == uuids_.end()) {
      continue;
    }
    auto const row = rows.find(known->second);
    if (row != rows.end() && port_in(row->second) == change.name) {
      found.insert(*known);
    }
  }
  return found;
}

}  // namespace simhost::fabric
