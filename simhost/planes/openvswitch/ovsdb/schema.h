// What columns a database has, as far as one must know that to follow its changes.
#pragma once

#include <map>
#include <string>
#include <vector>

#include "planes/openvswitch/ovsdb/json.h"

namespace simhost::ovsdb {

struct Column {
  enum class Kind { single, set, map };

  Kind kind = Kind::single;
  bool is_optional = false;  // a set of at most one, which changes as a whole
  Json usual;                // what it has unless something else is said
};

using Columns = std::map<std::string, Column>;
/// By name of the table.
using Schema = std::map<std::string, Columns>;
/// The columns that are wanted of each table.
using Selected = std::map<std::string, std::vector<std::string>>;

/// From what "get_schema" returns. Throws Malformed, also if a table or a column is not there.
Schema selected_schema(Json const &schema, Selected const &selected);

}  // namespace simhost::ovsdb
