// What is shared, as rows of a state.
#include "storage/shared.h"

#include <SQLiteCpp/SQLiteCpp.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "state_files.h"
#include "storage/ports.h"
#include "storage/store.h"
#include "storage/tunnels/fabrics.h"

namespace simhost::storage {
namespace {

using testing::ElementsAre;

std::vector<std::string> names(Transaction &transaction) {
  std::vector<std::string> all;
  for (auto const &shared : all_shared(transaction)) {
    all.push_back(shared.name.switch_identifier + "/" + shared.name.port);
  }
  return all;
}

TEST(WhatIsShared, IsARowForEachSwitchAndPort) {
  Store store(std::nullopt, [](ChangingTransaction &) {});
  ChangingTransaction transaction(store);
  Shared const port{.name = {"s", "p"}, .fabric = "{}", .image = std::vector{std::byte{7}}};
  put_shared(transaction, port);
  put_shared(transaction, {.name = {"s", ""}, .fabric = "", .image = {}, .fits = false});
  put_shared(transaction, {.name = {"r", ""}, .fabric = "{}", .image = {}});
  EXPECT_THAT(names(transaction), ElementsAre("r/", "s/", "s/p"));
  auto const all = all_shared(transaction);
  EXPECT_EQ(all[2].image, port.image);
  EXPECT_EQ(all[2].fabric, "{}");
  EXPECT_TRUE(all[2].fits);
  EXPECT_FALSE(all[1].fits);
  EXPECT_EQ(all[1].image, std::nullopt);
  EXPECT_TRUE(is_shared(transaction, "s"));
  EXPECT_FALSE(is_shared(transaction, "p"));

  put_shared(transaction, {.name = port.name, .fabric = "{}", .image = {}});
  EXPECT_EQ(all_shared(transaction)[2].image, std::nullopt);
  remove_shared(transaction, {"s", ""});
  EXPECT_FALSE(is_shared(transaction, "s"));
  remove_shared_switch(transaction, "s");
  EXPECT_THAT(names(transaction), ElementsAre("r/"));
}

TEST(WhatIsShared, IsOfOneMembership) {
  Store store(std::nullopt, [](ChangingTransaction &) {});
  ChangingTransaction transaction(store);
  EXPECT_FALSE(find_membership(transaction));
  put_membership(transaction, {.host = "one", .state = "x"});
  put_membership(transaction, {.host = "two", .state = "y"});
  EXPECT_EQ(find_membership(transaction)->host, "two");
  EXPECT_EQ(find_membership(transaction)->state, "y");
}

// As it was when each call looked at all that is shared.
void forget_how_to_note_what_is_touched(std::filesystem::path const &file) {
  SQLite::Database database(file, SQLite::OPEN_READWRITE);
  std::vector<std::string> triggers;
  SQLite::Statement select(database, "SELECT name FROM sqlite_schema WHERE type = 'trigger'");
  while (select.executeStep()) {
    triggers.push_back(select.getColumn(0).getString());
  }
  select.reset();
  for (auto const &trigger : triggers) {
    if (trigger.starts_with("touched_by_")) {
      database.exec("DROP TRIGGER " + trigger);
    }
  }
  database.exec(
      "DROP VIEW touched_place; DROP VIEW shared_port; DROP VIEW shared_switch;"
      "DROP TABLE touched;"
      "PRAGMA user_version = 13");
}

TEST(WhatIsShared, IsAllLookedAtOnceInAFileOfAnOlderHost) {
  TemporaryFolder const folder;
  auto const file = made(folder);
  {
    Store store(file, populate_nothing);
    ChangingTransaction transaction(store);
    auto const key = find_switch(transaction, SwitchName::alias, "a")->key;
    put_shared(transaction, {.name = {"a", ""}, .fabric = "{}", .image = {}});
    put_shared(transaction, {.name = {"a", "gone"}, .fabric = "{}", .image = {}});
    ASSERT_TRUE(add_port(transaction, key, "new", PortKind::client));
    forget_touched(transaction);
    transaction.commit();
  }
  forget_how_to_note_what_is_touched(file);
  Store store(file, populate_nothing);
  ReadingTransaction transaction(store);
  std::vector<std::string> found;
  for (auto const &name : touched(transaction)) {
    found.push_back(name.switch_identifier + "/" + name.port);
  }
  EXPECT_THAT(found, testing::UnorderedElementsAre("a/", "a/gone", "a/new"));
}

TEST(WhatIsShared, IsLookedAtOnceWhereAnOlderHostHasTunnels) {
  TemporaryFolder const folder;
  auto const file = made(folder);
  {
    Store store(file, populate_nothing);
    ChangingTransaction transaction(store);
    auto const key = find_switch(transaction, SwitchName::alias, "a")->key;
    put_shared(transaction, {.name = {"a", ""}, .fabric = "{}", .image = {}});
    add_uplink(transaction, "fabric0");
    put_fabric(transaction, key, "fabric0", Encapsulation::vxlan, 7, {});
    forget_touched(transaction);
    transaction.commit();
  }
  SQLite::Database(file, SQLite::OPEN_READWRITE)
      .exec(
          "DROP TRIGGER touched_by_added_fabric; DROP TRIGGER touched_by_changed_fabric;"
          "DROP TRIGGER touched_by_removed_fabric; DROP TRIGGER touched_by_added_peer;"
          "DROP TRIGGER touched_by_removed_peer; PRAGMA user_version = 14");
  Store store(file, populate_nothing);
  ReadingTransaction transaction(store);
  EXPECT_THAT(touched(transaction), testing::ElementsAre(SharedName{"a", ""}));
}

}  // namespace
}  // namespace simhost::storage
