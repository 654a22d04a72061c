// The state file: what is kept, what is undone, what is refused.
#include "store/store.h"

#include <SQLiteCpp/Database.h>
#include <SQLiteCpp/Exception.h>
#include <gtest/gtest.h>

#include <filesystem>
#include <fstream>
#include <string>

#include "store/ports.h"
#include "store/schema.h"
#include "store/switches.h"
#include "temporary_folder.h"

namespace {

using simhost::store::Access;
using simhost::store::Store;
using simhost::store::Switch;
using simhost::store::SwitchName;
using simhost::store::Transaction;
using simhost::store::UnusableState;

void furnish_nothing(Transaction &) {}

Switch named(std::string const &name) {
  return {.alias = name,
          .identifier = name,
          .portset = name,
          .max_ports = 1,
          .version = 1,
          .persistent = true};
}

void add(Store &store, std::string const &name) {
  Transaction work(store, Access::write);
  ASSERT_TRUE(simhost::store::add_switch(work, named(name)).has_value());
  work.commit();
}

bool has(Store &store, std::string const &name) {
  Transaction work(store, Access::read);
  return simhost::store::find_switch(work, SwitchName::alias, name).has_value();
}

std::string refusal_of(std::filesystem::path const &file) {
  try {
    Store const store(file, furnish_nothing);
    return "";
  } catch (UnusableState const &error) {
    return error.what();
  }
}

std::string content(std::filesystem::path const &file) {
  std::ifstream stream(file, std::ios::binary);
  return {std::istreambuf_iterator<char>(stream), {}};
}

TEST(Store, AFileOutlivesItsConnection) {
  TemporaryFolder const folder;
  {
    Store store(folder.file("host.db"), furnish_nothing);
    add(store, "a");
  }
  Store store(folder.file("host.db"), furnish_nothing);
  EXPECT_TRUE(has(store, "a"));
}

TEST(Store, AClosedFileIsTheWholeState) {
  TemporaryFolder const folder;
  {
    Store store(folder.file("host.db"), furnish_nothing);
    add(store, "a");
  }
  std::filesystem::copy_file(folder.file("host.db"), folder.file("copy.db"));
  Store copy(folder.file("copy.db"), furnish_nothing);
  EXPECT_TRUE(has(copy, "a"));
}

TEST(Store, OnlyANewStateIsFurnished) {
  TemporaryFolder const folder;
  int times = 0;
  auto const furnish = [&](Transaction &work) {
    ++times;
    simhost::store::add_uplink(work, "u");
  };
  { Store const first(folder.file("host.db"), furnish); }
  Store second(folder.file("host.db"), furnish);
  EXPECT_EQ(times, 1);
  Transaction work(second, Access::read);
  EXPECT_EQ(simhost::store::free_uplinks(work).size(), 1U);
}

TEST(Store, ConnectionsSeeEachOthersCommitsAtOnce) {
  TemporaryFolder const folder;
  Store first(folder.file("host.db"), furnish_nothing);
  Store second(folder.file("host.db"), furnish_nothing);
  add(first, "a");
  EXPECT_TRUE(has(second, "a"));
  add(second, "b");
  EXPECT_TRUE(has(first, "b"));
}

TEST(Store, AReaderDoesNotWaitForAWriterAndSeesTheStateBefore) {
  TemporaryFolder const folder;
  Store writer(folder.file("host.db"), furnish_nothing);
  Store reader(folder.file("host.db"), furnish_nothing);
  Transaction work(writer, Access::write);
  simhost::store::add_switch(work, named("a"));
  EXPECT_FALSE(has(reader, "a"));
  work.commit();
  EXPECT_TRUE(has(reader, "a"));
}

TEST(Store, ATransactionSeesOneStateThroughout) {
  TemporaryFolder const folder;
  Store writer(folder.file("host.db"), furnish_nothing);
  Store reader(folder.file("host.db"), furnish_nothing);
  Transaction work(reader, Access::read);
  EXPECT_FALSE(simhost::store::find_switch(work, SwitchName::alias, "a"));
  add(writer, "a");
  EXPECT_FALSE(simhost::store::find_switch(work, SwitchName::alias, "a"));
}

TEST(Store, WithoutACommitNothingHappened) {
  Store store(std::nullopt, furnish_nothing);
  {
    Transaction work(store, Access::write);
    simhost::store::add_switch(work, named("a"));
  }
  EXPECT_FALSE(has(store, "a"));
  add(store, "a");
}

TEST(Store, EveryNameFindsItsSwitch) {
  Store store(std::nullopt, furnish_nothing);
  Transaction work(store, Access::write);
  auto row = named("a");
  row.identifier = "i";
  row.portset = "p";
  auto const key = simhost::store::add_switch(work, row);
  for (auto const &[kind, name] : {std::pair{SwitchName::alias, "a"},
                                   {SwitchName::identifier, "i"},
                                   {SwitchName::portset, "p"}}) {
    auto const found = simhost::store::find_switch(work, kind, name);
    ASSERT_TRUE(found.has_value()) << name;
    EXPECT_EQ(found->key, key);
    EXPECT_EQ(found->row.identifier, "i");
  }
  EXPECT_FALSE(simhost::store::find_switch(work, SwitchName::identifier, "a"));
}

TEST(Store, LookUpsUseAnIndex) {
  TemporaryFolder const folder;
  { Store const store(folder.file("host.db"), furnish_nothing); }
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
  Store store(std::nullopt, furnish_nothing);
  Transaction work(store, Access::write);
  simhost::store::add_uplink(work, "u");
  auto const key = simhost::store::add_switch(work, named("a")).value();
  auto const port =
      simhost::store::add_port(work, key, "uplink1", simhost::store::PortKind::uplink).value();
  simhost::store::attach_uplink(work, "u", port);
  EXPECT_TRUE(simhost::store::free_uplinks(work).empty());
  simhost::store::remove_switch(work, key);
  EXPECT_EQ(simhost::store::free_uplinks(work), std::vector<std::string>{"u"});
  EXPECT_EQ(simhost::store::count_ports(work, key, simhost::store::PortKind::uplink), 0U);
}

TEST(Store, APortNumberIsNeverUsedTwice) {
  Store store(std::nullopt, furnish_nothing);
  Transaction work(store, Access::write);
  auto const add_switch_with_port = [&] {
    auto const key = simhost::store::add_switch(work, named("a")).value();
    auto const port =
        simhost::store::add_port(work, key, "p", simhost::store::PortKind::client).value();
    simhost::store::remove_switch(work, key);
    return port;
  };
  auto const first = add_switch_with_port();
  EXPECT_NE(add_switch_with_port(), first);
}

TEST(Store, APortIdentifierIsUniqueOnItsSwitch) {
  Store store(std::nullopt, furnish_nothing);
  Transaction work(store, Access::write);
  auto const a = simhost::store::add_switch(work, named("a")).value();
  auto const b = simhost::store::add_switch(work, named("b")).value();
  using simhost::store::PortKind;
  EXPECT_TRUE(simhost::store::add_port(work, a, "p", PortKind::client));
  EXPECT_FALSE(simhost::store::add_port(work, a, "p", PortKind::client));
  EXPECT_TRUE(simhost::store::add_port(work, b, "p", PortKind::client));
}

TEST(UnusableStateFile, ThatCannotBeOpened) {
  TemporaryFolder const folder;
  auto const file = folder.file("missing") / "host.db";
  EXPECT_EQ(refusal_of(file),
            "the state file " + file.string() + " cannot be used: unable to open database file");
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
  { Store const store(file, furnish_nothing); }
  SQLite::Database(file.string(), SQLite::OPEN_READWRITE).exec("PRAGMA user_version = 70");
  EXPECT_EQ(refusal_of(file), "the state file " + file.string() +
                                  " cannot be used: it has schema version 70, this host reads " +
                                  std::to_string(simhost::store::kSchemaVersion));
}

TEST(UnusableStateFile, AnEmptyFileIsANewState) {
  TemporaryFolder const folder;
  std::ofstream(folder.file("host.db")).flush();
  EXPECT_EQ(refusal_of(folder.file("host.db")), "");
}

}  // namespace
