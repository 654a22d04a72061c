#include "planes/openvswitch/ovsdb/schema.h"

namespace simhost::ovsdb {
namespace {

Json const &member(Json const &object, std::string const &name, std::string const &what) {
  auto const found = object.is_object() ? object.find(name) : object.end();
  if (found == object.end()) {
    throw Malformed("the database has no " + what + ' ' + name);
  }
  return *found;
}

std::string atom_type(Json const &type) {
  auto const &name = type.is_object() ? member(type, "type", "property of a type") : type;
  if (!name.is_string()) {
    throw Malformed("the schema of the database has a type without a name");
  }
  return name.get<std::string>();
}

Json usual_atom(std::string const &type) {
  if (type == "integer" || type == "real") {
    return 0;
  }
  if (type == "boolean") {
    return false;
  }
  return type == "uuid" ? uuid("00000000-0000-0000-0000-000000000000") : Json("");
}

Column column_of(Json const &type) {
  if (type.is_string()) {
    return {Column::Kind::single, false, usual_atom(atom_type(type))};
  }
  auto const &key = member(type, "key", "property of a type");
  if (type.contains("value")) {
    return {Column::Kind::map, false, map({})};
  }
  auto const most = type.value("max", Json(1));
  if (type.value("min", Json(1)) == 1 && most == 1) {
    return {Column::Kind::single, false, usual_atom(atom_type(key))};
  }
  return {Column::Kind::set, most == 1, set({})};
}

}  // namespace

Schema selected_schema(Json const &schema, Selected const &selected) {
  Schema all;
  auto const &tables = member(schema, "tables", "member");
  for (auto const &[table, columns] : selected) {
    auto const &there = member(member(tables, table, "table"), "columns", "member");
    for (auto const &column : columns) {
      auto const &description = member(there, column, "column of " + table + " called");
      all[table][column] = column_of(member(description, "type", "member"));
    }
  }
  return all;
}

}  // namespace simhost::ovsdb
