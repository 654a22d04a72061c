// Finding the rows of ports by their names, as they change.
#include "fabric/rows/port_rows.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

namespace simhost::fabric {
namespace {

using testing::ElementsAre;
using testing::IsEmpty;
using testing::Pair;

SharedName named(std::string const &port) {
  return {.switch_identifier = "s", .port = port};
}

Json row(std::string const &kind, std::string const &id, std::string const &of = "s") {
  return {{kind, {{"switch", of}, {"id", id}}}};
}

class RowsOfPorts : public testing::Test {
 protected:
  void SetUp() override {
    apply({{"1", row("initial", "a")}, {"2", row("initial", "a", "t")}});
    rows_.begin(replica_);
  }

  std::vector<ovsdb::RowChange> apply(Json const &ports) {
    return replica_.apply({{"Port", ports}});
  }
  void change(Json const &ports) { rows_.follow(replica_, apply(ports)); }
  [[nodiscard]] RowNames find(std::string const &port) const {
    return rows_.of(replica_, {{.name = named(port), .was = nullptr, .now = nullptr}});
  }

  ovsdb::Replica replica_{
      ovsdb::Schema{{"Port",
                     {{"switch", {.kind = ovsdb::Column::Kind::single, .usual = ""}},
                      {"id", {.kind = ovsdb::Column::Kind::single, .usual = ""}}}}}};
  PortRows rows_;
};

TEST_F(RowsOfPorts, AreFoundByTheirNames) {
  EXPECT_THAT(find("a"), ElementsAre(Pair(named("a"), "1")));
  EXPECT_THAT(find("b"), IsEmpty());
}

TEST_F(RowsOfPorts, ComeAndGo) {
  change({{"3", row("insert", "b")}});
  EXPECT_THAT(find("b"), ElementsAre(Pair(named("b"), "3")));
  change({{"3", row("modify", "c")}});
  EXPECT_THAT(find("b"), IsEmpty());
  EXPECT_THAT(find("c"), ElementsAre(Pair(named("c"), "3")));
  change({{"3", {{"delete", nullptr}}}});
  EXPECT_THAT(find("c"), IsEmpty());
}

TEST_F(RowsOfPorts, AreThoseThatAreThereIfOneTakesTheNameOfAnother) {
  change({{"0", row("insert", "a")}, {"1", {{"delete", nullptr}}}});
  EXPECT_THAT(find("a"), ElementsAre(Pair(named("a"), "0")));
  change({{"0", {{"delete", nullptr}}}, {"9", row("insert", "a")}});
  EXPECT_THAT(find("a"), ElementsAre(Pair(named("a"), "9")));
}

// Which may be ahead.
TEST_F(RowsOfPorts, AreNoneThatTheReplicaHasNoMore) {
  apply({{"1", {{"delete", nullptr}}}});
  EXPECT_THAT(find("a"), IsEmpty());
  apply({{"1", row("insert", "other")}});
  EXPECT_THAT(find("a"), IsEmpty());
}

}  // namespace
}  // namespace simhost::fabric
