// A trace as it is played: what stands where, and what is wrong in which line.

#include "recordings/player/script.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "recordings/player/names.h"

namespace recordings {
namespace {

std::vector<std::string> const whole{
    R"({"vswitch trace": 1})",
    R"({"process": 7, "parent": 1})",
    (R"({"call": 1, "process": 7, "thread": 1, "function": "DVSState_SwitchForEach", )"
     R"("in": {"callback": {"at": 1}, "context": null}})"),
    R"({"callback": 2, "process": 7, "thread": 1, "within": 1, "in": {}})",
    (R"({"call": 3, "process": 7, "thread": 1, "within": 2, "function": "DVS_SwitchId", )"
     R"("in": {"handle": {"at": 2}}})"),
    R"({"end": 3, "process": 7, "result": "lab"})",
    R"({"end": 2, "process": 7, "result": 1})",
    R"({"end": 1, "process": 7})",
    R"({"process": 7, "parent": 1})",
    (R"({"call": 1, "process": 7, "thread": 2, "function": "VSDVS_SetMTU", )"
     R"("in": {"switchName": "lab", "mtu": 9000}})"),
};

std::string text_of(std::vector<std::string> const &lines) {
  std::string text;
  for (auto const &line : lines) {
    text += line + '\n';
  }
  return text;
}

TEST(Script, CallsAreInTheOrderInWhichTheyBegan) {
  Script const script(text_of(whole));
  script.check_values();
  ASSERT_EQ(script.events().size(), 4U);
  EXPECT_EQ(script.calls(), 3U);
  Event const &walk = script.events()[0];
  EXPECT_EQ(walk.line, 3U);
  EXPECT_EQ(walk.inner, std::vector<std::size_t>{1});
  EXPECT_EQ(script.events()[1].call, nullptr);
  EXPECT_EQ(script.events()[2].outer, 1U);
  EXPECT_EQ(script.events()[2].end, whole[5]);
  EXPECT_TRUE(script.events()[3].end.empty());
  ASSERT_EQ(script.parts().size(), 2U);
  EXPECT_EQ(script.parts()[0].threads.at(1), (std::vector<std::size_t>{0, 2}));
  EXPECT_EQ(script.parts()[1].threads.at(2), std::vector<std::size_t>{3});
}

struct Wrong {
  std::size_t line;
  std::string text;
  std::string said;
};

TEST(Script, WhatIsWrongIsSaidWithItsLine) {
  std::vector<Wrong> const all{
      {1, "# Title", "this is no trace: one begins with what made it"},
      {1, R"({"vswitch trace": 2})", "a trace of version 2, and this program reads those up to 1"},
      {2, "", "no JSON"},
      {2, "[1]", "no event: a line is an object"},
      {2, R"({"x": 1})", "no event that a trace has"},
      {2, R"({"parent": 1})", "the event lacks 'process'"},
      {3, R"({"call": 1, "process": 8})", "an event of the process 8, which did not begin"},
      {3, R"({"call": 1, "process": 7})", "the event lacks 'in'"},
      {3, R"({"call": 1, "process": 7, "in": []})", "in is no object"},
      {3, R"({"call": 1, "process": 7, "thread": "1", "in": {}})", "thread is no whole number"},
      {3, R"({"call": 1, "process": 7, "thread": 1, "in": {}, "function": 1})",
       "function is no text"},
      {3, R"({"call": 1, "process": 7, "thread": 1, "in": {}, "function": "x"})",
       "no call of the host is named x"},
      {4, R"({"callback": 2, "process": 7, "thread": 1, "in": {}})",
       "the host called back outside a call, which cannot be played"},
      {4, R"({"callback": 2, "process": 7, "thread": 1, "within": 9, "in": {}})",
       "nothing is in progress that could have the number 9"},
      {5,
       R"({"call": 3, "process": 7, "thread": 1, "within": 1, "function": "DVS_SwitchId", )"
       R"("in": {}})",
       "nothing is in progress that could have the number 1"},
      {5, R"({"call": 2, "process": 7, "thread": 1, "function": "DVS_SwitchId", "in": {}})",
       "the number 2 begins a second time"},
      {6, R"({"end": 9, "process": 7})", "the end of 9, which did not begin"},
      {6, R"({"x": )" + std::string(65, '[') + std::string(65, ']') + "}",
       "values are nested too deep"},
      {6, R"({"end": 3, "process": 7, "result": 1})", "result: is no object: 1"},
  };
  for (Wrong const &one : all) {
    auto lines = whole;
    lines[one.line - 1] = one.text;
    // Values are looked at from the begin of the call.
    auto const line = one.said.starts_with("result") ? 5 : one.line;
    try {
      Script(text_of(lines)).check_values();
      ADD_FAILURE() << "nobody refused " << one.text;
    } catch (Unplayable const &unplayable) {
      EXPECT_EQ(unplayable.what(), "line " + std::to_string(line) + ": " + one.said);
    }
  }
}

TEST(Names, TheNumberOfTheProcessIsAnotherOne) {
  Names names;
  names.note_process(500, 42);
  EXPECT_TRUE(names.are_same("vswitch-500-1", "vswitch-42-1"));
  EXPECT_TRUE(names.are_same("vswitch-500-1", "vswitch-500-1"));
  EXPECT_FALSE(names.are_same("vswitch-5001", "vswitch-421"));
  EXPECT_FALSE(names.are_same("vswitch-500-1", "vswitch-42-2"));
  EXPECT_EQ(names.as_recorded(Json{"x-42", 42}), (Json{"x-500", 42}));
  // Only what the tool has put into a name is one where it comes out.
  EXPECT_EQ(names.of_now(Json{"x-500"}), Json{"x-500"});
  names.learn(Json{{"sid", "x-500"}}, Json{{"sid", "x-42"}});
  EXPECT_EQ(names.of_now(Json{"x-500", "y-500"}), (Json{"x-42", "y-500"}));
}

}  // namespace
}  // namespace recordings
