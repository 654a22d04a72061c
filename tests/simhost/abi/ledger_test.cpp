// The ledger: what is out, what came back, and what should not have come.
#include "abi/ledger.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <set>
#include <string>
#include <vector>

#include "address_text.h"
#include "base/outcomes.h"

namespace {

using simhost::Ledger;
using simhost::TrapKind;
using simhost::Trapped;

std::string trap_of(Ledger &ledger, void *memory) {
  try {
    ledger.release(memory, "Taker");
    return "";
  } catch (Trapped const &panic) {
    EXPECT_EQ(panic.kind(), TrapKind::runtime_error);
    return panic.what();
  }
}

std::string report_of(Ledger const &ledger) {
  std::vector<char> text(ledger.report({}) + 1);
  EXPECT_EQ(ledger.report(text), text.size() - 1);
  return text.data();
}

TEST(Ledger, GivesOutZeroedMemory) {
  Ledger ledger;
  auto *const block = static_cast<unsigned char *>(ledger.allocate(4096, "Giver"));
  EXPECT_TRUE(std::all_of(block, block + 4096, [](unsigned char byte) { return byte == 0; }));
}

TEST(Ledger, CountsWhatIsOut) {
  Ledger ledger;
  auto *const first = ledger.allocate(1, "Giver");
  auto *const second = ledger.allocate(1, "Giver");
  EXPECT_EQ(ledger.count(), 2U);
  ledger.release(first, "Taker");
  EXPECT_EQ(ledger.count(), 1U);
  ledger.release(second, "Taker");
  EXPECT_EQ(ledger.count(), 0U);
}

TEST(Ledger, TakesNullForNothing) {
  Ledger ledger;
  ledger.allocate(1, "Giver");
  ledger.release(nullptr, "Taker");
  EXPECT_EQ(ledger.count(), 1U);
}

TEST(Ledger, RefusesMemoryOfOthers) {
  Ledger ledger;
  int mine = 0;
  EXPECT_EQ(trap_of(ledger, &mine), "the host never gave out the memory at " + text_of(&mine));
}

TEST(Ledger, RefusesTheInsideOfABlock) {
  Ledger ledger;
  auto *const inside = static_cast<char *>(ledger.allocate(8, "Giver")) + 4;
  EXPECT_EQ(trap_of(ledger, inside), "the host never gave out the memory at " + text_of(inside));
  EXPECT_EQ(ledger.count(), 1U);
}

TEST(Ledger, NamesBothCallsWhenMemoryComesBackTwice) {
  Ledger ledger;
  auto *const block = ledger.allocate(8, "Giver");
  ledger.release(block, "FirstTaker");
  EXPECT_EQ(trap_of(ledger, block), "the memory at " + text_of(block) +
                                        " is given back twice: Giver gave it out, FirstTaker "
                                        "took it back");
}

TEST(Ledger, NamesTheLastLifeOfAnAddressThatCameBackToLife) {
  // An allocator uses addresses again sooner or later; a sanitizer's waits for many megabytes.
  constexpr std::size_t kSize = 1U << 20U;
  Ledger ledger;
  std::set<void *> first_lives;
  for (int life = 0; life < 4; ++life) {
    auto *const block = ledger.allocate(kSize, "FirstGiver");
    first_lives.insert(block);
    ledger.release(block, "FirstTaker");
  }
  void *again = nullptr;
  for (int attempt = 0; !first_lives.contains(again); ++attempt) {
    ASSERT_LT(attempt, 1000) << "no address came back, so the case was not reached";
    again = ledger.allocate(kSize, "SecondGiver");
    ledger.release(again, "SecondTaker");
  }
  EXPECT_THAT(trap_of(ledger, again),
              testing::EndsWith("SecondGiver gave it out, SecondTaker took it back"));
}

TEST(Ledger, ReportsOldestFirst) {
  Ledger ledger;
  auto *const first = ledger.allocate(80, "VSQEX_GetUplinks");
  auto *const gone = ledger.allocate(1, "VSQEX_GetUplinks");
  auto *const last = ledger.allocate(3, "DVSQEX_StateGet");
  ledger.release(gone, "VSQEX_FreeMemory");
  EXPECT_EQ(report_of(ledger), text_of(first) + " 80 bytes from VSQEX_GetUplinks\n" +
                                   text_of(last) + " 3 bytes from DVSQEX_StateGet\n");
}

TEST(Ledger, NotesWhatIsNotItsMemory) {
  Ledger ledger;
  int noted = 0;
  ledger.note(&noted, 10, "Giver", "ItsTaker");
  EXPECT_EQ(ledger.count(), 1U);
  ledger.resize(&noted, 20);
  EXPECT_EQ(ledger.summary(), "1 x 20 bytes from Giver\n");
  EXPECT_EQ(report_of(ledger), text_of(&noted) + " 20 bytes from Giver\n");
  EXPECT_EQ(trap_of(ledger, &noted),
            "Giver gave out what is at " + text_of(&noted) + ", and ItsTaker takes it back");
  EXPECT_EQ(ledger.count(), 1U);
  ledger.forget(&noted);
  EXPECT_EQ(ledger.count(), 0U);
  EXPECT_EQ(trap_of(ledger, &noted), "the host never gave out the memory at " + text_of(&noted));
}

TEST(Ledger, ReportsNothingWhenNothingIsOut) {
  std::array<char, 4> text{'x', 'x', 'x', 'x'};
  EXPECT_EQ(Ledger().report(text), 0U);
  EXPECT_STREQ(text.data(), "");
}

TEST(Ledger, CutsTheReportAtTheCallersRoom) {
  Ledger ledger;
  auto const line = text_of(ledger.allocate(7, "Giver")) + " 7 bytes from Giver\n";
  ledger.allocate(7, "Giver");
  std::array<char, 8> text{};
  EXPECT_EQ(ledger.report(std::span(text).first(6)), ledger.report({}));
  EXPECT_EQ(std::string(text.data()), line.substr(0, 5));
}

}  // namespace
