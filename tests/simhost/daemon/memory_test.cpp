// What bridges have learned is known for as long as the state has their switches.
#include "daemon/learned/memory.h"

#include <gmock/gmock.h>

#include "memory_state.h"
#include "named_switch.h"

namespace {

using simhost::daemon::Memory;
using simhost::storage::ChangingTransaction;
using simhost::storage::ReadingTransaction;
using simhost::storage::Remembered;
using simhost::storage::RememberedAs;
using simhost::storage::SwitchKey;
using testing::SizeIs;

constexpr std::uint32_t kBeyond = 0;

struct TheMemory : MemoryState {
  // With an address that was learned beyond its uplinks.
  SwitchKey add_switch(char const *name) {
    ChangingTransaction transaction(store);
    auto const key = simhost::storage::add_switch(transaction, named(name)).value();
    simhost::storage::remember(
        transaction, key,
        {.as = RememberedAs::learned, .vlan = 7, .mac = {std::byte{2}}, .port = std::nullopt});
    transaction.commit();
    return key;
  }

  std::vector<Remembered> remembered_of(SwitchKey key) {
    ReadingTransaction transaction(store);
    return simhost::storage::remembered_of(transaction, key);
  }

  Memory memory{store, [] {}};
};

TEST_F(TheMemory, ForgetsSwitchesThatAreGoneAndNoOthers) {
  auto const gone = add_switch("gone");
  auto const stays = add_switch("stays");
  for (auto const key : {gone, stays}) {
    memory.follow_devices(key, {});
    ASSERT_THAT(memory.learned_at(key, kBeyond), SizeIs(1));
  }
  // What is to be put into the state goes with them.
  memory.forget(stays);
  memory.keep({stays});
  EXPECT_THAT(memory.learned_at(gone, kBeyond), SizeIs(0));
  EXPECT_TRUE(memory.save());
  EXPECT_THAT(remembered_of(stays), SizeIs(0));

  memory.follow_devices(gone, {});
  memory.forget(gone);
  memory.keep({});
  EXPECT_TRUE(memory.save());
  EXPECT_THAT(remembered_of(gone), SizeIs(1)) << "a switch of which nobody knows anything any more";
}

TEST_F(TheMemory, KeepsWhatSomebodyTookUntilItIsThereAgain) {
  auto const key = add_switch("lab");
  memory.follow_devices(key, {});
  auto const learned = memory.learned_at(key, kBeyond);
  ASSERT_THAT(learned, SizeIs(1));
  EXPECT_TRUE(memory.miss(key, learned.front()));
  memory.replace(key, {});
  EXPECT_THAT(memory.learned_at(key, kBeyond), SizeIs(1));
  memory.replace(key, learned);
  memory.replace(key, {});
  EXPECT_THAT(memory.learned_at(key, kBeyond), SizeIs(0));
  EXPECT_FALSE(memory.miss(key, learned.front()));
}

}  // namespace
