// Some columns of a database, kept up to date.
#pragma once

#include <map>
#include <optional>
#include <string>
#include <vector>

#include "planes/openvswitch/ovsdb/json.h"
#include "planes/openvswitch/ovsdb/schema.h"

namespace simhost::ovsdb {

/// By name of the column. A set is ["set", [...]] even if it has one element, in order; a map
/// likewise.
using Row = std::map<std::string, Json>;
/// By the text of the row's UUID.
using Rows = std::map<std::string, Row>;

/// A row that became another one.
struct RowChange {
  std::string table;
  std::string uuid;
  std::optional<Row> before;  ///< none of one that is new
};

class Replica {
 public:
  Replica() = default;
  explicit Replica(Schema schema) : schema_(std::move(schema)) {}

  [[nodiscard]] Schema const &schema() const { return schema_; }
  /// None for a table that is not followed.
  [[nodiscard]] Rows const &rows(std::string const &table) const;

  /// Takes over <table-updates2> of ovsdb-server(7), and returns which rows that changes. Throws
  /// Malformed, and is of no more use then.
  std::vector<RowChange> apply(Json const &updates);

 private:
  Schema schema_;
  std::map<std::string, Rows> tables_;
};

}  // namespace simhost::ovsdb
