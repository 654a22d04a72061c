// The rows of readings, which go with the counters.
#include "storage/running/readings.h"

#include <gmock/gmock.h>

#include <limits>

#include "named_switch.h"
#include "storage/running/counters.h"
#include "storage/store.h"

namespace {

using namespace simhost::storage;
using testing::ElementsAre;
using testing::FieldsAre;
using testing::IsEmpty;

constexpr auto kGreatest = std::numeric_limits<std::uint64_t>::max();

struct Readings : testing::Test {
  Store store{std::nullopt, [](ChangingTransaction &) {}};
  ChangingTransaction transaction{store};
  SwitchKey key = *add_switch(transaction, named("s"));
};

TEST_F(Readings, AreReplacedOneByOne) {
  EXPECT_FALSE(has_readings(transaction, key));
  put_readings(transaction, key, {{1, 2, 3}, {kGreatest, kGreatest, kGreatest}});
  put_readings(transaction, key, {{1, 4, 5}});
  EXPECT_THAT(readings_of(transaction, key),
              testing::UnorderedElementsAre(FieldsAre(1, 4, 5),
                                            FieldsAre(kGreatest, kGreatest, kGreatest)));
  remove_reading(transaction, key, 1);
  EXPECT_THAT(readings_of(transaction, key),
              ElementsAre(FieldsAre(kGreatest, kGreatest, kGreatest)));
}

TEST_F(Readings, AreThereAlsoWhenThereIsNothing) {
  put_readings(transaction, key, {});
  EXPECT_TRUE(has_readings(transaction, key));
  EXPECT_THAT(readings_of(transaction, key), IsEmpty());
}

TEST_F(Readings, GoWithTheCounters) {
  put_readings(transaction, key, {{1, 2, 3}});
  remove_counters(transaction);
  EXPECT_FALSE(has_readings(transaction, key));
}

}  // namespace
