// How the rows of ports are named in a transaction, and who may write new ones.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <functional>
#include <string>
#include <utility>
#include <vector>

#include "fabric/rows/operations.h"

namespace simhost::fabric {
namespace {

using testing::ElementsAre;

Json record(std::string const &host) {
  return {{"host", host}, {"settings", Json::object()}};
}

Change change(std::string const &port, Json now) {
  return {
      .name = {.switch_identifier = "s", .port = port}, .was = record(""), .now = std::move(now)};
}

// What each of the operations looks for.
std::vector<Json> wheres(Json const &operations) {
  std::vector<Json> all;
  for (auto const &operation : operations) {
    all.push_back(operation.at("where"));
  }
  return all;
}

// With a condition of any other column the server would look at every row, for each operation.
TEST(Operations, NameAPortThatIsKnownByItsUuid) {
  RowNames const ports{{{.switch_identifier = "s", .port = "a"}, "1-2-3"}};
  auto const where = Json::parse(R"([["_uuid", "==", ["uuid", "1-2-3"]]])");
  EXPECT_THAT(wheres(operations_of({change("a", record("here"))}, ports, {})),
              ElementsAre(where, where));
  EXPECT_THAT(wheres(operations_of({change("a", nullptr)}, ports, {})), ElementsAre(where, where));
}

TEST(Operations, NameAPortThatIsNotKnownByItsName) {
  auto const where = Json::parse(R"([["switch", "==", "s"], ["id", "==", "a"]])");
  auto named = wheres(operations_of({change("a", record("here"))}, {}, {}));
  for (auto &conditions : named) {
    std::sort(conditions.begin(), conditions.end(), std::greater<>());
  }
  EXPECT_THAT(named, ElementsAre(where, where));
}

TEST(Operations, GiveNewPortsTheWritersOfTheirSwitch) {
  auto const writers = ovsdb::map({{"one", "one"}, {"two", "two"}});
  auto added = change("a", record(""));
  added.was = nullptr;
  auto const operations = operations_of({added, added}, {}, {{"s", writers}});
  ASSERT_EQ(operations.size(), 3);
  EXPECT_EQ(operations[0].at("op"), "wait");
  EXPECT_EQ(operations[0].at("table"), "Switch");
  EXPECT_EQ(operations[0].at("rows"), Json::array({{{"writers", writers}}}));
  EXPECT_EQ(operations[1].at("row").at("writers"), writers);
  EXPECT_EQ(operations[2].at("row").at("writers"), writers);
}

TEST(Operations, LetWhoSharesASwitchWriteIt) {
  Json const now{{"alias", "lab"}, {"hosts", {"one"}}, {"settings", Json::object()}};
  Change const shared{.name = {.switch_identifier = "s", .port = ""}, .was = nullptr, .now = now};
  auto port = change("a", record(""));
  port.was = nullptr;
  auto const operations = operations_of({shared, port}, {}, {});
  ASSERT_EQ(operations.size(), 2);
  auto const own = ovsdb::map({{"one", "one"}});
  EXPECT_EQ(operations[0].at("row").at("writers"), own);
  EXPECT_EQ(operations[1].at("row").at("writers"), own);
}

}  // namespace
}  // namespace simhost::fabric
