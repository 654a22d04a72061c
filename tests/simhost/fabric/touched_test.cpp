// What a host has yet to follow of a fabric, as the rows of a replica change.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>

#include "fabric/rows/touched.h"

namespace simhost::fabric {
namespace {

using ovsdb::Column;
using testing::ElementsAre;
using testing::IsEmpty;
using testing::SizeIs;

constexpr auto *kHost = "here";

ovsdb::Schema schema() {
  Column const text{.kind = Column::Kind::single, .usual = ""};
  Column const set{.kind = Column::Kind::set, .usual = ovsdb::set({})};
  Column const map{.kind = Column::Kind::map, .usual = ovsdb::map({})};
  return {{"Switch", {{"id", text}, {"alias", text}, {"hosts", set}, {"settings", map}}},
          {"Port",
           {{"switch", text}, {"id", text}, {"host", text}, {"settings", map}, {"counters", map}}}};
}

Json hosts(std::vector<Json> const &names) {
  return ovsdb::set(names);
}

SharedName port(std::string const &id) {
  return {.switch_identifier = "s", .port = id};
}

// A host that has followed a switch with many ports.
class TouchedRows : public testing::Test {
 protected:
  void SetUp() override {
    auto ports = Json::object();
    for (int number = 0; number < 1000; ++number) {
      auto const id = std::to_string(number);
      ports["u" + id] = {{"initial", {{"switch", "s"}, {"id", id}}}};
    }
    change("Switch", "us", "initial", {{"id", "s"}, {"alias", "lab"}, {"hosts", hosts({kHost})}});
    apply({{"Port", ports}});
    touched_.clear();
  }

  void apply(Json const &updates) { touched_.add(replica_, replica_.apply(updates)); }
  void change(std::string const &table, std::string const &uuid, std::string const &kind,
              Json const &row) {
    apply({{table, {{uuid, {{kind, row}}}}}});
  }
  [[nodiscard]] News news() const { return touched_.news(replica_); }

  ovsdb::Replica replica_{schema()};
  Touched touched_{kHost};
};

TEST_F(TouchedRows, AreNone) {
  EXPECT_TRUE(touched_.empty());
  EXPECT_THAT(*news().names, IsEmpty());
}

TEST_F(TouchedRows, AreAllToOneWhoWasAway) {
  touched_.add_all();
  EXPECT_EQ(news().names, std::nullopt);
  EXPECT_THAT(news().records, SizeIs(1001));
}

TEST_F(TouchedRows, AreThoseThatChanged) {
  change("Port", "u7", "modify", {{"host", "there"}});
  EXPECT_THAT(*news().names, ElementsAre(port("7")));
  ASSERT_THAT(news().records, SizeIs(1));
  EXPECT_EQ(news().records.at(port("7")), (Json{{"host", "there"}, {"settings", Json::object()}}));
}

TEST_F(TouchedRows, AreNewAndGone) {
  change("Port", "new", "insert", {{"switch", "s"}, {"id", "new"}});
  change("Port", "u7", "delete", nullptr);
  EXPECT_THAT(*news().names, ElementsAre(port("7"), port("new")));
  EXPECT_THAT(news().records, SizeIs(1));
  EXPECT_TRUE(news().records.contains(port("new")));
}

TEST_F(TouchedRows, AreThereIfAnotherHasTheNameOfOneThatWent) {
  apply({{"Port",
          {{"a", {{"insert", {{"switch", "s"}, {"id", "7"}, {"host", "there"}}}}},
           {"u7", {{"delete", nullptr}}}}}});
  EXPECT_EQ(news().records.at(port("7")).at("host"), "there");
  change("Port", "a", "delete", nullptr);
  EXPECT_THAT(*news().names, ElementsAre(port("7")));
  EXPECT_THAT(news().records, IsEmpty());
}

TEST_F(TouchedRows, HaveBothNamesOfOneThatHasAnotherName) {
  change("Port", "u7", "modify", {{"id", "seven"}});
  EXPECT_THAT(*news().names, ElementsAre(port("7"), port("seven")));
  EXPECT_THAT(news().records, SizeIs(1));
}

TEST_F(TouchedRows, AreASwitchWithoutItsPorts) {
  change("Switch", "us", "modify", {{"alias", "other"}});
  // Who else has it is of it alone.
  change("Switch", "us", "modify", {{"hosts", hosts({"there"})}});
  EXPECT_THAT(*news().names, ElementsAre(port("")));
  EXPECT_EQ(news().records.at(port("")).at("hosts"), Json::array({kHost, "there"}));
}

TEST_F(TouchedRows, AreAllWithASwitchThatComesOrGoes) {
  change("Switch", "us", "modify", {{"hosts", hosts({kHost})}});
  EXPECT_EQ(news().names, std::nullopt);
  EXPECT_THAT(news().records, IsEmpty());
  touched_.clear();
  change("Switch", "us", "modify", {{"hosts", hosts({kHost})}});
  EXPECT_EQ(news().names, std::nullopt);
  EXPECT_THAT(news().records, SizeIs(1001));
}

TEST_F(TouchedRows, CountWithoutBeingOthers) {
  auto const counters = ovsdb::map({{"there", R"({"pktsInUnicast": 7})"}});
  auto const counted = testing::ElementsAre(testing::Pair("there", Counts{{"pktsInUnicast", 7}}));
  change("Port", "u7", "modify", {{"counters", counters}});
  EXPECT_TRUE(touched_.empty());
  EXPECT_THAT(news().counts, IsEmpty());
  // Once it comes here.
  change("Port", "u7", "modify", {{"host", kHost}});
  EXPECT_TRUE(touched_.has_others());
  EXPECT_THAT(*news().names, ElementsAre(port("7")));
  EXPECT_THAT(news().counts.at(port("7")), counted);
  touched_.clear();
  EXPECT_TRUE(touched_.empty());
  touched_.add_all();
  EXPECT_THAT(news().counts, SizeIs(1));
  touched_.clear();
  change("Port", "u7", "modify", {{"counters", ovsdb::map({{"other", "{}"}})}});
  EXPECT_FALSE(touched_.empty());
  EXPECT_FALSE(touched_.has_others());
  EXPECT_THAT(*news().names, IsEmpty());
  EXPECT_THAT(news().counts.at(port("7")), SizeIs(2));
}

TEST_F(TouchedRows, AreNoRowsOfSwitchesOfOthers) {
  change("Switch", "other", "insert", {{"id", "t"}, {"hosts", hosts({"there"})}});
  EXPECT_TRUE(touched_.empty());
  change("Port", "p", "insert", {{"switch", "t"}, {"id", "1"}});
  EXPECT_THAT(news().records, IsEmpty());
}

}  // namespace
}  // namespace simhost::fabric
