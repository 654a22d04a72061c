// A host that is asked for its runtime state: what a scenario document describes.
#pragma once

#include <gtest/gtest.h>

#include <cstdlib>
#include <string>

#include "abi/simhost_api/simhost.h"
#include "vswitch/configuration.h"
#include "vswitch/queries.h"

// Two uplinks at a switch "s", the ports p1 and p2, another switch, and a clock that stands.
inline constexpr char const *kHost = R"({
  "clock": {"stopped": true, "now": 5000},
  "uplinks": [{"name": "nic0"}, {"name": "nic1"}, {"name": "nic2"}],
  "switches": [
    {"alias": "s", "uplinks": ["nic0", "nic1"],
     "teaming": {"balance": "explicit", "active": ["uplink1"], "standby": ["uplink2"], "flags": []},
     "ports": [{"id": "p1", "mac_learning": {"learning": true, "limit": 3}}, {"id": "p2"}]},
    {"alias": "other", "ports": [{"id": "p9"}]}
  ]})";

struct Queries : testing::Test {
  Queries() {
    unsetenv("SIMHOST_STATE");
    unsetenv("SIMHOST_SCENARIO");
  }
  void SetUp() override {
    ASSERT_EQ(simhost_reset(), QEX_OK);
    ASSERT_EQ(VSDVS_DestroyVSwitch("vswitch0"), QEX_OK);
    ASSERT_EQ(simhost_apply(kHost), QEX_OK) << simhost_error();
  }
  void TearDown() override {
    EXPECT_EQ(simhost_ledger_count(), 0U);
    EXPECT_EQ(simhost_reset(), QEX_OK);
  }

  static void apply(std::string const &document) {
    ASSERT_EQ(simhost_apply(document.c_str()), QEX_OK) << simhost_error();
  }
  static qex_SwitchPortID number(char const *port) {
    int number = 0;
    EXPECT_EQ(VSDVS_DvPortIDToPortID("s", port, &number), QEX_OK);
    return static_cast<qex_SwitchPortID>(number);
  }
};
