// Families of generic netlink are there or are not.
#include "events/netlink_family.h"

#include <gtest/gtest.h>

namespace simhost::events {
namespace {

TEST(TheKernel, HasTheFamilyThatKnowsTheOthers) {
  EXPECT_TRUE(has_netlink_family("nlctrl"));
}

TEST(TheKernel, HasNoFamilyThatNobodyMade) {
  EXPECT_FALSE(has_netlink_family("nowhere"));
}

}  // namespace
}  // namespace simhost::events
