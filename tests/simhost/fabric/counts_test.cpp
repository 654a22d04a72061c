// What hosts count of a port that is connected now on one of them, now on another.
#include "fabric/shared/counts.h"

#include <gmock/gmock.h>

#include "memory_state.h"
#include "model/lookup.h"
#include "model/ports/ports.h"
#include "model/switches/switches.h"
#include "storage/running/counters.h"

namespace simhost::fabric {
namespace {

using storage::ChangingTransaction;
using storage::SharedName;
using testing::ElementsAre;
using testing::IsEmpty;
using testing::Pair;

constexpr auto *kCounter = "pktsInUnicast";
constexpr auto *kGreatest = "18446744073709551615";

// One with the port a of the shared switch s.
struct CountingHost : MemoryState {
  explicit CountingHost(std::string host = "here")
      : membership{.host = std::move(host), .state = "x"} {
    ChangingTransaction transaction(store);
    create_switch(transaction, {.alias = "lab", .identifier = "s"});
    auto const key = get_switch(transaction, "lab").key;
    auto const port = add_client_port(transaction, key, "a");
    owner = {.switch_key = key, .port = port.number, .session = {}};
    storage::put_shared(
        transaction,
        {.name = {.switch_identifier = "s", .port = {}}, .fabric = "{}", .image = std::nullopt});
    transaction.commit();
  }
  void TestBody() override {}

  void count_to(std::uint64_t value) {
    ChangingTransaction transaction(store);
    storage::put_counter(transaction, owner, kCounter, value);
    transaction.commit();
  }
  // What it says it has counted.
  std::uint64_t says() {
    ChangingTransaction transaction(store);
    auto const own = own_counts(transaction, membership);
    transaction.commit();
    return own.empty() ? 0 : own.at(name).at(kCounter);
  }
  bool hears(CountsOfHosts const &counts) {
    ChangingTransaction transaction(store);
    bool const any = take_counts(transaction, {{name, counts}});
    transaction.commit();
    return any;
  }
  std::uint64_t shows() {
    storage::ReadingTransaction transaction(store);
    return storage::find_counter(transaction, owner, kCounter).value_or(0);
  }

  SharedName const name{.switch_identifier = "s", .port = "a"};
  storage::Membership membership;
  storage::CounterOwner owner;
};

using CountsOfAPort = CountingHost;

CountsOfHosts by(std::string const &host, std::uint64_t value) {
  return {{host, {{kCounter, value}}}};
}

TEST_F(CountsOfAPort, FollowItToAndFro) {
  CountingHost there("there");
  count_to(5);
  EXPECT_EQ(says(), 5);
  EXPECT_TRUE(there.hears(by("here", 5)));
  EXPECT_EQ(there.shows(), 5);
  there.count_to(8);
  EXPECT_EQ(there.says(), 3);
  // What was counted while it went comes late.
  count_to(6);
  EXPECT_EQ(says(), 6);
  EXPECT_TRUE(there.hears(by("here", 6)));
  EXPECT_EQ(there.shows(), 9);
  EXPECT_EQ(there.says(), 3);
  EXPECT_TRUE(hears({{"here", {{kCounter, 6}}}, {"there", {{kCounter, 3}}}}));
  EXPECT_EQ(shows(), 9);
  EXPECT_EQ(says(), 6);
}

TEST_F(CountsOfAPort, CountOnceHoweverOftenTheyAreTold) {
  EXPECT_TRUE(hears(by("there", 5)));
  EXPECT_FALSE(hears(by("there", 5)));
  EXPECT_FALSE(hears(by("there", 4)));
  EXPECT_TRUE(hears(by("there", 6)));
  EXPECT_EQ(shows(), 6);
  EXPECT_EQ(says(), 0);
}

TEST_F(CountsOfAPort, OfThisHostNeverFall) {
  count_to(5);
  EXPECT_EQ(says(), 5);
  {
    ChangingTransaction transaction(store);
    storage::remove_counters(transaction);
    transaction.commit();
  }
  EXPECT_EQ(says(), 5);
  count_to(7);
  EXPECT_EQ(says(), 12);
  // Set by somebody who tries out what becomes of it.
  count_to(2);
  EXPECT_EQ(says(), 14);
}

TEST_F(CountsOfAPort, ComeBackToAHostOfAnOldState) {
  count_to(5);
  EXPECT_EQ(says(), 5);
  EXPECT_TRUE(hears(by("here", 30)));
  EXPECT_EQ(shows(), 30);
  EXPECT_EQ(says(), 30);
}

TEST_F(CountsOfAPort, HaveNoMoreThanThereIsRoomFor) {
  count_to(5);
  EXPECT_TRUE(hears(by("there", ~std::uint64_t{0})));
  EXPECT_EQ(shows(), ~std::uint64_t{0});
  EXPECT_EQ(says(), 5);
}

TEST_F(CountsOfAPort, AreNothingOfWhatIsGone) {
  EXPECT_TRUE(hears(by("there", 5)));
  ChangingTransaction transaction(store);
  storage::remove_port(transaction, *owner.port);
  EXPECT_THAT(storage::counted_of(transaction, *owner.port), IsEmpty());
  EXPECT_FALSE(take_counts(transaction, {{name, by("there", 6)}}));
  EXPECT_THAT(own_counts(transaction, membership), IsEmpty());
}

TEST(CountsInATextOfAnybody, AreThoseThatPortsHave) {
  EXPECT_THAT(counts_in(R"({"pktsInUnicast": 7, "rarpTime": 1, "bytesInUnicast": -1,)"
                        R"( "pktsInMulticast": "2", "pktsOutUnicast": 1.5})"),
              ElementsAre(Pair(kCounter, 7)));
  EXPECT_THAT(counts_in(std::string(R"({"pktsInUnicast": )") + kGreatest + "}"),
              ElementsAre(Pair(kCounter, ~std::uint64_t{0})));
  for (auto const *text : {"", "[1]", "7", "{", R"({"pktsInUnicast": 18446744073709551616})"}) {
    EXPECT_THAT(counts_in(text), IsEmpty()) << text;
  }
  EXPECT_EQ(text_of(counts_in(R"({"pktsInUnicast":7})")), R"({"pktsInUnicast":7})");
}

}  // namespace
}  // namespace simhost::fabric
