// What makes a database a state: its marks, and exactly the tables that a state has.
#pragma once

#include <SQLiteCpp/Database.h>

#include <cstdint>
#include <span>
#include <stdexcept>

namespace simhost::storage {

/// A database that is no state of this host; what() says what is wrong with it.
class WrongFormat : public std::runtime_error {
  using std::runtime_error::runtime_error;
};

/// The version of a database to which nothing has been written yet.
inline constexpr std::int64_t kBlank = 0;
/// Of which version the state is that the database holds, or kBlank.
/// Throws WrongFormat for another program's, and for a version that cannot be read.
std::int64_t version_of(SQLite::Database &database);
/// Writes the marks and the tables into an empty database.
void create_state(SQLite::Database &database);
/// Takes a state from `version` to the next ones, by a text of SQL for each step.
void bring_forward(SQLite::Database &database, std::int64_t version,
                   std::span<char const *const> steps);
/// Likewise to the version of this host.
void bring_forward(SQLite::Database &database, std::int64_t version);
/// Throws WrongFormat if anything is there that create_state() does not write, or is missing:
/// a table, index, view or trigger.
void require_schema(SQLite::Database &database);

}  // namespace simhost::storage
