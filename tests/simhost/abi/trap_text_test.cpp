// The text of a report: the interpreter takes nothing but UTF-8, and the buffer is bounded.
#include <gtest/gtest.h>

#include <string>

#include "abi/trap.h"

namespace {

std::string described(std::string_view message) {
  simhost::TrapReport report;
  simhost::describe(report, simhost::TrapKind::os_error, "Call", message);
  EXPECT_EQ(report.kind, simhost::TrapKind::os_error);
  return report.text.data();
}

constexpr std::size_t kRoom = sizeof(simhost::TrapReport::text) - sizeof "Call: ";

TEST(TrapText, NamesTheCall) {
  EXPECT_EQ(described("gone"), "Call: gone");
}

TEST(TrapText, KeepsCharactersOfEveryLength) {
  EXPECT_EQ(described("a\u00FC\u20AC\U0001F600"), "Call: a\u00FC\u20AC\U0001F600");
  EXPECT_EQ(described("\U0010FFFF\uD7FF"), "Call: \U0010FFFF\uD7FF");
}

TEST(TrapText, ReplacesBytesThatAreNoUtf8) {
  EXPECT_EQ(described("/tmp/\xFF\xFEx"), "Call: /tmp/??x");
  EXPECT_EQ(described("\xC3"), "Call: ?") << "cut off";
  EXPECT_EQ(described("\xC0\xAF"), "Call: ??") << "overlong";
  EXPECT_EQ(described("\xE0\x80\x80"), "Call: ???") << "overlong";
  EXPECT_EQ(described("\xED\xA0\x80"), "Call: ???") << "surrogate";
  EXPECT_EQ(described("\xF4\x90\x80\x80"), "Call: ????") << "past the last character";
  EXPECT_EQ(described("\xE2\x82x"), "Call: ??x") << "interrupted";
}

TEST(TrapText, FillsTheBufferToItsEnd) {
  EXPECT_EQ(described(std::string(kRoom, 'm')), "Call: " + std::string(kRoom, 'm'));
  EXPECT_EQ(described(std::string(kRoom + 1, 'm')), "Call: " + std::string(kRoom, 'm'));
}

TEST(TrapText, CutsBetweenCharacters) {
  EXPECT_EQ(described(std::string(kRoom - 1, 'm') + "\u20AC"),
            "Call: " + std::string(kRoom - 1, 'm'));
}

}  // namespace
