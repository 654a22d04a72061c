// A plane that is not the state: it may be out of reach, may refuse what is about to be committed,
// and has real wires.
#include "model/plane.h"

#include <gmock/gmock.h>

#include <string>
#include <vector>

#include "memory_state.h"
#include "model/lookup.h"
#include "model/ports/ports.h"
#include "model/switches/switches.h"
#include "scenario/scenario.h"

namespace {

using simhost::AddressBytes;
using simhost::Place;
using simhost::Refused;
using simhost::storage::ChangingTransaction;
using simhost::storage::ReadingTransaction;
using simhost::storage::Transaction;
using testing::ElementsAre;
using testing::IsEmpty;
using testing::StrEq;

// As a plane in another process, it is asked over a connection that may be cut.
class FarPlane : public simhost::Plane {
 public:
  bool reachable = true;
  bool can_run = true;
  std::vector<std::string> told;

  bool link_is_up(Transaction & /*transaction*/, std::string_view /*uplink*/) override {
    return told_or_refused(true);
  }
  bool lacp_is_up(Transaction & /*transaction*/, std::string_view /*uplink*/) override {
    return told_or_refused(false);
  }
  std::string team_uplink(Transaction & /*transaction*/,
                          simhost::storage::Port const & /*port*/) override {
    return told_or_refused(std::string("nic0"));
  }
  std::vector<VSMACEntry> addresses(Transaction & /*transaction*/, Place const & /*place*/,
                                    VSMACAddrType /*type*/) override {
    return told_or_refused(std::vector<VSMACEntry>());
  }
  VSPMACLearningStats learning_stats(Transaction & /*transaction*/,
                                     Place const & /*place*/) override {
    return told_or_refused(VSPMACLearningStats{});
  }
  std::vector<AddressBytes> groups(Transaction & /*transaction*/,
                                   simhost::storage::PortNumber /*port*/,
                                   std::size_t /*length*/) override {
    return told_or_refused(std::vector<AddressBytes>());
  }
  std::optional<simhost::McastGroup> group(Transaction & /*transaction*/,
                                           simhost::storage::PortNumber /*port*/,
                                           AddressBytes const & /*address*/) override {
    return told_or_refused(std::optional<simhost::McastGroup>());
  }
  int multicast_mode(Transaction & /*transaction*/, simhost::storage::SwitchKey /*key*/) override {
    return told_or_refused(0);
  }
  simhost::Counters counters(Transaction & /*transaction*/,
                             simhost::CounterOwner const & /*owner*/) override {
    return told_or_refused(simhost::Counters());
  }
  std::vector<std::string> counting_sessions(Transaction & /*transaction*/,
                                             simhost::storage::SwitchKey /*key*/) override {
    return told_or_refused(std::vector<std::string>());
  }
  void set_admin_state(ChangingTransaction & /*transaction*/, std::string_view /*uplink*/,
                       bool /*up*/) override {
    told.push_back(told_or_refused(std::string("admin")));
  }
  void put_address(ChangingTransaction & /*transaction*/, Place const & /*place*/,
                   VSMACEntry const & /*entry*/) override {
    told.push_back(told_or_refused(std::string("address")));
  }
  void remove_address(ChangingTransaction & /*transaction*/, Place const & /*place*/,
                      VSMACEntry const & /*entry*/) override {
    told.push_back(told_or_refused(std::string("no address")));
  }
  void restart(ChangingTransaction & /*transaction*/) override {
    told.push_back(told_or_refused(std::string("restart")));
  }
  void check_device(Transaction & /*transaction*/, std::string_view device) override {
    if (device == "gone0") {
      throw Refused(QEX_NOT_FOUND, "there is no device gone0");
    }
  }
  void prepare(ChangingTransaction &transaction) override {
    if (!can_run) {
      throw Refused(QEX_NO_RESOURCES, "there are no more flows");
    }
    // What is about to be committed is there to be compiled.
    auto const switches = simhost::storage::all_switches(transaction);
    told.push_back("prepare " + std::to_string(switches.size()));
  }
  void committed() noexcept override { told.push_back("committed"); }
  simhost::Wires *find_wires() override { return nullptr; }

