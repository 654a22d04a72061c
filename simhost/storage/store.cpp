// Opening the state without ever touching a file that is not ours, and running work on it.
#include "storage/store.h"

#include <SQLiteCpp/Exception.h>
#include <sqlite3.h>

#include <chrono>
#include <thread>

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

Query::~Query() {
  statement_.tryReset();
  try {
    statement_.clearBindings();
  } catch (SQLite::Exception const &) {
    // Bindings that stay are overwritten by the next run.
  }
}

Query &Query::with(std::int64_t value) {
  statement_.bind(++bound_, value);
  return *this;
}

Query &Query::with(std::string_view text) {
  statement_.bind(++bound_, std::string(text));
  return *this;
}

Query &Query::with(std::span<std::byte const> bytes) {
  // SQLite takes no bytes at a null address for NULL, which is not the same as no bytes.
  void const *const first = bytes.empty() ? "" : static_cast<void const *>(bytes.data());
  statement_.bind(++bound_, first, static_cast<int>(bytes.size()));
  return *this;
}

bool Query::next() {
  return statement_.executeStep();
}

int Query::run() {
  return statement_.exec();
}

std::int64_t Query::integer(int column) const {
  auto const value = statement_.getColumn(column);
  if (!value.isInteger()) {
    refuse(column, "no integer");
  }
  return value.getInt64();
}

std::int64_t Query::integer(int column, std::int64_t least, std::int64_t greatest) const {
  auto const value = integer(column);
  if (value < least || value > greatest) {
    refuse(column, std::to_string(value));
  }
  return value;
}

std::string Query::text(int column) const {
  auto const value = statement_.getColumn(column);
  if (!value.isText()) {
    refuse(column, "no text");
  }
  auto text = value.getString();
  if (text.find('\0') != std::string::npos) {
    refuse(column, "a text with a NUL in it");
  }
  return text;
}

std::vector<std::byte> Query::bytes(int column) const {
  auto const value = statement_.getColumn(column);
  if (!value.isBlob()) {
    refuse(column, "no bytes");
  }
  auto const *first = static_cast<std::byte const *>(value.getBlob());
  return {first, first + value.getBytes()};
}

std::vector<std::byte> Query::bytes(int column, std::size_t length) const {
  auto value = bytes(column);
  if (value.size() != length) {
    refuse(column, std::to_string(value.size()) + " bytes instead of " + std::to_string(length));
  }
  return value;
}

bool Query::is_null(int column) const {
  return statement_.getColumn(column).isNull();
}

void Query::refuse(int column, std::string const &what) const {
  store_.refuse(std::string("the column '") + statement_.getColumn(column).getName() + "' holds " +
                what);
}

Store::Store(std::optional<std::filesystem::path> const &file, Populate const &populate) try
    : name_(file.value_or(":memory:")),
      database_(file ? file->string() : std::string(":memory:"),
                SQLite::OPEN_READWRITE | SQLite::OPEN_CREATE,
                static_cast<int>(std::chrono::milliseconds(kPatience).count())) {
  database_.exec("PRAGMA foreign_keys = ON");
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

void Store::refuse(std::string const &why) const {
  refuse_file(name_, why);
}

void Store::prepare_file(Populate const &populate) {
  // Nothing may be written before is_blank() has looked at what is there.
  auto const looks_blank = [&] {
    // In one transaction, or another process could create the state between two of the questions.
    Transaction const look(*this, Access::read);
    return is_blank(database_);
  };
  if (patiently(looks_blank)) {
    patiently([&] { database_.exec("PRAGMA journal_mode = WAL"); });
    patiently([&] { create_if_blank(populate); });
  }
  // A commit is in the operating system's hands when it returns, so it outlives a killed process;
  // waiting for the disk as well would only guard against a power cut.
  database_.exec("PRAGMA synchronous = NORMAL");
}

void Store::create_if_blank(Populate const &populate) {
  Transaction transaction(*this, Access::write);
  if (is_blank(database_)) {
    database_.exec("PRAGMA application_id = " + std::to_string(kApplicationId));
    database_.exec("PRAGMA user_version = " + std::to_string(kSchemaVersion));
    database_.exec(kSchema);
    database_.exec(kRunningSchema);
    populate(transaction);
  }
  transaction.commit();
}

SQLite::Statement &Store::prepared(std::string_view sql) {
  if (auto const found = statements_.find(sql); found != statements_.end()) {
    return found->second;
  }
  return statements_.try_emplace(sql, database_, std::string(sql)).first->second;
}

Transaction::Transaction(Store &store, Access access) : store_(store) {
  store_.database_.exec(access == Access::write ? "BEGIN IMMEDIATE" : "BEGIN");
}

Transaction::~Transaction() {
  if (open_) {
    // It fails when SQLite has rolled back by itself, and then there is nothing left to undo.
    store_.database_.tryExec("ROLLBACK");
  }
}

void Transaction::commit() {
  store_.database_.exec("COMMIT");
  open_ = false;
}

std::int64_t Transaction::last_key() const {
  return store_.database_.getLastInsertRowid();
}

}  // namespace simhost::storage
