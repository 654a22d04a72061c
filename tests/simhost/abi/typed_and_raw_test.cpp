// Typed calls and raw calls read and write the same bytes, in both directions, for every key.
#include <gmock/gmock.h>

#include <algorithm>
#include <array>
#include <functional>
#include <string>

#include "configured_switch.h"
#include "qexapi/switch_properties.h"
#include "vswitch/properties.h"

namespace {

template <std::size_t Size>
void put(char (&field)[Size], std::string_view text) {
  ASSERT_LT(text.size(), Size);
  text.copy(field, text.size());
}

VSTeamPolicy teaming(qex_uint32 load_balance) {
  VSTeamPolicy policy{};
  policy.loadBalance = load_balance;
  policy.flags = TEAM_FRP_FLAG_ROLLING;
  policy.numActive = 1;
  policy.numStandby = 1;
  put(policy.uplinkPortName[0], "uplink2");
  put(policy.uplinkPortName[1], "uplink1");
  return policy;
}

VSExtraEthFilter filter(qex_uint32 flags) {
  VSExtraEthFilter record{};
  record.flags = flags;
  record.numMulticastAddrs = 1;
  record.multicastAddrs[0][0] = 0x01;
  record.multicastAddrs[0][5] = 0x42;
  return record;
}

// A table of one session with a destination of a VLAN.
Bytes mirror_table(std::string_view sid) {
  DVMirrorSessionTable header{};
  header.magicNum = VS_DVMIRROR_MAGIC_NUM;
  header.version = VS_DVMIRROR_VERSION_V2;
  header.numSessions = 1;
  header.numEntities = 1;
  DVMirrorSession session{};
  put(session.sid, sid);
  session.numDstEntities = 1;
  DVMirrorEntity entity{};
  entity.type = MIRROR_ENTTYPE_VLAN;
  entity.vlan = 5;
  return bytes_of(header) + bytes_of(session) + bytes_of(entity);
}

Bytes vlan_policy(qex_uint16 flags, qex_uint16 vlan,
                  std::vector<qex_NEBPortVIDRange> const &ranges) {
  VSPortVlanPolicy policy{};
  policy.flags = flags;
  policy.vlanID = vlan;
  policy.numRanges = static_cast<qex_uint16>(ranges.size());
  auto bytes = bytes_of(policy);
  for (auto const &range : ranges) {
    bytes = bytes + bytes_of(range);
  }
  return bytes;
}

// One key: two values, a typed set of each, and a typed get in the form of the raw bytes.
struct CallsOfKey {
  char const *key;
  bool of_port;
  std::array<Bytes, 2> values;
  std::function<QEX_ReturnStatus(Bytes const &)> typed_set;
  std::function<Bytes()> typed_get;
};

template <typename Record, typename Get>
std::function<Bytes()> getter(Get get) {
  return [get] {
    Record record{};
    EXPECT_EQ(get(&record), QEX_OK);
    return bytes_of(record);
  };
}

template <typename Record, typename Set>
std::function<QEX_ReturnStatus(Bytes const &)> setter(Set set) {
  return [set](Bytes const &bytes) {
    auto const record = as<Record>(bytes);
    return set(record);
  };
}

// A typed get that allocates a record of varying size.
template <typename Record, typename Get, typename SizeOf>
std::function<Bytes()> allocated(Get get, SizeOf size_of) {
  return [get, size_of] {
    Record *record = nullptr;
    EXPECT_EQ(get(&record), QEX_OK);
    auto const *const first = reinterpret_cast<unsigned char const *>(record);
    Bytes bytes(first, first + size_of(*record));
    VSDVS_FreeMemory(record);
    return bytes;
  };
}

template <typename Call>
auto on_switch(Call call) {
  return [call](auto... more) { return call("s", more...); };
}

template <typename Call>
auto on_port(Call call) {
  return [call](auto... more) { return call("s", "p", more...); };
}

template <typename Call>
auto by_address(Call call) {
  return [call](auto const &record) { return call(&record); };
}

CallsOfKey learning_calls() {
  VSMACLearning learning{};
  learning.agingTime = 60;
  learning.macLimit = 10;
  VSMACLearning other = learning;
  other.learnStatic = 1;
  return {VSPROP_SWITCH_MAC_LEARNING,
          false,
          {bytes_of(learning), bytes_of(other)},
          setter<VSMACLearning>(by_address(on_switch(VSDVS_SetMACLearning))),
          getter<VSMACLearning>(on_switch(VSDVS_GetMACLearning))};
}

CallsOfKey private_vlan_calls() {
  VSPvlanMapEntry const promiscuous{
      .primaryVID = 10, .secondaryVID = 10, .pvlanType = VSPORT_PVLAN_TYPE_PROMISC, .pad = {}};
  VSPvlanMapEntry const isolated{
      .primaryVID = 10, .secondaryVID = 11, .pvlanType = VSPORT_PVLAN_TYPE_ISOLATED, .pad = {}};
  auto const set = [](Bytes const &bytes) {
    return VSDVS_SetPrivateVLANMap("s", reinterpret_cast<VSPvlanMapEntry const *>(bytes.data()),
                                   static_cast<int>(bytes.size() / sizeof(VSPvlanMapEntry)));
  };
  auto const get = [] {
    VSPvlanMapEntry *entries = nullptr;
    int count = 0;
    EXPECT_EQ(VSDVS_GetPrivateVLANMap("s", &entries, &count), QEX_OK);
    auto const *const first = reinterpret_cast<unsigned char const *>(entries);
    Bytes bytes(first, first + (count * sizeof(VSPvlanMapEntry)));
    VSDVS_FreeMemory(entries);
    return bytes;
  };
  return {VSPROP_PVLAN_MAP,
          false,
          {bytes_of(promiscuous) + bytes_of(isolated), bytes_of(promiscuous)},
          set,
          get};
}

CallsOfKey security_calls() {
  VSPropSecurity const security{.flags = VSPORT_SECURITY_DISALLOW_PROMISC};
  VSPropSecurity const other{.flags = VSPORT_SECURITY_DISALLOW_FORGED_SRC};
  return {VSPROP_PORT_SECURITY,
          true,
          {bytes_of(security), bytes_of(other)},
          setter<VSPropSecurity>(by_address(on_port(VSDVS_SetPortSecurity))),
          getter<VSPropSecurity>(on_port(VSDVS_GetPortSecurity))};
}

CallsOfKey override_calls() {
  auto const set = [](Bytes const &bytes) {
    return VSDVS_SetPortTeamingOverride("s", "p", reinterpret_cast<char const *>(bytes.data()));
  };
  auto const get = [] {
    std::array<char, 82> text{};
    EXPECT_EQ(VSDVS_GetPortTeamingOverride("s", "p", text.data()), QEX_OK);
    return bytes_of_text(text.data());
  };
  return {VSPROP_PORT_TEAMING_OVERRIDE,
          true,
          {bytes_of_text("uplink1"), bytes_of_text("uplink2")},
          set,
          get};
}

CallsOfKey vlan_calls() {
  auto const set = [](Bytes const &bytes) {
    Bytes copy = bytes;
    auto *const policy = reinterpret_cast<VSPortVlanPolicy *>(copy.data());
    auto const has = [&](unsigned flag) {
      return static_cast<qex_Bool>((policy->flags & flag) != 0 ? 1 : 0);
    };
    return VSDVS_SetPortVLANPolicy("s", "p", policy->vlanID, -1, has(VSPORT_VLAN_GUEST_TAGGING),
                                   has(VSPORT_VLAN_PVLAN_ENABLED), policy->vidRanges,
                                   policy->numRanges);
  };
  auto const get = allocated<VSPortVlanPolicy>(
      [](VSPortVlanPolicy **policy) {
        int priority = 0;
        return VSDVS_GetPortVLANPolicy("s", "p", policy, &priority);
      },
      [](VSPortVlanPolicy const &policy) {
        return sizeof policy + (policy.numRanges * sizeof(qex_NEBPortVIDRange));
      });
  return {VSPROP_PORT_VLAN,
          true,
          {vlan_policy(VSPORT_VLAN_GUEST_TAGGING, 0, {{1, 9}, {20, 20}}), vlan_policy(0, 4094, {})},
          set,
          get};
}

CallsOfKey priority_calls() {
  auto const set = [](Bytes const &bytes) {
    return VSDVS_SetPortVLANPolicy("s", "p", 3, as<int>(bytes), 0, 0, nullptr, 0);
  };
  auto const get = [] {
    VSPortVlanPolicy *policy = nullptr;
    int priority = 0;
    EXPECT_EQ(VSDVS_GetPortVLANPolicy("s", "p", &policy, &priority), QEX_OK);
    VSDVS_FreeMemory(policy);
    return bytes_of(priority);
  };
  return {VSPROP_PORT_PRIORITY, true, {bytes_of(7), bytes_of(0)}, set, get};
}

CallsOfKey mirror_calls() {
  auto const set = [](Bytes const &bytes) {
    Bytes copy = bytes;
    EXPECT_EQ(VSDVS_ClearDVMirrorSessions("s", "p"), QEX_OK);
    return VSDVS_AppendDVMirrorSessions("s", "p",
                                        reinterpret_cast<DVMirrorSessionTable *>(copy.data()));
  };
  auto const get = allocated<DVMirrorSessionTable>(
      on_port(VSDVS_GetDVMirrorSessions), [](DVMirrorSessionTable const &table) {
        return sizeof table + (table.numSessions * sizeof(DVMirrorSession)) +
               (table.numEntities * sizeof(DVMirrorEntity));
      });
  return {VSPROP_PORT_MIRROR_SESSIONS, true, {mirror_table("one"), mirror_table("two")}, set, get};
}

CallsOfKey port_learning_calls() {
  VSPMACManagement management{};
  management.portMACLearning.learning = 1;
  management.portMACLearning.macLimit = 8;
  VSPMACManagement other = management;
  other.portMACLearning.macLimitPolicy = VSPORT_MAC_LEARNING_LIMIT_POLICY_DROP;
  auto const set = [](Bytes const &bytes) {
    auto const learning = as<VSPMACManagement>(bytes).portMACLearning;
    return VSDVS_SetPortMACLearning("s", "p", &learning);
  };
  auto const get = [] {
    VSPMACManagement record{};
    VSPMACLearning learning{};
    EXPECT_EQ(VSDVS_GetPortMACLearning("s", "p", &learning), QEX_OK);
    record.portMACLearning = learning;
    return bytes_of(record);
  };
  return {VSPROP_PORT_MAC_MANAGEMENT, true, {bytes_of(management), bytes_of(other)}, set, get};
}

std::vector<CallsOfKey> keys_of_switch() {
  return {
      {VSPROP_MTU,
       false,
       {bytes_of(qex_uint32{9000}), bytes_of(qex_uint32{1600})},
       setter<qex_uint32>(on_switch(VSDVS_SetMTU)),
       getter<qex_uint32>(on_switch(VSDVS_GetMTU))},
      {VSPROP_SWITCH_TEAMING,
       false,
       {bytes_of(teaming(1)), bytes_of(teaming(4))},
       setter<VSTeamPolicy>(by_address(on_switch(VSDVS_SetTeamingPolicy))),
       getter<VSTeamPolicy>(on_switch(VSDVS_GetTeamingPolicy))},
      {VSPROP_SWITCH_TEAMING,
       false,
       {bytes_of(teaming(2)), bytes_of(teaming(3))},
       setter<VSTeamPolicy>(by_address(on_switch(VSDVS_SetTeamingPolicy))),
       getter<VSTeamPolicy>(
           [](VSTeamPolicy *policy) { return VSDVS_GetTeamingPolicyFromDVSID("s-id", policy); })},
      learning_calls(),
      private_vlan_calls(),
      {VSPROP_MULTICAST_FILTER,
       false,
       {bytes_of(1), bytes_of(2)},
       setter<VSMcastFilterMode>(on_switch(VSDVS_SetMcastFilterMode)),
       getter<int>(on_switch(VSDVS_GetMcastFilterMode))},
  };
}

std::vector<CallsOfKey> keys_of_port() {
  return {
      security_calls(),
      {VSPROP_PORT_TEAMING_POLICY,
       true,
       {bytes_of(teaming(1)), bytes_of(teaming(4))},
       setter<VSTeamPolicy>(by_address(on_port(VSDVS_SetPortTeamingPolicy))),
       getter<VSTeamPolicy>(on_port(VSDVS_GetPortTeamingPolicy))},
      override_calls(),
      vlan_calls(),
      priority_calls(),
      {VSPROP_PORT_TX_UPLINK,
       true,
       {bytes_of(qex_Bool{1}), bytes_of(qex_Bool{0})},
       setter<qex_Bool>(on_port(VSDVS_SetTxUplinkAlways)),
       getter<qex_Bool>(on_port(VSDVS_GetTxUplinkAlways))},
      {VSPROP_PORT_VLAN_NESTEDTAG,
       true,
       {bytes_of(qex_Bool{1}), bytes_of(qex_Bool{0})},
       setter<qex_Bool>(on_port(VSDVS_SetPortNestedVLANTagging)),
       getter<qex_Bool>(on_port(VSDVS_GetPortNestedVLANTagging))},
      {VSPROP_PORT_EXTRA_ETH_FRP,
       true,
       {bytes_of(filter(QEX_ETH_FILTER_ALLMULTI)), bytes_of(filter(QEX_ETH_FILTER_SINK))},
       setter<VSExtraEthFilter>(by_address(on_port(VSDVS_SetExtraEthFilter))),
       getter<VSExtraEthFilter>(on_port(VSDVS_GetExtraEthFilter))},
      mirror_calls(),
      port_learning_calls(),
  };
}

std::vector<CallsOfKey> all_keys() {
  auto all = keys_of_switch();
  for (auto const &calls : keys_of_port()) {
    all.push_back(calls);
  }
  return all;
}

using TypedAndRaw = ConfiguredSwitch;

std::optional<Bytes> raw(CallsOfKey const &calls) {
  return calls.of_port ? TypedAndRaw::port(calls.key) : TypedAndRaw::global(calls.key);
}

QEX_ReturnStatus set_raw(CallsOfKey const &calls, Bytes const &value) {
  return calls.of_port ? TypedAndRaw::set_port(calls.key, value)
                       : TypedAndRaw::set_global(calls.key, value);
}

TEST_F(TypedAndRaw, WhatATypedCallWritesTheRawCallReads) {
  for (auto const &calls : all_keys()) {
    for (auto const &value : calls.values) {
      EXPECT_EQ(calls.typed_set(value), QEX_OK) << calls.key;
      EXPECT_EQ(raw(calls), value) << calls.key;
    }
  }
}

TEST_F(TypedAndRaw, WhatTheRawCallWritesATypedCallReads) {
  for (auto const &calls : all_keys()) {
    for (auto const &value : calls.values) {
      EXPECT_EQ(set_raw(calls, value), QEX_OK) << calls.key;
      EXPECT_EQ(calls.typed_get(), value) << calls.key;
    }
  }
}

TEST_F(TypedAndRaw, TheRawCallTakesNoOtherSize) {
  for (auto const &calls : all_keys()) {
    auto const &value = calls.values[0];
    ASSERT_EQ(set_raw(calls, value), QEX_OK) << calls.key;
    auto const longer = value + Bytes{0};
    auto const shorter = Bytes(value.begin(), value.end() - 1);
    EXPECT_EQ(set_raw(calls, longer), QEX_BAD_PARAM) << calls.key;
    EXPECT_EQ(set_raw(calls, shorter), QEX_BAD_PARAM) << calls.key;
    EXPECT_EQ(raw(calls), value) << calls.key << " after refused calls";
  }
}

TEST_F(TypedAndRaw, AClearedPropertyReadsAsItsDefault) {
  for (auto const &calls : all_keys()) {
    auto const clear = [&] {
      return calls.of_port ? DVSQEX_PortDataClear("s-id", "p", calls.key)
                           : DVSQEX_GlobalPropClear("s-id", calls.key);
    };
    clear();
    auto const unset = calls.typed_get();
    EXPECT_EQ(clear(), QEX_NOT_FOUND) << calls.key;
    for (auto const &value : calls.values) {
      ASSERT_EQ(calls.typed_set(value), QEX_OK) << calls.key;
    }
    EXPECT_EQ(clear(), QEX_OK) << calls.key;
    EXPECT_EQ(raw(calls), std::nullopt) << calls.key;
    EXPECT_EQ(calls.typed_get(), unset) << calls.key;
  }
}

TEST_F(TypedAndRaw, AKeyThatCannotBeSetIsNotThere) {
  auto const too_long = std::string(256, 'k');
  struct {
    char const *key;
    QEX_ReturnStatus set;
    bool of_port;
  } const cases[] = {{VSPROP_MTU, QEX_BAD_PARAM, true},
                     {VSPROP_PORT_SECURITY, QEX_BAD_PARAM, false},
                     {"", QEX_BAD_PARAM, true},
                     {"", QEX_BAD_PARAM, false},
                     {too_long.c_str(), QEX_NAME_TOO_LONG, true},
                     {too_long.c_str(), QEX_NAME_TOO_LONG, false}};
  ASSERT_EQ(VSDVS_SetMTU("s", 9000), QEX_OK);
  for (auto const &[key, status, of_port] : cases) {
    auto const value = bytes_of(qex_uint32{1500});
    EXPECT_EQ(of_port ? set_port(key, value) : set_global(key, value), status) << key;
    void *data = nullptr;
    int length = 0;
    EXPECT_EQ(of_port ? DVSQEX_PortDataGet("s-id", "p", key, &data, &length)
                      : DVSQEX_GlobalPropGet("s-id", key, &data, &length),
              QEX_NOT_FOUND)
        << key;
    EXPECT_EQ(
        of_port ? DVSQEX_PortDataClear("s-id", "p", key) : DVSQEX_GlobalPropClear("s-id", key),
        QEX_NOT_FOUND)
        << key;
  }
  qex_uint32 mtu = 0;
  EXPECT_EQ(VSDVS_GetMTU("s", &mtu), QEX_OK);
  EXPECT_EQ(mtu, 9000U) << "of the switch itself";
}

TEST_F(TypedAndRaw, TypedClearsAreRawClears) {
  struct {
    char const *key;
    bool of_port;
    std::function<QEX_ReturnStatus()> clear;
  } const clears[] = {
      {VSPROP_SWITCH_TEAMING, false, [] { return VSDVS_ClearTeamingPolicy("s"); }},
      {VSPROP_SWITCH_MAC_LEARNING, false, [] { return VSDVS_ClearMACLearning("s"); }},
      {VSPROP_PORT_TEAMING_POLICY, true, [] { return VSDVS_ClearPortTeamingPolicy("s", "p"); }},
      {VSPROP_PORT_TEAMING_OVERRIDE, true, [] { return VSDVS_ClearPortTeamingOverride("s", "p"); }},
      {VSPROP_PORT_VLAN, true, [] { return VSDVS_ClearPortVLANPolicy("s", "p"); }},
      {VSPROP_PORT_PRIORITY, true, [] { return VSDVS_ClearPortVLANPolicy("s", "p"); }},
      {VSPROP_PORT_EXTRA_ETH_FRP, true, [] { return VSDVS_ClearExtraEthFilter("s", "p"); }},
      {VSPROP_PORT_MIRROR_SESSIONS, true, [] { return VSDVS_ClearDVMirrorSessions("s", "p"); }},
  };
  auto const calls = all_keys();
  for (auto const &[key, of_port, clear] : clears) {
    auto const found =
        std::find_if(calls.begin(), calls.end(),
                     [key = std::string_view(key)](auto const &d) { return d.key == key; });
    ASSERT_NE(found, calls.end()) << key;
    ASSERT_EQ(found->typed_set(found->values[0]), QEX_OK) << key;
    ASSERT_TRUE((of_port ? port(key) : global(key)).has_value()) << key;
    EXPECT_EQ(clear(), QEX_OK) << key;
    EXPECT_EQ(of_port ? port(key) : global(key), std::nullopt) << key;
    EXPECT_EQ(clear(), QEX_OK) << key << ": what is clear stays clear";
  }
}

TEST_F(TypedAndRaw, TheSinkPortIsABitOfTheFilter) {
  ASSERT_EQ(set_port(VSPROP_PORT_EXTRA_ETH_FRP, bytes_of(filter(QEX_ETH_FILTER_ALLMULTI))), QEX_OK);
  qex_Bool sink = 1;
  EXPECT_EQ(VSDVS_IsSinkPortEnabled("s", "p", &sink), QEX_OK);
  EXPECT_EQ(sink, 0);
  EXPECT_EQ(VSDVS_ConfigureSinkPort("s", "p", 1), QEX_OK);
  EXPECT_EQ(VSDVS_IsSinkPortEnabled("s", "p", &sink), QEX_OK);
  EXPECT_EQ(sink, 1);
  EXPECT_EQ(port(VSPROP_PORT_EXTRA_ETH_FRP),
            bytes_of(filter(QEX_ETH_FILTER_ALLMULTI | QEX_ETH_FILTER_SINK)));
  EXPECT_EQ(VSDVS_ConfigureSinkPort("s", "p", 0), QEX_OK);
  EXPECT_EQ(port(VSPROP_PORT_EXTRA_ETH_FRP), bytes_of(filter(QEX_ETH_FILTER_ALLMULTI)));
}

TEST_F(TypedAndRaw, MacLearningLeavesTheRestOfTheManagementAlone) {
  VSPMACManagement management{};
  management.macChangeAllowed = 1;
  ASSERT_EQ(set_port(VSPROP_PORT_MAC_MANAGEMENT, bytes_of(management)), QEX_OK);
  VSPMACLearning learning{};
  learning.learning = 1;
  ASSERT_EQ(VSDVS_SetPortMACLearning("s", "p", &learning), QEX_OK);
  management.portMACLearning = learning;
  EXPECT_EQ(port(VSPROP_PORT_MAC_MANAGEMENT), bytes_of(management));
}

TEST_F(TypedAndRaw, APortWithoutTeamingHasItsSwitchs) {
  auto const policy = teaming(TEAM_FRP_TYPE_FO_EXPLICIT);
  ASSERT_EQ(VSDVS_SetTeamingPolicy("s", &policy), QEX_OK);
  VSTeamPolicy read{};
  EXPECT_EQ(VSDVS_GetPortTeamingPolicy("s", "p", &read), QEX_OK);
  EXPECT_EQ(bytes_of(read), bytes_of(policy));
}

TEST_F(TypedAndRaw, TheVlanInfoFollowsTheVlanPolicy) {
  ASSERT_EQ(set_port(VSPROP_PORT_VLAN, vlan_policy(0, 5, {{7, 9}})), QEX_OK);
  EXPECT_EQ(port(QEX_NEBPROP_PORT_VLAN), (Bytes{5, 0, 1, 0, 7, 0, 9, 0}));
  EXPECT_EQ(set_port(QEX_NEBPROP_PORT_VLAN, {5, 0, 0, 0}), QEX_READ_ONLY);
}

}  // namespace
