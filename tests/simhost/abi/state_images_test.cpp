// The state as a whole in bytes: what an image brings back, and images that are none.
#include "nebpublic/state.h"

#include <gmock/gmock.h>

#include <algorithm>
#include <cstddef>
#include <cstring>
#include <string_view>
#include <vector>

#include "configured_switch.h"
#include "vswitch/properties.h"

namespace {

using StateImages = ConfiguredSwitch;

Bytes image(QEX_ReturnStatus (*get)(void **, int *)) {
  void *data = nullptr;
  int length = 0;
  EXPECT_EQ(get(&data, &length), QEX_OK);
  return taken(data, length);
}

QEX_ReturnStatus deserialize(Bytes bytes) {
  return DVSState_ConfigDeserialize(bytes.data(), static_cast<int>(bytes.size()));
}

constexpr std::size_t kHeader = 24;

// The sum is the last field of the header.
Bytes with_sum(Bytes bytes) {
  qex_uint32 sum = 2166136261U;
  for (std::size_t at = kHeader; at < bytes.size(); ++at) {
    sum = (sum ^ bytes[at]) * 16777619U;
  }
  std::memcpy(&bytes[kHeader - sizeof sum], &sum, sizeof sum);
  return bytes;
}

// For each place where an image has the text, the image with a NUL inside of it.
std::vector<Bytes> with_a_nul_in(std::string_view text, Bytes const &image) {
  std::vector<Bytes> images;
  auto at = image.begin();
  while ((at = std::search(at, image.end(), text.begin(), text.end())) != image.end()) {
    auto bad = image;
    bad[static_cast<std::size_t>(++at - image.begin())] = 0;
    images.push_back(with_sum(bad));
  }
  return images;
}

TEST_F(StateImages, TheConfigurationComesBackFromItsImage) {
  ASSERT_EQ(set_port(VSPROP_PORT_TX_UPLINK, {1}, "p", POLICY_PROP_TYPE), QEX_OK);
  ASSERT_EQ(set_port("com.example.soon", {1}, "p", RUNTIME_PROP_TYPE), QEX_OK);
  ASSERT_EQ(VSDVS_AddOpaqueDVPort("s", "q", "theirs"), QEX_OK);
  ASSERT_EQ(VSDVS_CreateVSwitch("fleeting", nullptr, nullptr, 0, 0, 0, 0, 0), QEX_OK);
  auto const persistent = image(DVSQEX_PersistentStateGet);
  ASSERT_EQ(DVSState_ConfigReset(), QEX_OK);
  EXPECT_EQ(DVSState_SwitchFindByAlias("s"), nullptr);
  EXPECT_EQ(deserialize(persistent), QEX_OK);
  EXPECT_EQ(port(VSPROP_PORT_TX_UPLINK), Bytes{1});
  EXPECT_EQ(port("com.example.soon"), std::nullopt);
  EXPECT_EQ(DVSState_SwitchFindByAlias("fleeting"), nullptr);
  OpaqueDVPortData *opaque = nullptr;
  ASSERT_EQ(DVSQEX_PortGetByExternalId("s-id", "theirs", &opaque), QEX_OK);
  DVSQEX_DataFree(opaque);
  EXPECT_EQ(VSDVS_AddSwitchUplinkPort("s", "nic0"), QEX_EXISTS) << "the uplinks are back";
  EXPECT_EQ(image(DVSQEX_PersistentStateGet), persistent);
  ASSERT_EQ(DVSQEX_StateCleanup(), QEX_OK);
  auto read = persistent;
  EXPECT_EQ(DVSQEX_StateInit(read.data(), static_cast<int>(read.size())), QEX_OK);
  EXPECT_EQ(image(DVSQEX_PersistentStateGet), persistent);
}

TEST_F(StateImages, WhatWasNotSetIsNotSetAfterwards) {
  auto const clear = [] { return DVSQEX_GlobalPropClear("s-id", VSPROP_MTU); };
  ASSERT_EQ(clear(), QEX_OK);
  auto const persistent = image(DVSQEX_PersistentStateGet);
  ASSERT_EQ(deserialize(persistent), QEX_OK);
  EXPECT_EQ(clear(), QEX_NOT_FOUND);
  EXPECT_EQ(image(DVSQEX_PersistentStateGet), persistent);
}

TEST_F(StateImages, TheWholeStateComesBackFromItsImage) {
  ASSERT_EQ(set_port("com.example.soon", {1}, "p", RUNTIME_PROP_TYPE), QEX_OK);
  ASSERT_EQ(VSDVS_CreateVSwitch("fleeting", nullptr, nullptr, 0, 0, 0, 0, 0), QEX_OK);
  ASSERT_EQ(DVSQEX_SwitchAdd("i", "waiting", 0, 0), QEX_OK);
  auto whole = image(DVSQEX_StateGet);
  ASSERT_EQ(DVSQEX_StateInit(nullptr, 0), QEX_OK);
  EXPECT_EQ(DVSState_SwitchFindByAlias("s"), nullptr);
  EXPECT_EQ(deserialize(whole), QEX_BAD_PARAM) << "it is more than a configuration";
  EXPECT_EQ(DVSQEX_StateInit(whole.data(), static_cast<int>(whole.size())), QEX_OK);
  EXPECT_EQ(port("com.example.soon"), Bytes{1});
  EXPECT_NE(DVSState_SwitchFindByAlias("fleeting"), nullptr);
  EXPECT_EQ(image(DVSQEX_StateGet), whole);
}

// Only null is no image: one of no bytes is cut short.
TEST_F(StateImages, AnImageOfNoBytesIsRefused) {
  auto const whole = image(DVSQEX_StateGet);
  std::byte nothing{};
  EXPECT_EQ(DVSQEX_StateInit(&nothing, 0), QEX_INVALID_METADATA);
  EXPECT_EQ(DVSState_ConfigDeserialize(&nothing, 0), QEX_INVALID_METADATA);
  EXPECT_EQ(DVSQEX_PortAdd("s-id", "q", &nothing, 0), QEX_INVALID_METADATA);
  EXPECT_EQ(image(DVSQEX_StateGet), whole);
}

TEST_F(StateImages, DamagedImagesAreRefusedAndChangeNothing) {
  ASSERT_EQ(set_port(VSPROP_PORT_TX_UPLINK, {1}), QEX_OK);
  auto const good = image(DVSQEX_PersistentStateGet);
  for (std::size_t length = 0; length < good.size(); ++length) {
    ASSERT_NE(deserialize(Bytes(good.begin(), good.begin() + static_cast<std::ptrdiff_t>(length))),
              QEX_OK)
        << length;
  }
  for (std::size_t at = 0; at < good.size(); ++at) {
    auto bad = good;
    bad[at] ^= 0x55;
    // The version of the switch that a block is for changes nothing in it.
    if (at < 12 || at >= 16) {
      ASSERT_NE(deserialize(bad), QEX_OK) << at;
    }
  }
  EXPECT_EQ(deserialize(good + Bytes{0}), QEX_INVALID_METADATA);
  EXPECT_EQ(DVSState_ConfigDeserialize(nullptr, 0), QEX_INVALID_METADATA);
  EXPECT_EQ(DVSState_ConfigDeserialize(nullptr, 8), QEX_BAD_PARAM);
  auto byte = Bytes{0};
  EXPECT_EQ(DVSState_ConfigDeserialize(byte.data(), -1), QEX_BAD_PARAM);
  EXPECT_EQ(image(DVSQEX_PersistentStateGet), good);
}

// Past the checksum: what it covers may still be anything.
TEST_F(StateImages, ImagesWithARightChecksumAreReadWithCareToo) {
  auto const good = image(DVSQEX_PersistentStateGet);
  ASSERT_EQ(with_sum(good), good) << "this test computes the sum as the host does";
  int refused = 0;
  for (std::size_t at = kHeader; at < good.size(); ++at) {
    for (unsigned char const change : {0x01, 0x80, 0xFF}) {
      auto bad = good;
      bad[at] ^= change;
      refused += deserialize(with_sum(bad)) == QEX_OK ? 0 : 1;
    }
  }
  EXPECT_GT(refused, 100) << "most of these are no state";
  EXPECT_EQ(deserialize(good), QEX_OK);
  EXPECT_EQ(image(DVSQEX_PersistentStateGet), good);
}

// No caller could say such a name, and none could read the state any more.
TEST_F(StateImages, ATextWithANulInItIsRefusedAndChangesNothing) {
  ASSERT_EQ(VSDVS_CreateVSwitch("alias", "identifier", "portset", 0, 1, 0, 0, 0), QEX_OK);
  ASSERT_EQ(VSDVS_AddOpaqueDVPort("alias", "client", "external"), QEX_OK);
  ASSERT_EQ(set_port("com.example.key", {1}, "p", POLICY_PROP_TYPE), QEX_OK);
  auto const persistent = image(DVSQEX_PersistentStateGet);
  auto const whole = image(DVSQEX_StateGet);
  for (auto const *text :
       {"alias", "identifier", "portset", "client", "external", "nic0", "com.example.key"}) {
    auto const configurations = with_a_nul_in(text, persistent);
    EXPECT_FALSE(configurations.empty()) << text;
    for (auto const &bad : configurations) {
      ASSERT_EQ(deserialize(bad), QEX_INVALID_METADATA) << text;
    }
    auto const states = with_a_nul_in(text, whole);
    EXPECT_FALSE(states.empty()) << text;
    for (auto bad : states) {
      ASSERT_EQ(DVSQEX_StateInit(bad.data(), static_cast<int>(bad.size())), QEX_INVALID_METADATA)
          << text;
    }
  }
  EXPECT_EQ(image(DVSQEX_StateGet), whole);
}

}  // namespace
