// The state file: what is kept, what is undone, what is refused.
#include "storage/store.h"

#include <SQLiteCpp/Database.h>
#include <gtest/gtest.h>

#include <chrono>
#include <cstdint>
#include <filesystem>
#include <fstream>
#include <list>
#include <stdexcept>
#include <string>
#include <type_traits>

#include "largest_file.h"
#include "named_switch.h"
#include "storage/ports.h"
#include "storage/query.h"
#include "storage/running/generations.h"
#include "storage/schema.h"
#include "storage/switches.h"
#include "temporary_folder.h"

namespace {

using simhost::storage::ChangingTransaction;
using simhost::storage::ReadingTransaction;
using simhost::storage::Store;
using simhost::storage::SwitchName;
using simhost::storage::UnusableState;

void populate_nothing(ChangingTransaction &) {}

void add(Store &store, std::string const &name) {
  ChangingTransaction transaction(store);
  ASSERT_TRUE(simhost::storage::add_switch(transaction, named(name)).has_value());
  transaction.commit();
}

bool has(Store &store, std::string const &name) {
  ReadingTransaction transaction(store);
  return simhost::storage::find_switch(transaction, SwitchName::alias, name).has_value();
}

std::string refusal_of(std::filesystem::path const &file) {
  try {
    Store const store(file, populate_nothing);
    return "";
  } catch (UnusableState const &error) {
    return error.what();
  }
}

TEST(Store, AFileOutlivesItsConnection) {
  TemporaryFolder const folder;
  {
    Store store(folder.file("host.db"), populate_nothing);
    add(store, "a");
  }
  Store store(folder.file("host.db"), populate_nothing);
  EXPECT_TRUE(has(store, "a"));
}

TEST(Store, AClosedFileIsTheWholeState) {
  TemporaryFolder const folder;
  {
    Store store(folder.file("host.db"), populate_nothing);
    add(store, "a");
  }
  std::filesystem::copy_file(folder.file("host.db"), folder.file("copy.db"));
  Store copy(folder.file("copy.db"), populate_nothing);
  EXPECT_TRUE(has(copy, "a"));
}

TEST(Store, OnlyANewStateIsPopulated) {
  TemporaryFolder const folder;
  int times = 0;
  auto const populate = [&](ChangingTransaction &transaction) {
    ++times;
    simhost::storage::add_uplink(transaction, "u");
  };
  { Store const first(folder.file("host.db"), populate); }
  Store second(folder.file("host.db"), populate);
  EXPECT_EQ(times, 1);
  ReadingTransaction transaction(second);
  EXPECT_EQ(simhost::storage::free_uplinks(transaction).size(), 1U);
}

TEST(Store, ConnectionsSeeEachOthersCommitsAtOnce) {
  TemporaryFolder const folder;
  Store first(folder.file("host.db"), populate_nothing);
  Store second(folder.file("host.db"), populate_nothing);
  add(first, "a");
  EXPECT_TRUE(has(second, "a"));
  add(second, "b");
  EXPECT_TRUE(has(first, "b"));
}

TEST(Store, CommitsOfOthersAreToldApartAndOnesOwnAreNone) {
  TemporaryFolder const folder;
  Store ours(folder.file("host.db"), populate_nothing);
  Store theirs(folder.file("host.db"), populate_nothing);
  auto const commits = [&] {
    ReadingTransaction transaction(ours);
    return simhost::storage::commits_of_others(transaction);
  };
  auto const before = commits();
  EXPECT_EQ(commits(), before);
  add(ours, "a");
  EXPECT_EQ(commits(), before);
  add(theirs, "b");
  auto const after = commits();
  EXPECT_NE(after, before);
  add(ours, "c");
  EXPECT_EQ(commits(), after);
}

TEST(Store, AReaderDoesNotWaitForAWriterAndSeesTheStateBefore) {
  TemporaryFolder const folder;
  Store writer(folder.file("host.db"), populate_nothing);
  Store reader(folder.file("host.db"), populate_nothing);
  ChangingTransaction transaction(writer);
  simhost::storage::add_switch(transaction, named("a"));
  EXPECT_FALSE(has(reader, "a"));
  transaction.commit();
  EXPECT_TRUE(has(reader, "a"));
}

TEST(Store, AWriterWaitsForWhatIsLeftOfItsPatience) {
  TemporaryFolder const folder;
  Store holder(folder.file("host.db"), populate_nothing);
  Store waiter(folder.file("host.db"), populate_nothing);
  ChangingTransaction const held(holder);
  simhost::storage::Patience patience(std::chrono::milliseconds(1));
  for (int time = 0; time < 2; ++time) {
    try {
      ChangingTransaction const transaction(waiter, patience);
      ADD_FAILURE() << "two write at once";
    } catch (simhost::storage::StateFailure const &failure) {
      EXPECT_EQ(failure.kind(), simhost::storage::FailureKind::busy);
      EXPECT_EQ(failure.what(), "another process keeps the state file " +
                                    folder.file("host.db").string() + " locked");
    }
    EXPECT_EQ(patience.left(), std::chrono::nanoseconds::zero());
  }
  ReadingTransaction transaction(waiter, patience);
  simhost::storage::Query query(transaction, "PRAGMA busy_timeout");
  query.require_row();
  EXPECT_EQ(query.integer(0), 0) << "SQLite waits longer";
}

void add_many(ChangingTransaction &transaction) {
  for (int number = 0; number < 200; ++number) {
    simhost::storage::add_switch(transaction, named("s" + std::to_string(number)));
  }
}

TEST(Store, WhatIsFlushedNeedsNextToNoRoomToBeCommitted) {
  TemporaryFolder const folder;
  auto const file = folder.file("host.db");
  Store store(file, populate_nothing);
  Store other(file, populate_nothing);
  ChangingTransaction transaction(store);
  add_many(transaction);
  transaction.flush();
  EXPECT_FALSE(has(other, "s7"));
  LargestFile const full(bytes_of_log(file) + kPageInLog);
  transaction.commit();
  EXPECT_TRUE(has(other, "s7"));
}

TEST(Store, AFileWithoutRoomSaysSoWhenItIsFlushed) {
  TemporaryFolder const folder;
  auto const file = folder.file("host.db");
  Store store(file, populate_nothing);
  {
    ChangingTransaction transaction(store);
    add_many(transaction);
    LargestFile const full(bytes_of_log(file));
    try {
      transaction.flush();
      ADD_FAILURE() << "it had room";
    } catch (simhost::storage::StateFailure const &failure) {
      EXPECT_EQ(failure.kind(), simhost::storage::FailureKind::io);
    }
  }
  EXPECT_FALSE(has(store, "s7"));
  add(store, "a");
  EXPECT_TRUE(has(store, "a"));
}

// What changes the state comes down to one of these, so that the compiler knows it everywhere.
static_assert(
    std::is_constructible_v<simhost::storage::Change, ChangingTransaction &, char const *>);
static_assert(
    !std::is_constructible_v<simhost::storage::Change, ReadingTransaction &, char const *>);

TEST(Store, AQueryChangesNothingWhateverItSays) {
  Store store(std::nullopt, populate_nothing);
  ChangingTransaction transaction(store);
  EXPECT_THROW(simhost::storage::Query(transaction, "DELETE FROM switch"), std::logic_error);
  EXPECT_NO_THROW(simhost::storage::Change(transaction, "DELETE FROM switch"));
}

TEST(Store, ATransactionSeesOneStateThroughout) {
  TemporaryFolder const folder;
  Store writer(folder.file("host.db"), populate_nothing);
  Store reader(folder.file("host.db"), populate_nothing);
  ReadingTransaction transaction(reader);
  EXPECT_FALSE(simhost::storage::find_switch(transaction, SwitchName::alias, "a"));
  add(writer, "a");
  EXPECT_FALSE(simhost::storage::find_switch(transaction, SwitchName::alias, "a"));
}

TEST(Store, WithoutACommitNothingHappened) {
  Store store(std::nullopt, populate_nothing);
  {
    ChangingTransaction transaction(store);
    simhost::storage::add_switch(transaction, named("a"));
  }
  EXPECT_FALSE(has(store, "a"));
  add(store, "a");
}

TEST(Store, EveryNameFindsItsSwitch) {
  Store store(std::nullopt, populate_nothing);
  ChangingTransaction transaction(store);
  auto row = named("a");
  row.identifier = "i";
  row.portset = "p";
  auto const key = simhost::storage::add_switch(transaction, row);
  for (auto const &[kind, name] : {std::pair{SwitchName::alias, "a"},
                                   {SwitchName::identifier, "i"},
                                   {SwitchName::portset, "p"}}) {
    auto const found = simhost::storage::find_switch(transaction, kind, name);
    ASSERT_TRUE(found.has_value()) << name;
    EXPECT_EQ(found->key, key);
    EXPECT_EQ(found->row.identifier, "i");
  }
  EXPECT_FALSE(simhost::storage::find_switch(transaction, SwitchName::identifier, "a"));
}

TEST(Store, LookUpsUseAnIndex) {
  TemporaryFolder const folder;
  { Store const store(folder.file("host.db"), populate_nothing); }
  SQLite::Database database(folder.file("host.db").string());
  constexpr auto kProperty =
      "property WHERE switch = 1 AND scope = 0 AND ifnull(port, 0) = 0 AND name = ''";
  for (auto const *condition :
       {"switch WHERE alias = ''", "switch WHERE identifier = ''", "switch WHERE portset = ''",
        "switch WHERE key > 1 ORDER BY key LIMIT 1", "uplink WHERE name = ''",
        "port WHERE switch = 1 AND identifier = ''", "port WHERE switch = 1 AND external_id = ''",
        "port WHERE switch = 1 AND number > 1 ORDER BY number LIMIT 1",
        "port WHERE switch = 1 AND is_uplink", kProperty,
        "property WHERE switch = 1 AND name = '' AND port IS NOT NULL",
        "address WHERE switch = 1 AND mac = x'' AND vid = 0 AND vni = 0",
        "address WHERE switch = 1 AND ifnull(port, 0) = 1 ORDER BY mac, vid, vni",
        "address WHERE switch = 1 AND ages AND seen <= 1", "learned WHERE switch = 1 AND place = 0",
        "counter WHERE switch = 1 AND ifnull(port, 0) = 0 AND session = ''",
        "mcast_group WHERE port = 1 AND address = x''"}) {
    SQLite::Statement plan(database, std::string("EXPLAIN QUERY PLAN SELECT * FROM ") + condition);
    ASSERT_TRUE(plan.executeStep());
    auto const step = plan.getColumn("detail").getString();
    EXPECT_EQ(step.rfind("SEARCH", 0), 0U) << condition << ": " << step;
    EXPECT_FALSE(plan.executeStep()) << condition << ": a second step, to sort";
  }
}

TEST(Store, ARemovedSwitchTakesItsPortsAlongAndFreesItsUplinks) {
  Store store(std::nullopt, populate_nothing);
  ChangingTransaction transaction(store);
  simhost::storage::add_uplink(transaction, "u");
  auto const key = simhost::storage::add_switch(transaction, named("a")).value();
  auto const port =
      simhost::storage::add_port(transaction, key, "uplink1", simhost::storage::PortKind::uplink)
          .value();
  simhost::storage::attach_uplink(transaction, "u", port);
  EXPECT_TRUE(simhost::storage::free_uplinks(transaction).empty());
  simhost::storage::remove_switch(transaction, key);
  EXPECT_EQ(simhost::storage::free_uplinks(transaction), std::vector<std::string>{"u"});
  EXPECT_EQ(simhost::storage::count_ports(transaction, key, simhost::storage::PortKind::uplink),
            0U);
}

TEST(Store, APortNumberIsNeverUsedTwice) {
  Store store(std::nullopt, populate_nothing);
  ChangingTransaction transaction(store);
  auto const add_switch_with_port = [&] {
    auto const key = simhost::storage::add_switch(transaction, named("a")).value();
    auto const port =
        simhost::storage::add_port(transaction, key, "p", simhost::storage::PortKind::client)
            .value();
    simhost::storage::remove_switch(transaction, key);
    return port;
  };
  auto const first = add_switch_with_port();
  EXPECT_NE(add_switch_with_port(), first);
}

TEST(Store, APortIdentifierIsUniqueOnItsSwitch) {
  Store store(std::nullopt, populate_nothing);
  ChangingTransaction transaction(store);
  auto const a = simhost::storage::add_switch(transaction, named("a")).value();
  auto const b = simhost::storage::add_switch(transaction, named("b")).value();
  using simhost::storage::PortKind;
  EXPECT_TRUE(simhost::storage::add_port(transaction, a, "p", PortKind::client));
  EXPECT_FALSE(simhost::storage::add_port(transaction, a, "p", PortKind::client));
  EXPECT_TRUE(simhost::storage::add_port(transaction, b, "p", PortKind::client));
}

// What reading a value, made by SQL, says is wrong with it; empty if nothing is.
template <typename Read>
std::string complaint_about(std::string const &value, Read const &read) {
  Store store(std::nullopt, populate_nothing);
  ReadingTransaction transaction(store);
  static std::list<std::string> statements;  // a query is of a text that stays
  simhost::storage::Query select(transaction,
                                 statements.emplace_back("SELECT " + value + " AS answer"));
  select.next();
  try {
    static_cast<void>(read(select));
    return "";
  } catch (UnusableState const &error) {
    return error.what();
  }
}

std::string of_answer(std::string const &what) {
  return "the state file :memory: cannot be used: the column 'answer' holds " + what;
}

TEST(AValueThatIsRead, IsOfItsType) {
  auto const integer = [](auto const &query) { return query.integer(0); };
  auto const text = [](auto const &query) { return query.text(0); };
  auto const bytes = [](auto const &query) { return query.bytes(0); };
  for (auto const *other : {"'1'", "x'31'", "1.0", "NULL"}) {
    EXPECT_EQ(complaint_about(other, integer), of_answer("no integer")) << other;
  }
  for (auto const *other : {"1", "x'31'", "1.0", "NULL"}) {
    EXPECT_EQ(complaint_about(other, text), of_answer("no text")) << other;
  }
  for (auto const *other : {"1", "'1'", "1.0", "NULL"}) {
    EXPECT_EQ(complaint_about(other, bytes), of_answer("no bytes")) << other;
  }
  EXPECT_EQ(complaint_about("1", integer), "");
  EXPECT_EQ(complaint_about("'1'", text), "");
  EXPECT_EQ(complaint_about("x''", bytes), "");
}

TEST(AValueThatIsRead, IsWithinItsBounds) {
  auto const vlan = [](auto const &query) { return query.integer(0, 1, 4094); };
  auto const flag = [](auto const &query) { return query.flag(0); };
  auto const number = [](auto const &query) { return query.template number<std::uint32_t>(0); };
  EXPECT_EQ(complaint_about("0", vlan), of_answer("0"));
  EXPECT_EQ(complaint_about("4095", vlan), of_answer("4095"));
  EXPECT_EQ(complaint_about("4094", vlan), "");
  EXPECT_EQ(complaint_about("2", flag), of_answer("2"));
  EXPECT_EQ(complaint_about("-1", number), of_answer("-1"));
  EXPECT_EQ(complaint_about("4294967296", number), of_answer("4294967296"));
  EXPECT_EQ(complaint_about("4294967295", number), "");
}

TEST(AValueThatIsRead, IsOfItsLength) {
  auto const mac = [](auto const &query) { return query.bytes(0, 6); };
  auto const text = [](auto const &query) { return query.text(0); };
  EXPECT_EQ(complaint_about("x'0200'", mac), of_answer("2 bytes instead of 6"));
  EXPECT_EQ(complaint_about("CAST(x'610062' AS TEXT)", text), of_answer("a text with a NUL in it"));
}

TEST(UnusableStateFile, ThatCannotBeOpened) {
  TemporaryFolder const folder;
  auto const file = folder.file("missing") / "host.db";
  EXPECT_EQ(refusal_of(file),
            "the state file " + file.string() + " cannot be used: No such file or directory");
}

TEST(UnusableStateFile, ThatIsSomethingElse) {
  TemporaryFolder const folder;
  for (std::string const &text : {std::string("hello\n"), std::string(5000, 'x')}) {
    auto const file = folder.file("notes.txt");
    std::ofstream(file) << text;
    EXPECT_EQ(refusal_of(file),
              "the state file " + file.string() + " cannot be used: file is not a database");
    EXPECT_EQ(content(file), text) << "it is left as it was";
  }
}

TEST(UnusableStateFile, ThatIsAnotherProgramsDatabase) {
  TemporaryFolder const folder;
  auto const file = folder.file("other.db");
  SQLite::Database(file.string(), SQLite::OPEN_READWRITE | SQLite::OPEN_CREATE)
      .exec("CREATE TABLE note (text)");
  auto const before = content(file);
  EXPECT_EQ(refusal_of(file), "the state file " + file.string() +
                                  " cannot be used: it is a database of another program");
  EXPECT_EQ(content(file), before) << "it is left as it was";
}

TEST(UnusableStateFile, ThatHasAnotherSchema) {
  TemporaryFolder const folder;
  auto const file = folder.file("host.db");
  { Store const store(file, populate_nothing); }
  SQLite::Database(file.string(), SQLite::OPEN_READWRITE).exec("PRAGMA user_version = 70");
  EXPECT_EQ(refusal_of(file), "the state file " + file.string() +
                                  " cannot be used: it has schema version 70, this host reads " +
                                  std::to_string(simhost::storage::kOldestSchema) + " to " +
                                  std::to_string(simhost::storage::kSchemaVersion));
}

TEST(UnusableStateFile, AnEmptyFileIsANewState) {
  TemporaryFolder const folder;
  std::ofstream(folder.file("host.db")).flush();
  EXPECT_EQ(refusal_of(folder.file("host.db")), "");
}

}  // namespace
