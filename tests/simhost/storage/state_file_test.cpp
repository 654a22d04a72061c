// Which files the host takes for a state, and what it says of the others.
#include "storage/state_file.h"

#include <SQLiteCpp/Database.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sqlite3.h>
#include <sys/stat.h>

#include <filesystem>
#include <functional>
#include <string>

#include "schema_3.h"
#include "state_files.h"
#include "storage/query.h"
#include "storage/running/clock.h"
#include "storage/running/generations.h"
#include "storage/schema.h"
#include "storage/state_format.h"
#include "storage/store.h"
#include "storage/switches.h"
#include "temporary_folder.h"

namespace {

using simhost::storage::ChangingTransaction;
using simhost::storage::ReadingTransaction;
using simhost::storage::StateFile;
using simhost::storage::Store;
using testing::HasSubstr;

void execute(std::filesystem::path const &file, std::string const &sql) {
  SQLite::Database(file.string(), SQLite::OPEN_READWRITE | SQLite::OPEN_CREATE).exec(sql);
}

TEST(StateFile, IsMadeForItsUserAlone) {
  TemporaryFolder const folder;
  auto const before = umask(0);
  Store store(folder.file("host.db"), populate_nothing);
  umask(before);
  add(store, "a");
  for (auto const *name : {"host.db", "host.db-wal", "host.db-shm"}) {
    EXPECT_EQ(std::filesystem::status(folder.file(name)).permissions(),
              std::filesystem::perms::owner_read | std::filesystem::perms::owner_write)
        << name;
  }
}

TEST(StateFile, ThatIsNoRegularFileIsRefused) {
  TemporaryFolder const folder;
  auto const pipe = folder.file("pipe");
  ASSERT_EQ(mkfifo(pipe.c_str(), S_IRUSR | S_IWUSR), 0);
  for (auto const &file : {std::filesystem::path("/dev/null"), pipe, pipe.parent_path()}) {
    EXPECT_EQ(refusal_of(file), refused(file, "it is no regular file"));
    EXPECT_FALSE(std::filesystem::exists(file.string() + "-journal"));
    EXPECT_FALSE(std::filesystem::exists(file.string() + "-wal"));
  }
}

TEST(StateFile, OfLessThanADatabaseIsRefused) {
  TemporaryFolder const folder;
  auto const file = folder.file("host.db");
  for (std::string const &text : {std::string("x"), std::string(511, '\0')}) {
    write_file(file, text);
    EXPECT_EQ(refusal_of(file), refused(file, "file is not a database"));
    EXPECT_EQ(content(file), text) << "it is left as it was";
  }
}

// SQLite's way to files, on which another file is in a file's place just while that is opened.
class SwappedWhileOpened {
 public:
  SwappedWhileOpened(std::filesystem::path const &file, std::filesystem::path const &other) {
    swap = [=] {
      auto const aside = file.string() + ".aside";
      std::filesystem::rename(file, aside);
      std::filesystem::rename(other, file);
      std::filesystem::rename(aside, other);
    };
    vfs_ = *usual();
    vfs_.zName = "swapping";
    vfs_.xOpen = open;
    sqlite3_vfs_register(&vfs_, 1);
  }
  ~SwappedWhileOpened() { sqlite3_vfs_unregister(&vfs_); }
  SwappedWhileOpened(SwappedWhileOpened const &) = delete;
  SwappedWhileOpened &operator=(SwappedWhileOpened const &) = delete;

 private:
  static sqlite3_vfs *usual() { return sqlite3_vfs_find("unix"); }
  static int open(sqlite3_vfs * /*vfs*/, char const *name, sqlite3_file *file, int flags,
                  int *opened) {
    bool const is_state = (flags & SQLITE_OPEN_MAIN_DB) != 0;
    if (is_state) {
      swap();
    }
    int const result = usual()->xOpen(usual(), name, file, flags, opened);
    if (is_state) {
      swap();
    }
    return result;
  }

