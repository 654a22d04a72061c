// Beacons on their way there and back, and frames that are none.
#include "planes/openvswitch/beacons/frame.h"

#include <gmock/gmock.h>

#include <span>

namespace {

using simhost::beacons::Beacon;
using simhost::beacons::find_beacon;
using simhost::beacons::Key;
using simhost::beacons::to_frame;
using testing::ElementsAre;
using testing::Optional;

constexpr Key kKey{1, 2, 3, 4, 5, 6, 7, 8, 9, 10, 11, 12, 13, 14, 15, 16};
constexpr Beacon kBeacon{.of_switch = 0x1122334455667788, .link = 0x10002};

TEST(ABeacon, IsReadAsItWasWritten) {
  auto const frame = to_frame(kKey, kBeacon, 7);
  EXPECT_EQ(frame.size(), 60);
  EXPECT_THAT(std::span(frame).first(14),
              ElementsAre(3, 0x62, 0x63, 1, 2, 3, 2, 4, 5, 6, 0, 7, 0x88, 0xb5));
  EXPECT_THAT(find_beacon(kKey, frame), Optional(kBeacon));
  auto longer = frame;
  longer.resize(64);
  EXPECT_THAT(find_beacon(kKey, longer), Optional(kBeacon)) << "devices fill frames up";
}

TEST(ABeacon, OfSomebodyElseIsNone) {
  for (std::size_t at = 0; at < kKey.size(); ++at) {
    auto other = kKey;
    other[at] ^= 1U;
    EXPECT_EQ(find_beacon(kKey, to_frame(other, kBeacon, 7)), std::nullopt);
  }
}

TEST(ABeacon, IsNoOtherFrame) {
  auto const frame = to_frame(kKey, kBeacon, 7);
  for (std::size_t size = 0; size < frame.size(); ++size) {
    EXPECT_EQ(find_beacon(kKey, std::span(frame).first(size)), std::nullopt);
  }
  for (std::size_t const at : {0U, 5U, 12U, 13U}) {
    auto other = frame;
    other[at] ^= 1U;
    EXPECT_EQ(find_beacon(kKey, other), std::nullopt);
  }
}

}  // namespace
