// The host's state: opening it, and transactions on it. What is in it, the functions on rows say.
#pragma once

#include <cstdint>
#include <functional>
#include <memory>
#include <optional>
#include <string>

#include "storage/patience.h"
#include "storage/state_file.h"

namespace simhost::storage {

class Query;
class Change;
class ChangingTransaction;
class Connection;

/// A connection to the state. Not safe for use by several threads at once, nor across a fork. What
/// is wrong with a file is thrown as UnusableState; but what a caller may wait out or put right (a
/// lock, a full disk, a medium that can only be read) as StateFailure.
class Store {
 public:
  using Populate = std::function<void(ChangingTransaction &)>;

  /// Opens the state in `file`, or a private one in memory if there is none; `populate` fills a
  /// state that is new.
  Store(std::optional<StateFile> file, Populate const &populate);
  ~Store();
  Store(Store const &) = delete;
  Store &operator=(Store const &) = delete;

  /// Whether it shows the file as it is; a file that may only be looked at is read as it once was.
  [[nodiscard]] bool is_current() const;
  /// Throws UnusableState, which names the file.
  [[noreturn]] void refuse(std::string const &why) const;

 private:
  friend class Transaction;

  void prepare(Populate const &populate);
  void create_or_bring_forward(Populate const &populate);

  std::unique_ptr<Connection> connection_;
};

/// All the work of one call on the state: seen by others whole or not at all. Rolls back when it
/// goes without a commit. What takes one only reads the state; what changes it takes a
/// ChangingTransaction.
class Transaction {
 public:
  ~Transaction();
  Transaction(Transaction const &) = delete;
  Transaction &operator=(Transaction const &) = delete;

  void commit();
  /// Throws UnusableState, which names the file.
  [[noreturn]] void refuse(std::string const &why) const { store_.refuse(why); }

 protected:
  enum class Access { read, write };

  /// Throws StateFailure (busy) when the wait for other writers takes too long.
  Transaction(Store &store, Access access, Patience &patience);
  /// Likewise, waiting as long as one call does.
  Transaction(Store &store, Access access);
  [[nodiscard]] Connection &connection() const { return *store_.connection_; }

 private:
  friend class Query;

  void begin(Patience &patience);

  Store &store_;
  Access access_;
  bool open_ = true;
};

/// A transaction that only reads the state; it never waits for another process.
class ReadingTransaction : public Transaction {
 public:
  explicit ReadingTransaction(Store &store) : Transaction(store, Access::read) {}
  ReadingTransaction(Store &store, Patience &patience)
      : Transaction(store, Access::read, patience) {}
};

/// A transaction that changes the state. It waits for those of other processes.
class ChangingTransaction : public Transaction {
 public:
  explicit ChangingTransaction(Store &store) : Transaction(store, Access::write) {}
  ChangingTransaction(Store &store, Patience &patience)
      : Transaction(store, Access::write, patience) {}

  /// Writes into the file what was changed so far, which others see only when it is committed: a
  /// file that has no room for it fails here, and a commit after it needs next to none.
  void flush();
  /// The key of the row that was inserted last.
  [[nodiscard]] std::int64_t last_key() const;

 private:
  friend class Change;
};

/// Commits what `change` does, or does nothing while somebody else writes. Returns whether it did.
bool commit_if_free(Store &store, std::function<void(ChangingTransaction &)> const &change);

}  // namespace simhost::storage
