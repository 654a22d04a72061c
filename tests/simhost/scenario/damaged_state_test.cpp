// A state whose tables are a state's and whose values are not: what a description of the host says.
#include <SQLiteCpp/Database.h>
#include <fmt/format.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cstdint>
#include <filesystem>
#include <span>
#include <string>

#include "base/outcomes.h"
#include "faults/faults.h"
#include "nebpublic/property_types.h"
#include "planes/stored/stored_plane.h"
#include "scenario/scenario.h"
#include "scenario/texts.h"
#include "storage/store.h"
#include "temporary_folder.h"
#include "vswitch/properties.h"
#include "vswitch/teaming.h"

namespace {

using simhost::storage::Access;
using simhost::storage::Store;
using simhost::storage::Transaction;
using simhost::storage::UnusableState;

/// Something in every table.
void populate(auto &transaction) {
  simhost::run_on(simhost::stored::plane());
  simhost::scenario::apply(transaction, R"({
    "uplinks": [{"name": "nic0"}, {"name": "nic1", "link": "down"}],
    "switches": [{
      "alias": "s", "mtu": 9000, "uplinks": ["nic0", "nic1"],
      "lags": [{"name": "lag0", "uplinks": ["nic0"]}],
      "counters": {"txErrors": 3},
      "ports": [{
        "id": "p",
        "addresses": [{"mac": "02:00:00:00:00:01"}],
        "groups": [{"address": "239.1.1.1", "version": 3, "source_mode": "include",
                    "sources": ["192.0.2.7"]}]
      }]
    }],
    "faults": [{"call": "VSDVS_SetMTU", "exception": "OSError", "message": "gone"}]
  })");
}

void damage(std::filesystem::path const &file, std::string const &sql) {
  SQLite::Database database(file.string(), SQLite::OPEN_READWRITE);
  database.exec("PRAGMA ignore_check_constraints = ON");
  database.exec(sql);
  ASSERT_NE(database.getTotalChanges(), 0) << sql;
}

/// What is wrong with the host once `sql` has been at it; empty if nothing is.
std::string complaint_after(std::string const &sql) {
  TemporaryFolder const folder;
  auto const file = folder.file("host.db");
  {
    Store const store(file, [](auto &transaction) { populate(transaction); });
  }
  damage(file, sql);
  Store store(file, [](auto &) {});
  try {
    Transaction transaction(store, Access::read);
    simhost::scenario::description(transaction);
    return "";
  } catch (UnusableState const &error) {
    auto const named = "the state file " + file.string() + " cannot be used: ";
    EXPECT_THAT(error.what(), testing::StartsWith(named));
    return std::string(error.what()).substr(named.size());
  }
}

struct Damage {
  char const *sql;
  char const *complaint;
};

TEST(DamagedState, SaysWhatIsWrongWithIt) {
  for (auto const &[sql, complaint] : {
           Damage{"UPDATE fault SET exception = 'Nonsense'",
                  "the column 'exception' holds 'Nonsense'"},
           {"UPDATE fault SET first = 0", "the column 'first' holds 0"},
           {"UPDATE fault SET last = first - 1", "the column 'last' holds 0"},
           {"UPDATE fault SET delay = -1", "the column 'delay' holds -1"},
           {"UPDATE fault SET status = -1", "the column 'status' holds -1"},
           {"UPDATE fault SET message = CAST(x'610062' AS TEXT)",
            "the column 'message' holds a text with a NUL in it"},
           {"UPDATE mcast_source SET address = x'C0'",
            "the column 'address' holds 1 bytes instead of 4"},
           {"UPDATE mcast_source SET address = x'20010DB8000000000000000000000007'",
            "the column 'address' holds 16 bytes instead of 4"},
           {"UPDATE mcast_group SET version = 4", "the column 'version' holds 4"},
           {"UPDATE mcast_group SET source_mode = 3", "the column 'source_mode' holds 3"},
           {"UPDATE address SET mac = x'0200'", "the column 'mac' holds 2 bytes instead of 6"},
           {"UPDATE address SET type = 3", "the column 'type' holds 3"},
           {"UPDATE address SET vid = 4095", "the column 'vid' holds 4095"},
           {"UPDATE address SET vni = 16777216", "the column 'vni' holds 16777216"},
           {"UPDATE address SET seen = 9223372036854775807",
            "the column 'seen' holds 9223372036854775807"},
           {"UPDATE clock SET stopped = 2", "the column 'stopped' holds 2"},
           {"UPDATE clock SET value = 9223372036854775807",
            "the column 'value' holds 9223372036854775807"},
           {"DELETE FROM clock", "a row is missing in it that every state has"},
           {"UPDATE link SET errors = 101", "the column 'errors' holds 101"},
           {"UPDATE link SET speed = 4294967296", "the column 'speed' holds 4294967296"},
           {"UPDATE property SET type = 3", "the column 'type' holds 3"},
           {"UPDATE switch SET max_ports = -1", "the column 'max_ports' holds -1"},
       }) {
    EXPECT_EQ(complaint_after(sql), complaint) << sql;
  }
}

TEST(DamagedState, WithWhatNothingRefersToIsRead) {
  EXPECT_EQ(complaint_after("UPDATE switch SET version = 7"), "");
}

// Sets a property of the switch, or of its port, past all checks.
template <typename Record>
std::string set_to(char const *owner, char const *key, Record const &record) {
  auto const bytes = std::as_bytes(std::span(&record, 1));
  return fmt::format(
      "INSERT INTO property (switch, {}, name, type, value) VALUES (1, {}, '{}', {}, x'{}')",
      "scope", owner, key, static_cast<int>(CONFIG_PROP_TYPE), simhost::scenario::hex_text(bytes));
}

// A count that a record claims is believed as far as the record has room.
TEST(DamagedState, HasNoMoreNamesInATeamingPolicyThanThereIsRoomFor) {
  VSTeamPolicy policy{};
  policy.numActive = policy.numStandby = UINT32_MAX;
  for (std::size_t at = 0; at < std::size(policy.uplinkPortName); ++at) {
    fmt::format_to(&policy.uplinkPortName[at][0], "uplink{}", at);
  }
  EXPECT_EQ(complaint_after(set_to("0", VSPROP_SWITCH_TEAMING, policy)), "");
}

TEST(DamagedState, MissesWhatIsReferredTo) {
  EXPECT_EQ(complaint_after("PRAGMA foreign_keys = OFF; UPDATE switch SET key = 99"),
            "it has no switch 1, which is referred to");
}

}  // namespace