 private:
  template <typename Answer>
  Answer told_or_refused(Answer answer) const {
    if (!reachable) {
      throw Refused(QEX_TIMEOUT, "the plane says nothing");
    }
    return answer;
  }
};

struct APlaneElsewhere : MemoryState {
  APlaneElsewhere() { simhost::run_on(plane); }

  FarPlane plane;
};

TEST_F(APlaneElsewhere, IsToldOfAChangeBeforeAndAfterTheCommit) {
  ChangingTransaction transaction(store);
  simhost::create_switch(transaction, {.alias = "s"});
  EXPECT_THAT(plane.told, IsEmpty());
  simhost::commit(transaction);
  EXPECT_THAT(plane.told, ElementsAre("prepare 1", "committed"));
}

TEST_F(APlaneElsewhere, IsNotToldOfATransactionThatOnlyReads) {
  ReadingTransaction transaction(store);
  simhost::commit(transaction);
  EXPECT_THAT(plane.told, IsEmpty());
}

TEST_F(APlaneElsewhere, MayRefuseAndThenNothingHappened) {
  plane.can_run = false;
  {
    ChangingTransaction transaction(store);
    simhost::create_switch(transaction, {.alias = "s"});
    EXPECT_EQ(status_of([&] { simhost::commit(transaction); }), QEX_NO_RESOURCES);
  }
  ReadingTransaction transaction(store);
  EXPECT_THAT(simhost::storage::all_switches(transaction), IsEmpty());
  EXPECT_THAT(plane.told, IsEmpty());
}

TEST_F(APlaneElsewhere, HasNoWiresToSetAnythingOn) {
  ChangingTransaction transaction(store);
  EXPECT_EQ(status_of([] { simhost::get_wires(); }), QEX_NOT_SUPPORTED);
  try {
    simhost::scenario::apply(transaction, R"({"uplinks": [{"name": "nic0", "link": "down"}]})");
    ADD_FAILURE() << "it was not refused";
  } catch (simhost::scenario::DocumentError const &error) {
    EXPECT_THAT(error.what(), StrEq("uplinks[0]: the host refuses it: the wires are real: what "
                                    "comes over them cannot be set (QEX_NOT_SUPPORTED)"));
  }
}

TEST_F(APlaneElsewhere, IsConfiguredByDocumentsAllTheSame) {
  ChangingTransaction transaction(store);
  simhost::scenario::apply(transaction, R"({
    "uplinks": [{"name": "nic0"}, {"name": "new"}],
    "switches": [{"alias": "s", "uplinks": ["nic0"], "lags": [{"name": "l", "uplinks": ["nic0"]}],
                  "ports": [{"id": "p"}]}]})");
  auto const host = simhost::scenario::host_to_json(transaction);
  EXPECT_EQ(host["uplinks"][0].value("name", ""), "nic0");
  EXPECT_FALSE(host["uplinks"][0].contains("link"));
  auto const &known = host["switches"][0];
  EXPECT_EQ(known["lags"][0]["uplinks"][0], "nic0");
  EXPECT_EQ(known["lags"][0]["observed"]["up"], false);
  EXPECT_EQ(known["ports"][0]["observed"]["uplink"], "nic0");
}

TEST_F(APlaneElsewhere, ThatCannotBeAskedIsTheReasonThatCallersGet) {
  ChangingTransaction transaction(store);
  simhost::create_switch(transaction, {.alias = "s", .uplink_count = 1});
  auto const key = simhost::get_switch(transaction, "s").key;
  auto const port = simhost::add_client_port(transaction, key, "p");
  plane.reachable = false;
  EXPECT_EQ(status_of([&] { simhost::running_plane().team_uplink(transaction, port); }),
            QEX_TIMEOUT);
  EXPECT_EQ(status_of([&] { simhost::scenario::host_to_json(transaction); }), QEX_TIMEOUT);
}

}  // namespace
