// The rows of addresses that a data path learned, which go with the devices of ports.
#include "storage/running/remembered.h"

#include <gmock/gmock.h>

#include "named_switch.h"
#include "storage/query.h"
#include "storage/store.h"

namespace {

using namespace simhost::storage;
using testing::ElementsAre;
using testing::FieldsAre;
using testing::IsEmpty;
using testing::SizeIs;

constexpr MacBytes kOne{std::byte{2}, {}, {}, {}, {}, std::byte{1}};
constexpr MacBytes kOther{std::byte{2}, {}, {}, {}, {}, std::byte{2}};

constexpr std::optional<SeenAt> kNever;

struct RememberedAddresses : testing::Test {
  RememberedAddresses() {
    key = *add_switch(transaction, named("s"));
    p1 = *add_port(transaction, key, "p1", PortKind::client);
    p2 = *add_port(transaction, key, "p2", PortKind::client);
    put_device(transaction, p1, "tap1", std::nullopt);
  }
  std::vector<Remembered> all() { return remembered_of(transaction, key); }
  void learned(MacBytes const &mac, std::optional<PortNumber> port) {
    remember(transaction, key,
             {.as = RememberedAs::learned, .vlan = std::uint16_t{7}, .mac = mac, .port = port});
  }

  Store store{std::nullopt, [](ChangingTransaction &) {}};
  ChangingTransaction transaction{store};
  SwitchKey key{};
  PortNumber p1{};
  PortNumber p2{};
};

TEST_F(RememberedAddresses, AreAtOnePlace) {
  learned(kOne, p1);
  EXPECT_THAT(all(), ElementsAre(FieldsAre(RememberedAs::learned, 7, kOne, p1, kNever)));
  learned(kOne, std::nullopt);
  EXPECT_THAT(all(), ElementsAre(FieldsAre(RememberedAs::learned, 7, kOne, std::nullopt, kNever)));
  // Likewise in all VLANs.
  Remembered first{.as = RememberedAs::first, .vlan = std::nullopt, .mac = kOne, .port = p1};
  remember(transaction, key, first);
  remember(transaction, key, first);
  EXPECT_THAT(all(), SizeIs(2));
  remove_remembered(transaction, key, first);
  EXPECT_THAT(all(), ElementsAre(FieldsAre(RememberedAs::learned, 7, kOne, std::nullopt, kNever)));
  remove_remembered(transaction);
  EXPECT_THAT(all(), IsEmpty());
}

TEST_F(RememberedAddresses, TellWhenTheyWereSeen) {
  for (auto const seen : {SeenAt(0), SeenAt(1234567890123)}) {
    Remembered const source{.as = RememberedAs::counted,
                            .vlan = std::uint16_t{7},
                            .mac = kOne,
                            .port = std::nullopt,
                            .seen = seen};
    remember(transaction, key, source);
    EXPECT_THAT(all(), ElementsAre(FieldsAre(RememberedAs::counted, 7, kOne, std::nullopt, seen)));
  }
}

TEST_F(RememberedAddresses, GoWithTheDeviceOfTheirPort) {
  learned(kOne, p1);
  learned(kOther, std::nullopt);
  put_device(transaction, p1, "tap1", kOther);
  EXPECT_THAT(all(), SizeIs(2));
  put_device(transaction, p1, "tap2", std::nullopt);
  EXPECT_THAT(all(),
              ElementsAre(FieldsAre(RememberedAs::learned, 7, kOther, std::nullopt, kNever)));
}

TEST_F(RememberedAddresses, AreNoneOfWhatIsGone) {
  learned(kOne, p2);
  EXPECT_THAT(all(), IsEmpty());
  learned(kOne, p1);
  remove_switch(transaction, key);
  learned(kOne, std::nullopt);
  EXPECT_THAT(all(), IsEmpty());
}

TEST_F(RememberedAddresses, AreCheckedWhenTheyAreRead) {
  learned(kOne, p1);
  Change(transaction, "UPDATE remembered SET kind = 9").run();
  EXPECT_THROW(all(), UnusableState);
  Change(transaction, "UPDATE remembered SET kind = 1, vlan = 4096").run();
  EXPECT_THROW(all(), UnusableState);
  Change(transaction, "UPDATE remembered SET vlan = 7, seen = 1 << 62").run();
  EXPECT_THROW(all(), UnusableState);
}

}  // namespace
