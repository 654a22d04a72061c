#include "planes/openvswitch/ovsdb/replica.h"

#include <algorithm>
#include <iterator>

namespace simhost::ovsdb {
namespace {

Json ordered(Column const &column, Json const &value) {
  switch (column.kind) {
    case Column::Kind::set:
      return set(atoms_of(value));
    case Column::Kind::map:
      return map(entries_of(value));
    default:
      return value;
  }
}

Json changed_set(Json const &old, Json const &difference) {
  auto const before = atoms_of(old);
  auto const other = atoms_of(difference);
  std::vector<Json> after;
  std::set_symmetric_difference(before.begin(), before.end(), other.begin(), other.end(),
                                std::back_inserter(after));
  return set(after);
}

Json changed_map(Json const &old, Json const &difference) {
  auto const before = entries_of(old);
  std::map<Json, Json> after(before.begin(), before.end());
  for (auto const &[key, value] : entries_of(difference)) {
    auto const found = after.find(key);
    if (found != after.end() && found->second == value) {
      after.erase(found);
    } else {
      after[key] = value;
    }
  }
  return map({after.begin(), after.end()});
}

Json changed(Column const &column, Json const &old, Json const &difference) {
  if (column.kind == Column::Kind::map) {
    return changed_map(old, difference);
  }
  if (column.kind == Column::Kind::single || column.is_optional) {
    return ordered(column, difference);
  }
  return changed_set(old, difference);
}

Row new_row(Columns const &columns, Json const &given) {
  Row row;
  for (auto const &[name, column] : columns) {
    row[name] = given.contains(name) ? ordered(column, given[name]) : column.usual;
  }
  return row;
}

void modify(Columns const &columns, Row &row, Json const &differences) {
  for (auto const &[name, column] : columns) {
    if (differences.contains(name)) {
      row[name] = changed(column, row[name], differences[name]);
    }
  }
}

void require_object(Json const &value) {
  if (!value.is_object()) {
    throw Malformed("a change of the database is no object");
  }
}

void apply_to(Columns const &columns, Rows &rows, std::string const &uuid, Json const &update) {
  require_object(update);
  if (update.contains("delete")) {
    rows.erase(uuid);
    return;
  }
  for (auto const *const kind : {"initial", "insert"}) {
    if (update.contains(kind)) {
      require_object(update[kind]);
      rows[uuid] = new_row(columns, update[kind]);
      return;
    }
  }
  auto const row = rows.find(uuid);
  if (!update.contains("modify") || row == rows.end()) {
    throw Malformed("a change of the database is of no row that there is");
  }
  require_object(update["modify"]);
  modify(columns, row->second, update["modify"]);
}

}  // namespace

Rows const &Replica::rows(std::string const &table) const {
  static Rows const none;
  auto const found = tables_.find(table);
  return found == tables_.end() ? none : found->second;
}

std::vector<RowChange> Replica::apply(Json const &updates) {
  std::vector<RowChange> changes;
  require_object(updates);
  for (auto const &[table, columns] : schema_) {
    if (!updates.contains(table)) {
      continue;
    }
    require_object(updates[table]);
    for (auto const &[uuid, update] : updates[table].items()) {
      auto &rows = tables_[table];
      auto const row = rows.find(uuid);
      auto &change = changes.emplace_back(RowChange{table, uuid, std::nullopt});
      if (row != rows.end()) {
        change.before = row->second;
      }
      apply_to(columns, rows, uuid, update);
    }
  }
  return changes;
}

}  // namespace simhost::ovsdb
