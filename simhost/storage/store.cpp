// Opening the state without ever touching a file that is not ours, and running work on it.
#include "storage/store.h"

#include <chrono>
#include <utility>

#include "storage/connection.h"
#include "storage/schema.h"

namespace simhost::storage {

Store::Store(std::optional<StateFile> file, Populate const &populate)
    : connection_(std::make_unique<Connection>(std::move(file))) {
  connection_->guarded([&] { prepare(populate); });
}

Store::~Store() = default;

bool Store::is_current() const {
  auto const &file = connection_->file();
  return !file || file->is_writable() || file->is_unchanged();
}

void Store::refuse(std::string const &why) const {
  connection_->refuse(why);
}

void Store::prepare(Populate const &populate) {
  auto &database = connection_->database();
  auto const &file = connection_->file();
  // Nothing may be written before it is known what is there.
  auto const version = connection_->patiently([&] {
    // In one transaction, or another process could create the state between two of the questions.
    ReadingTransaction const look(*this);
    return version_of(database);
  });
  if (version != kSchemaVersion && file && !file->is_writable()) {
    refuse("it has no state of this version in it, and this program may only look at it");
  }
  if (version == kBlank && file) {
    connection_->patiently([&] { database.exec("PRAGMA journal_mode = WAL"); });
  }
  if (version != kSchemaVersion) {
    connection_->patiently([&] { create_or_bring_forward(populate); });
  }
  if (file) {
    // A commit is in the operating system's hands when it returns, so it outlives a killed process;
    // waiting for the disk as well would only guard against a power cut.
    database.exec("PRAGMA synchronous = NORMAL");
    connection_->patiently([&] {
      ReadingTransaction const look(*this);
      connection_->watch();
    });
  }
}

void Store::create_or_bring_forward(Populate const &populate) {
  ChangingTransaction transaction(*this);
  auto &database = connection_->database();
  if (auto const version = version_of(database); version == kBlank) {
    create_state(database);
    populate(transaction);
  } else {
    bring_forward(database, version);
  }
  transaction.commit();
}

Transaction::Transaction(Store &store, Access access, Patience &patience)
    : store_(store), access_(access) {
  begin(patience);
}

Transaction::Transaction(Store &store, Access access) : store_(store), access_(access) {
  Patience patience;
  begin(patience);
}

Transaction::~Transaction() {
  if (!open_) {
    return;
  }
  try {
    connection().roll_back();
  } catch (std::exception const &) {
    // The next transaction cannot begin then, and says why.
  }
}

void Transaction::begin(Patience &patience) {
  connection().require_in_place();
  patience.spend([&](std::chrono::nanoseconds left) {
    connection().begin(access_ == Access::write ? "BEGIN IMMEDIATE" : "BEGIN", left);
  });
}

void Transaction::commit() {
  connection().commit();
  open_ = false;
  if (access_ == Access::write) {
    // Into a file that is gone it was written for nobody.
    connection().require_in_place();
  }
}

void ChangingTransaction::flush() {
  connection().flush();
}

std::int64_t ChangingTransaction::last_key() const {
  return connection().database().getLastInsertRowid();
}

bool commit_if_free(Store &store, std::function<void(ChangingTransaction &)> const &change) {
  try {
    Patience none(std::chrono::nanoseconds::zero());
    ChangingTransaction transaction(store, none);
    change(transaction);
    transaction.commit();
    return true;
  } catch (StateFailure const &failure) {
    if (failure.kind() != FailureKind::busy) {
      throw;
    }
    return false;
  }
}

}  // namespace simhost::storage
