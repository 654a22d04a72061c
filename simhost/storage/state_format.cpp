// Comparing what is in a database with what this host would write into it.
#include "storage/state_format.h"

#include <SQLiteCpp/Statement.h>

#include <algorithm>
#include <array>
#include <cctype>
#include <string>
#include <string_view>
#include <vector>

#include "storage/schema.h"

namespace simhost::storage {
namespace {

// What takes a state of version kOldestSchema to the next, that one to the one after it, ...
std::array<char const *, kSchemaVersion - kOldestSchema> const kSteps{
    kGenerationSchema, kFramesSchema,  kReadingSchema, kRememberedSchema,
    kSeenSchema,       kSharedSchema,  kLacpSchema,    kFabricSchema,
    kChosenSchema,     kCountedSchema, kTouchedSchema, kTouchedTunnelsSchema};

// A table, index, view or trigger.
struct Part {
  std::string type;
  std::string name;
  std::string table;
  std::string sql;

  bool operator==(Part const &) const = default;
  [[nodiscard]] std::string called() const { return "the " + type + " '" + name + "'"; }
};

std::int64_t integer_of(SQLite::Database &database, char const *sql) {
  return database.execAndGet(sql).getInt64();
}

void set_version(SQLite::Database &database, std::int64_t version) {
  database.exec("PRAGMA user_version = " + std::to_string(version));
}

// Without comments and with one space for each gap: what a reader of the SQL would call the same.
std::string essence_of(std::string_view sql) {
  std::string essence;
  while (!sql.empty()) {
    if (sql.starts_with("--")) {
      sql.remove_prefix(std::min(sql.find('\n'), sql.size()));
    } else if (std::isspace(static_cast<unsigned char>(sql.front())) == 0) {
      essence += sql.front();
      sql.remove_prefix(1);
    } else {
      sql.remove_prefix(1);
      if (!essence.ends_with(' ')) {
        essence += ' ';
      }
    }
  }
  return essence;
}

// In the order of their names; a state of anybody's may have any number of them.
std::vector<Part> parts_of(SQLite::Database &database, std::size_t most) {
  SQLite::Statement select(database,
                           "SELECT type, name, tbl_name, ifnull(sql, '') FROM sqlite_schema"
                           " ORDER BY name, type LIMIT ?");
  select.bind(1, static_cast<std::int64_t>(most));
  std::vector<Part> parts;
  while (select.executeStep()) {
    parts.push_back({.type = select.getColumn(0).getString(),
                     .name = select.getColumn(1).getString(),
                     .table = select.getColumn(2).getString(),
                     .sql = essence_of(select.getColumn(3).getString())});
  }
  return parts;
}

std::vector<Part> const &own_parts() {
  constexpr std::size_t kAll = 1000;
  static std::vector<Part> const parts = [] {
    SQLite::Database database(":memory:", SQLite::OPEN_READWRITE | SQLite::OPEN_CREATE);
    create_state(database);
    return parts_of(database, kAll);
  }();
  return parts;
}

}  // namespace

std::int64_t version_of(SQLite::Database &database) {
  auto const application = integer_of(database, "PRAGMA application_id");
  auto const version = integer_of(database, "PRAGMA user_version");
  if (application == 0 && version == 0 &&
      integer_of(database, "SELECT NOT EXISTS (SELECT 1 FROM sqlite_schema)") != 0) {
    return kBlank;
  }
  if (application != kApplicationId) {
    throw WrongFormat("it is a database of another program");
  }
  if (version < kOldestSchema || version > kSchemaVersion) {
    auto const oldest =
        kOldestSchema < kSchemaVersion ? std::to_string(kOldestSchema) + " to " : std::string();
    throw WrongFormat("it has schema version " + std::to_string(version) + ", this host reads " +
                      oldest + std::to_string(kSchemaVersion));
  }
  return version;
}

void create_state(SQLite::Database &database) {
  database.exec("PRAGMA application_id = " + std::to_string(kApplicationId));
  set_version(database, kSchemaVersion);
  database.exec(kSchema);
  database.exec(kRunningSchema);
  for (auto const *step : kSteps) {
    database.exec(step);
  }
}

void bring_forward(SQLite::Database &database, std::int64_t version,
                   std::span<char const *const> steps) {
  for (auto const *step : steps) {
    database.exec(step);
    set_version(database, ++version);
  }
}

void bring_forward(SQLite::Database &database, std::int64_t version) {
  bring_forward(database, version,
                std::span(kSteps).subspan(static_cast<std::size_t>(version - kOldestSchema)));
}

void require_schema(SQLite::Database &database) {
  auto const &own = own_parts();
  auto const found = parts_of(database, own.size() + 1);
  for (auto const &part : found) {
    auto const same = std::find_if(own.begin(), own.end(), [&](Part const &candidate) {
      return candidate.type == part.type && candidate.name == part.name;
    });
    if (same == own.end()) {
      throw WrongFormat(part.called() + " in it is none of this host's");
    }
    if (*same != part) {
      throw WrongFormat(part.called() + " in it is not as this host made it");
    }
  }
  if (found.size() > own.size()) {
    throw WrongFormat("something in it is there twice");
  }
  for (auto const &part : own) {
    if (std::find(found.begin(), found.end(), part) == found.end()) {
      throw WrongFormat(part.called() + " is missing in it");
    }
  }
}

}  // namespace simhost::storage
