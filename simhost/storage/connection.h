// The database of a state, which this host did not always write. Private to this layer.
#pragma once

#include <SQLiteCpp/Database.h>
#include <SQLiteCpp/Exception.h>
#include <SQLiteCpp/Statement.h>

#include <chrono>
#include <cstdint>
#include <map>
#include <optional>
#include <string>
#include <string_view>
#include <thread>

#include "storage/patience.h"
#include "storage/state_file.h"
#include "storage/state_format.h"

namespace simhost::storage {

/// The open database, the statements that were prepared on it, and what it is watched for: that the
/// file stays in place, that its tables stay a state's, that no statement goes on for ever. No
/// exception of SQLite's leaves this layer: what is wrong with a file is thrown as UnusableState,
/// what a caller may wait out or put right as StateFailure.
class Connection {
 public:
  /// To the file, or to a database of its own in memory.
  explicit Connection(std::optional<StateFile> file);
  Connection(Connection const &) = delete;
  Connection &operator=(Connection const &) = delete;

  SQLite::Database &database() { return *database_; }
  [[nodiscard]] std::optional<StateFile> const &file() const { return file_; }
  /// Throws UnusableState, which names the file.
  [[noreturn]] void refuse(std::string const &why) const;
  /// Runs work of SQLite's, and says of which file it is what it throws.
  template <typename Work>
  decltype(auto) guarded(Work const &work) const;
  /// Likewise, and waits for other processes. Switching a file to write-ahead logging, and
  /// recovering it after a crash, may return "busy" without asking SQLite's own way to wait; two
  /// processes that open a new file together run into that.
  template <typename Work>
  decltype(auto) patiently(Work const &work) const;

  /// Requires the tables to be a state's, and from now on the file and them to stay that.
  void watch();
  void require_in_place() const;
  /// Costs little while nobody writes to the file.
  void require_schema_of_now();

  /// Begins a transaction with such a literal, which waits for other processes no longer than that.
  void begin(std::string_view sql, std::chrono::nanoseconds longest_wait);
  void commit() { run("COMMIT"); }
  /// Writes what the transaction changed where a commit finds it.
  void flush();
  /// Undoes the transaction, unless SQLite has done so by itself.
  void roll_back();
  /// `sql` is a literal: the statement prepared from it is kept. Throws std::logic_error for one
  /// that changes the state where none may.
  SQLite::Statement &prepared(std::string_view sql, bool may_change);
  /// Begins to count the steps of a statement anew.
  void start_statement() { rounds_ = 0; }
  /// What a statement may come to: what is free, and that much for each byte of the file.
  [[nodiscard]] std::uint64_t allowance(std::uint64_t free, std::uint64_t per_byte) const;

 private:
  struct Prepared {
    SQLite::Statement statement;
    bool changes;  // the state
  };

  static int stop_if_endless(void *connection);
  void open_file();
  Prepared &kept(std::string_view sql);
  // Runs a literal that yields no rows, by a statement that is kept: to parse "BEGIN" and "COMMIT"
  // each time takes a good part of a short call.
  void run(std::string_view sql);
  [[nodiscard]] bool changes(SQLite::Statement const &statement) const;
  void require_schema();
  [[nodiscard]] std::uint32_t data_version() const;
  [[nodiscard]] std::filesystem::path name() const;
  [[noreturn]] void fail(FailureKind kind) const;
  [[noreturn]] void refuse(SQLite::Exception const &error) const;

  std::optional<StateFile> file_;
  std::optional<SQLite::Database> database_;
  std::map<std::string_view, Prepared> statements_;
  std::uint64_t rounds_ = 0;
  bool watching_ = false;
  std::uint32_t seen_ = 0;   // the version of the data whose schema is known
  std::int64_t schema_ = 0;  // the version of the schema that was found to be a state's
};

template <typename Work>
decltype(auto) Connection::guarded(Work const &work) const {
  try {
    return work();
  } catch (SQLite::Exception const &error) {
    refuse(error);
  } catch (WrongFormat const &error) {
    refuse(error.what());
  }
}

template <typename Work>
decltype(auto) Connection::patiently(Work const &work) const {
  auto const deadline = std::chrono::steady_clock::now() + kPatience;
  while (true) {
    try {
      return guarded(work);
    } catch (StateFailure const &failure) {
      if (failure.kind() != FailureKind::busy || std::chrono::steady_clock::now() >= deadline) {
        throw;
      }
    }
    std::this_thread::sleep_for(std::chrono::milliseconds(2));
  }
}

}  // namespace simhost::storage
