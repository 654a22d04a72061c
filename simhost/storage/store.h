// The host's state: opening it, and transactions on it. What is in it, the functions on rows say.
#pragma once

#include <cstdint>
#include <filesystem>
#include <functional>
#include <memory>
#include <optional>
#include <stdexcept>
#include <string>

namespace simhost::storage {

/// A state file that cannot be used; what() says which file and why.
class UnusableState : public std::runtime_error {
  using std::runtime_error::runtime_error;
};

/// Throws UnusableState.
[[noreturn]] void refuse_file(std::filesystem::path const &file, std::string const &why);

class Query;
class Transaction;
struct Connection;

/// A connection to the state. Not safe for use by several threads at once, nor across a fork.
class Store {
 public:
  using Populate = std::function<void(Transaction &)>;

  /// Opens the state in `file`, or a private one in memory if there is none; `populate` fills a
  /// state that is new. Throws UnusableState, or SQLite::Exception if another process keeps it
  /// locked.
  Store(std::optional<std::filesystem::path> const &file, Populate const &populate);
  ~Store();
  Store(Store const &) = delete;
  Store &operator=(Store const &) = delete;

  /// Throws UnusableState, which names the file.
  [[noreturn]] void refuse(std::string const &why) const;

 private:
  friend class Transaction;

  void prepare_file(Populate const &populate);
  void create_if_blank(Populate const &populate);

  std::filesystem::path name_;
  std::unique_ptr<Connection> connection_;
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

  [[nodiscard]] Access access() const { return access_; }
  void commit();

  /// The key of the row that was inserted last.
  [[nodiscard]] std::int64_t last_key() const;

 private:
  friend class Query;

  [[nodiscard]] Store const &store() const { return store_; }
  [[nodiscard]] Connection &connection() const { return *store_.connection_; }

  Store &store_;
  Access access_;
  bool open_ = true;
};

/// A transaction that only reads the state.
class ReadingTransaction : public Transaction {
 public:
  explicit ReadingTransaction(Store &store) : Transaction(store, Access::read) {}
};

/// A transaction that changes the state: what changes it takes one of these.
class ChangingTransaction : public Transaction {
 public:
  explicit ChangingTransaction(Store &store) : Transaction(store, Access::write) {}
};

}  // namespace simhost::storage
