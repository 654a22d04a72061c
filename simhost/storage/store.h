// The host's state in SQLite: opening it, transactions, queries.
#pragma once

#include <SQLiteCpp/Database.h>
#include <SQLiteCpp/Statement.h>

#include <cstddef>
#include <cstdint>
#include <filesystem>
#include <functional>
#include <map>
#include <optional>
#include <span>
#include <stdexcept>
#include <string>
#include <string_view>
#include <vector>

namespace simhost::storage {

/// A state file that cannot be used; what() says which file and why.
class UnusableState : public std::runtime_error {
  using std::runtime_error::runtime_error;
};

/// Throws UnusableState.
[[noreturn]] void refuse_file(std::filesystem::path const &file, std::string const &why);

/// One run of a prepared statement. It resets the statement when it goes, because a statement left
/// in the middle of its rows would keep its transaction from ending.
class Query {
 public:
  explicit Query(SQLite::Statement &statement) : statement_(statement) {}
  ~Query();
  Query(Query const &) = delete;
  Query &operator=(Query const &) = delete;

  /// Binds the parameters from the left, one per call; the value is copied.
  Query &with(std::int64_t value);
  Query &with(std::string_view text);
  Query &with(std::span<std::byte const> bytes);

  /// Steps to the next row; false when there is none.
  bool next();
  /// Runs a statement that yields no rows; returns how many rows it changed.
  int run();

  /// The columns of the row that next() reached, counted from 0.
  [[nodiscard]] std::int64_t integer(int column) const;
  [[nodiscard]] std::string text(int column) const;
  [[nodiscard]] std::vector<std::byte> bytes(int column) const;

 private:
  SQLite::Statement &statement_;
  int bound_ = 0;
};

class Transaction;

/// A connection to the state. Not safe for use by several threads at once, nor across a fork.
class Store {
 public:
  using Populate = std::function<void(Transaction &)>;

  /// Opens the state in `file`, or a private one in memory if there is none; `furnish` fills a
  /// state that is new. Throws UnusableState, or SQLite::Exception if another process keeps it
  /// locked.
  Store(std::optional<std::filesystem::path> const &file, Populate const &populate);

 private:
  friend class Transaction;

  void prepare_file(Populate const &populate);
  void create_if_blank(Populate const &populate);
  SQLite::Statement &prepared(std::string_view sql);

  SQLite::Database database_;
  std::map<std::string_view, SQLite::Statement> statements_;
};

enum class Access { read, write };

/// All the work of one call on the state: seen by others whole or not at all. Rolls back when it
/// goes without a commit. A writer waits for the writers of other processes; a reader never waits.
class Transaction {
 public:
  /// Throws SQLite::Exception (SQLITE_BUSY) when the wait for other writers takes too long.
  Transaction(Store &store, Access access);
  ~Transaction();
  Transaction(Transaction const &) = delete;
  Transaction &operator=(Transaction const &) = delete;

  void commit();

  /// A query of this transaction. `sql` is a literal: the statement prepared from it is kept.
  Query query(std::string_view sql) { return Query(store_.prepared(sql)); }
  /// The key of the row that was inserted last.
  [[nodiscard]] std::int64_t last_key() const;

 private:
  Store &store_;
  bool open_ = true;
};

}  // namespace simhost::storage
