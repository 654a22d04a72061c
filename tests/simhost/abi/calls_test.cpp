// What each call of the host keeps to, whatever its body does.
#include "abi/call.h"

#include <gtest/gtest.h>
#include <sqlite3.h>

#include <chrono>
#include <type_traits>
#include <utility>

#include "abi/boundary.h"
#include "abi/callers_code.h"
#include "faults/faults.h"
#include "named_switch.h"
#include "storage/switches.h"

namespace {

using simhost::ChangingCall;
using simhost::Ending;
using simhost::ReadingCall;
using simhost::StatelessCall;

constexpr auto kCall = "VSDVS_GetMTU";
constexpr auto kAlias = "planted";

void add_planted(simhost::storage::ChangingTransaction &transaction) {
  simhost::storage::add_switch(transaction, named(kAlias));
}

bool has_planted() {
  ReadingCall call(kCall);
  return simhost::storage::find_switch(call.transaction(), simhost::storage::SwitchName::alias,
                                       kAlias)
      .has_value();
}

// What changes the state does not compile in a call that reads it.
template <typename KindOfCall>
constexpr bool kCanChange =
    std::is_invocable_v<decltype(add_planted),
                        decltype(std::declval<KindOfCall &>().transaction())>;
static_assert(kCanChange<ChangingCall> && !kCanChange<ReadingCall>);

TEST(Calls, ChangeTheStateWhenTheyComeToTheirEnd) {
  Ending ending{};
  EXPECT_FALSE(simhost::completes<ChangingCall>(
      kCall,
      [](ChangingCall &call) {
        add_planted(call.transaction());
        simhost::refuse(QEX_BUSY);
      },
      ending));
  EXPECT_FALSE(has_planted());
  EXPECT_TRUE(simhost::completes<ChangingCall>(
      kCall, [](ChangingCall &call) { add_planted(call.transaction()); }, ending));
  EXPECT_TRUE(has_planted());
}

// The connection to the host's state, which SQLite tells of when it is opened.
sqlite3 *host_state = nullptr;

int keep(sqlite3 *opened, char const ** /*error*/, sqlite3_api_routines const * /*api*/) {
  host_state = opened;
  return SQLITE_OK;
}

int const kKept = sqlite3_auto_extension(reinterpret_cast<void (*)()>(keep));

// How long the transaction that began last would have waited for other processes.
std::chrono::milliseconds longest_wait() {
  sqlite3_stmt *statement = nullptr;
  sqlite3_prepare_v2(host_state, "PRAGMA busy_timeout", -1, &statement, nullptr);
  sqlite3_step(statement);
  std::chrono::milliseconds const wait(sqlite3_column_int(statement, 0));
  sqlite3_finalize(statement);
  return wait;
}

TEST(Calls, WaitForTheFaultsThatTheyCountAsLongAsOneCallDoes) {
  ASSERT_EQ(kKept, SQLITE_OK);
  { StatelessCall const call(kCall); }
  EXPECT_EQ(longest_wait(), simhost::storage::kPatience) << "it looked whether one waits";
  {
    ChangingCall call("simhost_fail_call");
    simhost::add_fault(call.transaction(),
                       {.function = kCall, .first = 2, .last = 2, .status = QEX_BUSY});
    call.complete();
  }
  { StatelessCall const call(kCall); }
  EXPECT_LT(longest_wait(), simhost::storage::kPatience) << "then it counted this call";
  ChangingCall call("simhost_clear_faults");
  simhost::clear_faults(call.transaction(), kCall);
  call.complete();
}

TEST(Calls, WaitForFaultsAndTheStateTogether) {
  {
    ChangingCall call("simhost_fail_call");
    simhost::add_fault(call.transaction(),
                       {.function = kCall, .first = 2, .last = 2, .status = QEX_BUSY});
    call.complete();
  }
  ChangingCall call(kCall);
  auto const after_faults = call.patience().left();
  EXPECT_LT(after_faults, simhost::storage::kPatience);
  call.transaction();
  EXPECT_LT(call.patience().left(), after_faults);
}

TEST(Calls, AreDelayedAnHourAtMostByAllTheirFaults) {
  using std::chrono::minutes;
  simhost::Fault const fault{.function = kCall, .delay = minutes(40), .status = QEX_OK};
  EXPECT_EQ(simhost::delay_of({fault}), minutes(40));
  EXPECT_EQ(simhost::delay_of({fault, fault}), minutes(60));
}

void run_within_a_call() {
  StatelessCall const call(kCall);
  simhost::call_back(+[] {});
}

TEST(CallsDeathTest, RunNoCodeOfTheCallersMeanwhile) {
  EXPECT_DEATH(run_within_a_call(),
               "simulated host: code of the caller's must not run within a call");
}

}  // namespace
