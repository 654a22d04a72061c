// The printed form of names.

#include "helpers/names.h"

#include <gtest/gtest.h>

namespace {

TEST(NameText, IsTheRecordsOwnText) {
  qex_Name const name = {"uplink1"};
  EXPECT_EQ(name.string, name_text(&name));
}

TEST(NameText, OfNoNameIsNone) {
  EXPECT_EQ(nullptr, name_text(nullptr));
}

}  // namespace
