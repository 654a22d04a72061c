// What each call of the host keeps to, whatever its body does.
#include "abi/call.h"

#include <gtest/gtest.h>

#include <chrono>
#include <string_view>

#include "abi/boundary.h"
#include "abi/callers_code.h"
#include "faults/faults.h"
#include "storage/switches.h"

namespace {

using simhost::ChangingCall;
using simhost::Ending;
using simhost::ReadingCall;
using simhost::StatelessCall;

constexpr auto kCall = "VSDVS_GetMTU";
constexpr auto kAlias = "planted";

void add_planted(simhost::storage::Transaction &transaction) {
  simhost::storage::add_switch(transaction, {.alias = kAlias,
                                             .identifier = kAlias,
                                             .portset = kAlias,
                                             .max_ports = 1,
                                             .version = 1,
                                             .persistent = true});
}

bool has_planted() {
  ReadingCall call(kCall);
  return simhost::storage::find_switch(call.transaction(), simhost::storage::SwitchName::alias,
                                       kAlias)
      .has_value();
}

TEST(Calls, OnesThatReadCannotChangeTheState) {
  Ending ending{};
  auto const body = [](auto &call) { add_planted(call.transaction()); };
  EXPECT_FALSE(simhost::completes<ReadingCall>(kCall, body, ending));
  EXPECT_TRUE(ending.traps);
  EXPECT_EQ(std::string_view(ending.report.text.data()),
            "VSDVS_GetMTU: a call that only reads the state was about to change it");
  EXPECT_FALSE(has_planted());
  EXPECT_TRUE(simhost::completes<ChangingCall>(kCall, body, ending));
  EXPECT_TRUE(has_planted());
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
