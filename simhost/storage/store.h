// The host's state in SQLite: opening it, transactions, queries.
#pragma once

#include <SQLiteCpp/Database.h>
#include <SQLiteCpp/Statement.h>

#include <cstddef>
#include <cstdint>
#include <filesystem>
#include <functional>
#include <limits>
#include <map>
#include <optional>
#include <span>
#include <stdexcept>
#include <string>
#include <string_view>
#include <type_traits>
#include <vector>

namespace simhost::storage {

/// A state file that cannot be used; what() says which file and why.
class UnusableState : public std::runtime_error {
  using std::runtime_error::runtime_error;
};

/// Throws UnusableState.
[[noreturn]] void refuse_file(std::filesystem::path const &file, std::string const &why);

class Store;

/// One run of a prepared statement. It resets the statement when it goes, because a statement left
/// in the middle of its rows would keep its transaction from ending.
class Query {
 public:
  Query(Store const &store, SQLite::Statement &statement) : store_(store), statement_(statement) {}
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

  /// The columns of the row that next() reached, counted from 0. The file may have been written by
  /// anybody: these throw UnusableState for a value of another type or outside its bounds.
  [[nodiscard]] std::int64_t integer(int column) const;
  [[nodiscard]] std::int64_t integer(int column, std::int64_t least, std::int64_t greatest) const;
  /// Any value of an unsigned type of up to 32 bits.
  template <typename Number>
  [[nodiscard]] Number number(int column) const {
    static_assert(std::is_unsigned_v<Number> && sizeof(Number) < sizeof(std::int64_t));
    return static_cast<Number>(integer(column, 0, std::numeric_limits<Number>::max()));
  }
  /// 0 or 1.
  [[nodiscard]] bool flag(int column) const { return integer(column, 0, 1) != 0; }
  /// Without a NUL in it.
  [[nodiscard]] std::string text(int column) const;
  [[nodiscard]] std::vector<std::byte> bytes(int column) const;
  /// Of that length.
  [[nodiscard]] std::vector<std::byte> bytes(int column, std::size_t length) const;
  [[nodiscard]] bool is_null(int column) const;
  /// Throws UnusableState, which says that the column holds `what`.
  [[noreturn]] void refuse(int column, std::string const &what) const;

 private:
  Store const &store_;
  SQLite::Statement &statement_;
  int bound_ = 0;
};

class Transaction;

/// A connection to the state. Not safe for use by several threads at once, nor across a fork.
class Store {
 public:
  using Populate = std::function<void(Transaction &)>;

  /// Opens the state in `file`, or a private one in memory if there is none; `populate` fills a
  /// state that is new. Throws UnusableState, or SQLite::Exception if another process keeps it
  /// locked.
  Store(std::optional<std::filesystem::path> const &file, Populate const &populate);

  /// Throws UnusableState, which names the file.
  [[noreturn]] void refuse(std::string const &why) const;

 private:
  friend class Transaction;

  void prepare_file(Populate const &populate);
  void create_if_blank(Populate const &populate);
  SQLite::Statement &prepared(std::string_view sql);

  std::filesystem::path name_;
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
  Query query(std::string_view sql) { return {store_, store_.prepared(sql)}; }
  /// The key of the row that was inserted last.
  [[nodiscard]] std::int64_t last_key() const;

 private:
  Store &store_;
  bool open_ = true;
};

}  // namespace simhost::storage
