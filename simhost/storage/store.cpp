// Opening the state without ever touching a file that is not ours, and running work on it.
#include "storage/store.h"

#include <SQLiteCpp/Exception.h>
#include <sqlite3.h>

#include <chrono>
#include <thread>

#include "storage/query.h"
#include "storage/schema.h"

namespace simhost::storage {
namespace {

constexpr std::chrono::seconds kPatience{10};

// Switching a file to write-ahead logging, and recovering it after a crash, may answer "busy"
// without asking the busy handler; two processes that open a new file together run into that.
template <typename Work>
auto patiently(Work const &work) {
  auto const deadline = std::chrono::steady_clock::now() + kPatience;
  while (true) {
    try {
      return work();
    } catch (SQLite::Exception const &error) {
      if (error.getErrorCode() != SQLITE_BUSY || std::chrono::steady_clock::now() >= deadline) {
        throw;
      }
    }
    std::this_thread::sleep_for(std::chrono::milliseconds(2));
  }
}

std::int64_t integer_of(SQLite::Database &database, char const *sql) {
  return database.execAndGet(sql).getInt64();
}

// Whether nothing has been written to this state yet; refuses what another program wrote.
bool is_blank(SQLite::Database &database) {
  auto const application = integer_of(database, "PRAGMA application_id");
  auto const version = integer_of(database, "PRAGMA user_version");
  if (application == 0 && version == 0 &&
      integer_of(database, "SELECT count(*) FROM sqlite_master") == 0) {
    return true;
  }
  if (application != kApplicationId) {
    throw UnusableState("it is a database of another program");
  }
  if (version != kSchemaVersion) {
    throw UnusableState("it has schema version " + std::to_string(version) + ", this host reads " +
                        std::to_string(kSchemaVersion));
  }
  return false;
}

}  // namespace

void refuse_file(std::filesystem::path const &file, std::string const &why) {
  throw UnusableState("the state file " + file.string() + " cannot be used: " + why);
}

Connection::Connection(std::optional<std::filesystem::path> const &file)
    : database(file ? file->string() : std::string(":memory:"),
               SQLite::OPEN_READWRITE | SQLite::OPEN_CREATE,
               static_cast<int>(std::chrono::milliseconds(kPatience).count())) {}

Store::Store(std::optional<std::filesystem::path> const &file, Populate const &populate) try
    : name_(file.value_or(":memory:")), connection_(std::make_unique<Connection>(file)) {
  connection_->database.exec("PRAGMA foreign_keys = ON");
  if (file) {
    prepare_file(populate);
  } else {
    create_if_blank(populate);
  }
} catch (UnusableState const &error) {
  refuse_file(file.value_or(":memory:"), error.what());
} catch (SQLite::Exception const &error) {
  if (error.getErrorCode() == SQLITE_BUSY) {
    throw;
  }
  refuse_file(file.value_or(":memory:"), error.what());
}

Store::~Store() = default;

void Store::refuse(std::string const &why) const {
  refuse_file(name_, why);
}

void Store::prepare_file(Populate const &populate) {
  // Nothing may be written before is_blank() has looked at what is there.
  auto const looks_blank = [&] {
    // In one transaction, or another process could create the state between two of the questions.
    Transaction const look(*this, Access::read);
    return is_blank(connection_->database);
  };
  if (patiently(looks_blank)) {
    patiently([&] { connection_->database.exec("PRAGMA journal_mode = WAL"); });
    patiently([&] { create_if_blank(populate); });
  }
  // A commit is in the operating system's hands when it returns, so it outlives a killed process;
  // waiting for the disk as well would only guard against a power cut.
  connection_->database.exec("PRAGMA synchronous = NORMAL");
}

void Store::create_if_blank(Populate const &populate) {
  Transaction transaction(*this, Access::write);
  if (is_blank(connection_->database)) {
    connection_->database.exec("PRAGMA application_id = " + std::to_string(kApplicationId));
    connection_->database.exec("PRAGMA user_version = " + std::to_string(kSchemaVersion));
    connection_->database.exec(kSchema);
    connection_->database.exec(kRunningSchema);
    populate(transaction);
  }
  transaction.commit();
}

Transaction::Transaction(Store &store, Access access) : store_(store), access_(access) {
  connection().database.exec(access == Access::write ? "BEGIN IMMEDIATE" : "BEGIN");
}

Transaction::~Transaction() {
  if (open_) {
    // It fails when SQLite has rolled back by itself, and then there is nothing left to undo.
    connection().database.tryExec("ROLLBACK");
  }
}

void Transaction::commit() {
  connection().database.exec("COMMIT");
  open_ = false;
}

std::int64_t Transaction::last_key() const {
  return connection().database.getLastInsertRowid();
}

}  // namespace simhost::storage
