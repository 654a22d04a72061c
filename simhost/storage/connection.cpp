// Opening a database without trust, and bounding what it may cost.
#include "storage/connection.h"

#include <sqlite3.h>

#include <cctype>
#include <chrono>
#include <limits>
#include <stdexcept>
#include <utility>

namespace simhost::storage {
namespace {

// After so many steps of its machine SQLite asks whether a statement shall go on.
constexpr int kRound = 100'000;

// A path as a URI has it.
std::string percent_encoded(std::string const &path) {
  constexpr std::string_view kDigits = "0123456789ABCDEF";
  std::string encoded;
  for (auto const character : path) {
    auto const byte = static_cast<unsigned char>(character);
    if (std::isalnum(byte) != 0 || character == '/') {
      encoded += character;
    } else {
      encoded += {'%', kDigits[byte >> 4U], kDigits[byte & 0xFU]};
    }
  }
  return encoded;
}

// To take part in locking, SQLite would have to write beside a file that may only be looked at; so
// it takes such a file as it is.
SQLite::Database opened(StateFile const &file) {
  constexpr int kNoLinks = SQLITE_OPEN_NOFOLLOW;
  if (!file.is_writable()) {
    return {"file:" + percent_encoded(file.location().string()) + "?immutable=1",
            SQLite::OPEN_READONLY | SQLite::OPEN_URI | kNoLinks};
  }
  return {file.location().string(), SQLite::OPEN_READWRITE | kNoLinks,
          static_cast<int>(std::chrono::milliseconds(kPatience).count())};
}

bool has_moved(SQLite::Database const &database) {
  int moved = 0;
  sqlite3_file_control(database.getHandle(), "main", SQLITE_FCNTL_HAS_MOVED, &moved);
  return moved != 0;
}

// Asked for after each change by others.
std::int64_t schema_version(Connection &connection) {
  auto &statement = connection.prepared("PRAGMA schema_version", false);
  statement.executeStep();
  auto const version = statement.getColumn(0).getInt64();
  statement.tryReset();
  return version;
}

}  // namespace

Connection::Connection(std::optional<StateFile> file) : file_(std::move(file)) {
  if (file_) {
    open_file();
  } else {
    database_.emplace(":memory:", SQLite::OPEN_READWRITE | SQLite::OPEN_CREATE);
  }
  guarded([&] { database_->exec("PRAGMA foreign_keys = ON"); });
}

void Connection::open_file() {
  file_->take();
  guarded([&] { database_.emplace(opened(*file_)); });
  // What was looked at may have gone before SQLite opened what was at its place.
  if (has_moved(*database_)) {
    refuse("another file took its place while it was opened");
  }
  file_->take();
  sqlite3_progress_handler(database_->getHandle(), kRound, stop_if_endless, this);
  sqlite3_db_config(database_->getHandle(), SQLITE_DBCONFIG_DEFENSIVE, 1, nullptr);
  guarded([&] { database_->exec("PRAGMA cell_size_check = ON"); });
}

std::filesystem::path Connection::name() const {
  return file_ ? file_->name() : ":memory:";
}

void Connection::refuse(std::string const &why) const {
  refuse_file(name(), why);
}

void Connection::fail(FailureKind kind) const {
  throw StateFailure(kind, name());
}

void Connection::refuse(SQLite::Exception const &error) const {
  switch (error.getErrorCode()) {
    case SQLITE_BUSY:
      fail(FailureKind::busy);
    case SQLITE_FULL:
      fail(FailureKind::full);
    case SQLITE_IOERR:
      fail(FailureKind::io);
    case SQLITE_NOMEM:
      fail(FailureKind::memory);
    case SQLITE_READONLY:
      fail(FailureKind::read_only);
    case SQLITE_INTERRUPT:
      refuse("it keeps a statement busy without end");
    case SQLITE_NOTADB:
      refuse("file is not a database");
    case SQLITE_CORRUPT:
      refuse("it is damaged");
    case SQLITE_CANTOPEN:
      refuse("it cannot be opened");
    default:
      refuse("SQLite refuses it with its code " + std::to_string(error.getErrorCode()));
  }
}

void Connection::watch() {
  guarded([&] { require_schema(); });
  watching_ = file_.has_value();
}

void Connection::require_schema() {
  storage::require_schema(*database_);
  schema_ = schema_version(*this);
  seen_ = data_version();
}

void Connection::require_in_place() const {
  if (watching_) {
    file_->require_in_place();
  }
}

void Connection::require_schema_of_now() {
  auto const version = watching_ ? data_version() : seen_;
  if (version == seen_) {
    return;
  }
  guarded([&] {
    if (schema_version(*this) != schema_) {
      require_schema();
    }
  });
  seen_ = version;
}

void Connection::begin(std::string_view sql, std::chrono::nanoseconds longest_wait) {
  using std::chrono::milliseconds;
  guarded([&] {
    database_->setBusyTimeout(
        static_cast<int>(std::chrono::duration_cast<milliseconds>(longest_wait).count()));
  });
  run(sql);
}

void Connection::flush() {
  // All other functions say no more of a failure than this.
  constexpr int kKind = 0xFF;
  auto *const handle = database_->getHandle();
  if (auto const code = sqlite3_db_cacheflush(handle) & kKind; code != SQLITE_OK) {
    guarded([&] { throw SQLite::Exception(handle, code); });
  }
}

void Connection::roll_back() {
  if (sqlite3_get_autocommit(database_->getHandle()) == 0) {
    run("ROLLBACK");
  }
}

void Connection::run(std::string_view sql) {
  auto &statement = kept(sql).statement;
  start_statement();
  auto const code = statement.tryExecuteStep();
  statement.tryReset();
  if (code != SQLITE_DONE) {
    guarded([&] { throw SQLite::Exception(database_->getHandle(), code); });
  }
}

SQLite::Statement &Connection::prepared(std::string_view sql, bool may_change) {
  auto &prepared = kept(sql);
  if (prepared.changes && !may_change) {
    throw std::logic_error("what reads the state was about to change it");
  }
  return prepared.statement;
}

Connection::Prepared &Connection::kept(std::string_view sql) {
  if (auto const found = statements_.find(sql); found != statements_.end()) {
    return found->second;
  }
  return guarded([&]() -> Prepared & {
    SQLite::Statement statement(*database_, std::string(sql));
    bool const writes = changes(statement);
    return statements_.try_emplace(sql, Prepared{std::move(statement), writes}).first->second;
  });
}

// The statement keeps its handle to itself, so it is looked for among those of the database.
bool Connection::changes(SQLite::Statement const &statement) const {
  auto *const database = database_->getHandle();
  auto *handle = sqlite3_next_stmt(database, nullptr);
  while (handle != nullptr && statement.getQuery() != sqlite3_sql(handle)) {
    handle = sqlite3_next_stmt(database, handle);
  }
  return handle == nullptr || sqlite3_stmt_readonly(handle) == 0;
}

std::uint32_t Connection::data_version() const {
  std::uint32_t version = 0;
  sqlite3_file_control(database_->getHandle(), "main", SQLITE_FCNTL_DATA_VERSION, &version);
  return version;
}

std::uint64_t Connection::allowance(std::uint64_t free, std::uint64_t per_byte) const {
  return file_ ? free + per_byte * file_->bytes_on_disk()
               : std::numeric_limits<std::uint64_t>::max();
}

int Connection::stop_if_endless(void *connection) {
  constexpr std::uint64_t kFree = 10'000'000;
  constexpr std::uint64_t kPerByte = 100;
  auto &self = *static_cast<Connection *>(connection);
  auto const steps = ++self.rounds_ * kRound;
  return steps > kFree && steps > self.allowance(kFree, kPerByte) ? 1 : 0;
}

}  // namespace simhost::storage
