// The rows of uplinks that were chosen by load, which go with their ports.
#include "storage/load/chosen.h"

#include <gmock/gmock.h>

#include "named_switch.h"
#include "storage/query.h"
#include "storage/store.h"

namespace {

using namespace simhost::storage;
using testing::ElementsAre;
using testing::IsEmpty;
using testing::Pair;

struct ChosenUplinks : testing::Test {
  ChosenUplinks() {
    key = *add_switch(transaction, named("s"));
    p1 = *add_port(transaction, key, "p1", PortKind::client);
    p2 = *add_port(transaction, key, "p2", PortKind::client);
  }
  ChosenShares all() { return chosen_shares(transaction, key); }

  Store store{std::nullopt, [](ChangingTransaction &) {}};
  ChangingTransaction transaction{store};
  SwitchKey key{};
  PortNumber p1{};
  PortNumber p2{};
};

TEST_F(ChosenUplinks, AreOneForAPort) {
  put_chosen_share(transaction, p1, 0);
  put_chosen_share(transaction, p2, 3);
  put_chosen_share(transaction, p1, 2);
  EXPECT_THAT(all(), ElementsAre(Pair(p1, 2), Pair(p2, 3)));
  remove_chosen_shares(transaction);
  EXPECT_THAT(all(), IsEmpty());
}

TEST_F(ChosenUplinks, AreOfOneSwitch) {
  auto const other = *add_switch(transaction, named("t"));
  put_chosen_share(transaction, *add_port(transaction, other, "p1", PortKind::client), 1);
  put_chosen_share(transaction, p1, 2);
  EXPECT_THAT(all(), ElementsAre(Pair(p1, 2)));
}

TEST_F(ChosenUplinks, GoWithTheirPorts) {
  put_chosen_share(transaction, p1, 1);
  remove_port(transaction, p1);
  EXPECT_THAT(all(), IsEmpty());
  put_chosen_share(transaction, p1, 1);
  EXPECT_THAT(all(), IsEmpty());
}

TEST_F(ChosenUplinks, AreCheckedWhenTheyAreRead) {
  put_chosen_share(transaction, p1, 1);
  Change(transaction, "UPDATE chosen SET share = -1").run();
  EXPECT_THROW(all(), UnusableState);
}

}  // namespace