  static inline std::function<void()> swap;
  sqlite3_vfs vfs_{};
};

TEST(StateFile, InWhosePlaceWasAnotherWhileItWasOpenedIsRefused) {
  TemporaryFolder const folder;
  auto const file = folder.file("host.db");
  auto const other = folder.file("other.db");
  EXPECT_EQ(refusal_of(file), "");
  EXPECT_EQ(refusal_of(other), "");
  SwappedWhileOpened const swapped(file, other);
  EXPECT_EQ(refusal_of(file), refused(file, "another file took its place while it was opened"));
}

TEST(StateFile, MayBeNamedByALink) {
  TemporaryFolder const folder;
  made(folder);
  std::filesystem::create_symlink("host.db", folder.file("link"));
  Store store(folder.file("link"), populate_nothing);
  EXPECT_TRUE(has(store, "a"));
}

TEST(StateFile, IsNotMadeThroughALinkToNothing) {
  TemporaryFolder const folder;
  std::filesystem::create_symlink("elsewhere", folder.file("host.db"));
  EXPECT_EQ(refusal_of(folder.file("host.db")),
            refused(folder.file("host.db"), "No such file or directory"));
  EXPECT_FALSE(std::filesystem::exists(folder.file("elsewhere")));
}

TEST(StateFile, WithALinkBesideItIsRefused) {
  TemporaryFolder const folder;
  auto const file = made(folder);
  write_file(folder.file("precious"), "mine");
  for (auto const *name : {"host.db-wal", "host.db-shm", "host.db-journal"}) {
    std::filesystem::create_symlink("precious", folder.file(name));
    EXPECT_EQ(refusal_of(file), refused(file, std::string(name) + " beside it is no regular file"));
    std::filesystem::remove(folder.file(name));
  }
  EXPECT_EQ(content(folder.file("precious")), "mine");
}

TEST(StateFile, ThatWasRemovedIsToldOfAndNotMadeAgain) {
  TemporaryFolder const folder;
  StateFile const file(folder.file("host.db"));
  auto const gone =
      refused(folder.file("host.db"), "it was removed after this program had opened it");
  {
    Store store(file, populate_nothing);
    add(store, "a");
    std::filesystem::remove(folder.file("host.db"));
    EXPECT_EQ(refusal_by([&] { has(store, "a"); }), gone);
    EXPECT_EQ(refusal_by([&] { add(store, "b"); }), gone);
  }
  EXPECT_EQ(refusal_of(file), gone) << "after it was closed, as for a fork";
  EXPECT_FALSE(std::filesystem::exists(folder.file("host.db")));
}

TEST(StateFile, ThatIsRemovedBeforeACommitIsToldOf) {
  TemporaryFolder const folder;
  Store store(folder.file("host.db"), populate_nothing);
  EXPECT_EQ(refusal_by([&] {
              ChangingTransaction transaction(store);
              std::filesystem::remove(folder.file("host.db"));
              transaction.commit();
            }),
            refused(folder.file("host.db"), "it was removed after this program had opened it"));
}

TEST(StateFile, ThatWasReplacedIsToldOf) {
  TemporaryFolder const folder;
  StateFile const file(made(folder));
  std::filesystem::copy_file(folder.file("host.db"), folder.file("other.db"));
  auto const replaced = refused(folder.file("host.db"),
                                "another file took its place after this program had opened it");
  {
    Store store(file, populate_nothing);
    std::filesystem::rename(folder.file("other.db"), folder.file("host.db"));
    EXPECT_EQ(refusal_by([&] { has(store, "a"); }), replaced);
  }
  EXPECT_EQ(refusal_of(file), replaced);
}

TEST(StateFile, ThatWasEmptiedIsToldOf) {
  TemporaryFolder const folder;
  auto const file = made(folder);
  Store store(file, populate_nothing);
  write_file(file, "");
  EXPECT_EQ(refusal_by([&] { has(store, "a"); }),
            refused(file, "it was emptied after this program had opened it"));
}

struct Strange {
  char const *sql;
  char const *why;
};

Strange const kStrange[] = {
    {"CREATE TRIGGER t AFTER INSERT ON switch BEGIN UPDATE switch SET version = 2; END",
     "the trigger 't' in it is none of this host's"},
    {"CREATE VIEW v AS SELECT * FROM switch", "the view 'v' in it is none of this host's"},
    {"CREATE TABLE notes (text)", "the table 'notes' in it is none of this host's"},
    {"CREATE INDEX i ON switch (version)", "the index 'i' in it is none of this host's"},
    {"ALTER TABLE switch ADD COLUMN colour TEXT",
     "the table 'switch' in it is not as this host made it"},
    {"ALTER TABLE clock RENAME COLUMN value TO shown",
     "the table 'clock' in it is not as this host made it"},
    {"DROP TRIGGER client_added", "the trigger 'client_added' is missing in it"},
    {"DROP INDEX port_by_switch", "the index 'port_by_switch' is missing in it"},
    {"DROP TABLE fault", "the table 'fault' is missing in it"},
    {"DROP TRIGGER client_added; CREATE TRIGGER client_added AFTER INSERT ON port BEGIN"
     "  UPDATE switch SET clients = 7; END",
     "the trigger 'client_added' in it is not as this host made it"},
};

TEST(StateFile, WithOtherTablesIsRefused) {
  for (auto const &strange : kStrange) {
    TemporaryFolder const folder;
    auto const file = made(folder);
    execute(file, strange.sql);
    EXPECT_EQ(refusal_of(file), refused(file, strange.why)) << strange.sql;
  }
}

TEST(StateFile, WhoseTablesChangeIsRefusedAndLeftAlone) {
  for (auto const &strange : kStrange) {
    TemporaryFolder const folder;
    auto const file = made(folder);
    Store store(file, populate_nothing);
    execute(file, strange.sql);
    EXPECT_EQ(refusal_by([&] { add(store, "b"); }), refused(file, strange.why)) << strange.sql;
    SQLite::Database reader(file.string());
    EXPECT_EQ(reader.execAndGet("SELECT count(*) FROM switch").getInt(), 1) << strange.sql;
  }
}

TEST(StateFile, KnowsTablesThatAreOnlyWrittenOtherwise) {
  TemporaryFolder const folder;
  auto const file = made(folder);
  execute(file,
          "DROP INDEX port_by_switch;"
          "CREATE INDEX port_by_switch ON port\n  (switch, -- of the host\n number)");
  EXPECT_EQ(refusal_of(file), "");
}

TEST(StateFile, OfSchema3IsRead) {
  TemporaryFolder const folder;
  auto const file = folder.file("host.db");
  execute(file, kSchema3);
  Store store(file, populate_nothing);
  EXPECT_TRUE(has(store, "old"));
  add(store, "new");
  ReadingTransaction transaction(store);
  for (auto const &known : simhost::storage::all_switches(transaction)) {
    EXPECT_NO_THROW(simhost::storage::get_generations(transaction, known.key)) << known.row.alias;
  }
}

TEST(StateFile, WithoutARowThatEachHasIsRefused) {
  TemporaryFolder const folder;
  auto const file = made(folder);
  {
    Store store(file, populate_nothing);
    add(store, "a");
  }
  execute(file, "DELETE FROM clock; DELETE FROM generation");
  Store store(file, populate_nothing);
  ReadingTransaction transaction(store);
  auto const key = simhost::storage::all_switches(transaction).at(0).key;
  EXPECT_THAT(refusal_by([&] { simhost::storage::get_clock(transaction); }),
              HasSubstr("a row is missing in it"));
  EXPECT_THAT(refusal_by([&] { simhost::storage::get_generations(transaction, key); }),
              HasSubstr("a row is missing in it"));
}

TEST(StateFile, OfAVersionThatNothingReadsIsRefused) {
  TemporaryFolder const folder;
  auto const file = made(folder);
  for (auto const version : {2, 70, -1}) {
    execute(file, "PRAGMA user_version = " + std::to_string(version));
    EXPECT_THAT(refusal_of(file), HasSubstr("it has schema version " + std::to_string(version) +
                                            ", this host reads "));
    EXPECT_THAT(refusal_of(file),
                testing::EndsWith(std::to_string(simhost::storage::kSchemaVersion)));
  }
}

TEST(StateFile, IsBroughtForwardStepByStep) {
  SQLite::Database database(":memory:", SQLite::OPEN_READWRITE | SQLite::OPEN_CREATE);
  database.exec(kSchema3);
  char const *const steps[] = {"CREATE TABLE more (number)", "INSERT INTO more VALUES (5)"};
  simhost::storage::bring_forward(database, 3, steps);
  EXPECT_EQ(database.execAndGet("PRAGMA user_version").getInt(), 5);
  EXPECT_EQ(database.execAndGet("SELECT number FROM more").getInt(), 5);
}

std::string refusal_of_query(char const *sql) {
  TemporaryFolder const folder;
  Store store(folder.file("host.db"), populate_nothing);
  return refusal_by([&] {
    ReadingTransaction transaction(store);
    simhost::storage::Query query(transaction, sql);
    while (query.next()) {
    }
  });
}

TEST(StateFile, HasASchemaThatNoStatementWrites) {
  TemporaryFolder const folder;
  Store store(folder.file("host.db"), populate_nothing);
  ChangingTransaction transaction(store);
  simhost::storage::Change(transaction, "PRAGMA writable_schema = ON").next();
  EXPECT_THAT(
      refusal_by([&] { simhost::storage::Change(transaction, "DELETE FROM sqlite_schema").run(); }),
      HasSubstr("cannot be used: SQLite refuses it"));
}

TEST(StateFile, KeepsNoStatementBusyForEver) {
  EXPECT_THAT(refusal_of_query("WITH RECURSIVE n(x) AS (SELECT 1 UNION ALL SELECT x + 1 FROM n)"
                               " SELECT count(*) FROM n"),
              HasSubstr("cannot be used: it keeps a statement busy without end"));
}

TEST(StateFile, YieldsNoRowsForEver) {
  EXPECT_THAT(refusal_of_query("WITH RECURSIVE n(x) AS (SELECT 1 UNION ALL SELECT x + 1 FROM n)"
                               " SELECT x FROM n"),
              HasSubstr("cannot be used: it yields more than it can hold"));
}

TEST(StateFile, ThatIsDamagedIsNamed) {
  TemporaryFolder const folder;
  auto const file = made(folder);
  auto bytes = content(file);
  for (std::size_t page = 1; page * 4096 < bytes.size(); ++page) {
    bytes.replace(page * 4096, 8, 8, '\xFF');
  }
  write_file(file, bytes);
  EXPECT_EQ(refusal_by([&] {
              Store store(file, populate_nothing);
              has(store, "a");
            }),
            refused(file, "it is damaged"));
}

}  // namespace
