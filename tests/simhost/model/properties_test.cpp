// The property layer: one way to the bytes for all calls.
#include "model/properties/properties.h"

#include <cstdint>
#include <vector>

#include "memory_state.h"
#include "model/switches/properties.h"
#include "model/switches/switches.h"
#include "storage/switches.h"
#include "vswitch/properties.h"

namespace {

using simhost::set_property;
using simhost::storage::ChangingTransaction;
using simhost::storage::PropertyOwner;
using simhost::storage::PropertyType;
using simhost::storage::SwitchKey;

struct Properties : MemoryState {
  Properties() {
    simhost::create_switch(transaction, {.alias = "first"});
    owner.switch_key =
        simhost::storage::find_switch(transaction, simhost::storage::SwitchName::alias, "first")
            ->key;
  }

  QEX_ReturnStatus set(std::string_view key, std::vector<unsigned char> const &value) {
    return status_of([&] {
      set_property(transaction, owner, key, std::as_bytes(std::span(value)), PropertyType::policy);
    });
  }

  ChangingTransaction transaction{store};
  PropertyOwner owner = PropertyOwner::global(SwitchKey{});
};

TEST_F(Properties, RawBytesAreWhatTheTypedCallReads) {
  std::uint32_t const mtu = 9000;
  set_property(transaction, owner, VSPROP_MTU, std::as_bytes(std::span(&mtu, 1)),
               PropertyType::config);
  EXPECT_EQ(simhost::effective(transaction, simhost::switches::mtu, owner), 9000U);
}

TEST_F(Properties, TheTypedCallWritesTheRawBytes) {
  simhost::set(transaction, simhost::switches::mtu, owner, 0x1234);
  auto const property = simhost::storage::find_property(transaction, owner, VSPROP_MTU);
  EXPECT_EQ(property.value().value,
            (std::vector{std::byte{0x34}, std::byte{0x12}, std::byte{0}, std::byte{0}}));
  EXPECT_EQ(property->type, PropertyType::config);
}

TEST_F(Properties, MtuTakesFourBytesOnly) {
  EXPECT_EQ(set(VSPROP_MTU, {0xDC, 0x05, 0}), QEX_BAD_PARAM);
  EXPECT_EQ(set(VSPROP_MTU, {0xDC, 0x05, 0, 0}), QEX_OK);
  EXPECT_EQ(set(VSPROP_MTU, {0xDC, 0x05, 0, 0, 0}), QEX_BAD_PARAM);
  EXPECT_EQ(set(VSPROP_MTU, {}), QEX_BAD_PARAM);
}

TEST_F(Properties, MtuBoundsHoldForRawBytes) {
  EXPECT_EQ(set(VSPROP_MTU, {0xFF, 0x04, 0, 0}), QEX_BAD_PARAM);  // 1279
  EXPECT_EQ(set(VSPROP_MTU, {0x00, 0x05, 0, 0}), QEX_OK);         // 1280
  EXPECT_EQ(set(VSPROP_MTU, {0xE6, 0x23, 0, 0}), QEX_OK);         // 9190
  EXPECT_EQ(set(VSPROP_MTU, {0xE7, 0x23, 0, 0}), QEX_BAD_PARAM);  // 9191
}

TEST_F(Properties, AKeyWithoutRulesTakesAnyBytes) {
  EXPECT_EQ(set("com.example.note", {}), QEX_OK);
  EXPECT_EQ(set("com.example.note", {1, 0, 2}), QEX_OK);
  auto const property = simhost::storage::find_property(transaction, owner, "com.example.note");
  EXPECT_EQ(property.value().value, (std::vector{std::byte{1}, std::byte{0}, std::byte{2}}));
}

TEST_F(Properties, ALaterSetChangesTheType) {
  EXPECT_EQ(set("com.example.note", {1}), QEX_OK);
  set_property(transaction, owner, "com.example.note", {}, PropertyType::transient);
  EXPECT_EQ(simhost::storage::find_property(transaction, owner, "com.example.note")->type,
            PropertyType::transient);
}

TEST_F(Properties, OwnersAreApart) {
  auto const port = simhost::storage::add_port(transaction, owner.switch_key, "p1",
                                               simhost::storage::PortKind::client);
  std::vector const owners{owner, PropertyOwner::host(owner.switch_key),
                           PropertyOwner::port(owner.switch_key, port.value())};
  for (std::size_t at = 0; at < owners.size(); ++at) {
    auto const value = static_cast<std::byte>(at);
    set_property(transaction, owners[at], "com.example.note", std::span(&value, 1),
                 PropertyType::config);
  }
  for (std::size_t at = 0; at < owners.size(); ++at) {
    EXPECT_EQ(simhost::storage::find_property(transaction, owners[at], "com.example.note")->value,
              std::vector{static_cast<std::byte>(at)});
  }
}

}  // namespace
