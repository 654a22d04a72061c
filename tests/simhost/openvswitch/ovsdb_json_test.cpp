// Messages of a stream, OVSDB's notation, and a replica that follows changes.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <functional>

#include "planes/openvswitch/ovsdb/client.h"

namespace simhost::ovsdb {
namespace {

std::string words_of(std::function<void()> const &work) {
  try {
    work();
  } catch (Malformed const &error) {
    return error.what();
  }
  return "nothing is wrong";
}

void append(Splitter &splitter, std::string const &text) {
  splitter.append({reinterpret_cast<std::uint8_t const *>(text.data()), text.size()});
}

TEST(Splitter, TellsMessagesApart) {
  Splitter splitter;
  append(splitter, R"({"a": "}\"{"} {"b": [{}]})"
                   "\n{\"c\"");
  EXPECT_EQ(splitter.next(), Json({{"a", "}\"{"}}));
  EXPECT_EQ(splitter.next(), Json({{"b", Json::array({Json::object()})}}));
  EXPECT_EQ(splitter.next(), std::nullopt);
  append(splitter, ":1}");
  EXPECT_EQ(splitter.next(), Json({{"c", 1}}));
}

TEST(Splitter, ReadsAMessageThatComesByteByByte) {
  Splitter splitter;
  std::string const text = R"({"a\\": "\\\"}", "b": {"c": [1, 2]}})";
  for (std::size_t index = 0; index + 1 < text.size(); ++index) {
    append(splitter, text.substr(index, 1));
    EXPECT_EQ(splitter.next(), std::nullopt);
  }
  append(splitter, "}");
  EXPECT_EQ(splitter.next(), Json::parse(text));
}

TEST(Splitter, RefusesWhatIsNoMessage) {
  auto const words = [](std::string const &text) {
    return words_of([&] {
      Splitter splitter;
      append(splitter, text);
      splitter.next();
    });
  };
  EXPECT_EQ(words("[]"), "what the database sends is no object of JSON");
  EXPECT_EQ(words("7"), "what the database sends is no object of JSON");
  EXPECT_EQ(words("{]"), "what the database sends is no object of JSON");
  EXPECT_EQ(words("{\"a\" 1}"), "what the database sends is no object of JSON");
  EXPECT_EQ(words("{\"\xff\": 1}"), "what the database sends is no object of JSON");
  EXPECT_EQ(words("{\"a\": " + std::string(64, '[')),
            "what the database sends is nested too deeply");
  EXPECT_EQ(words("{\"a\": \"" + std::string(65 << 20, 'x')),
            "what the database sends is too long");
  EXPECT_EQ(words("{\"a\": " + std::string(63, '[')), "nothing is wrong");
}

Replica replica_with_a_row() {
  auto const schema = Json::parse(R"({"tables": {"T": {"columns": {
      "number": {"type": "integer"},
      "name": {"type": {"key": {"type": "string"}}},
      "row": {"type": {"key": {"type": "uuid"}}},
      "is": {"type": "boolean"},
      "maybe": {"type": {"key": "integer", "min": 0, "max": 1}},
      "some": {"type": {"key": "string", "min": 0, "max": "unlimited"}},
      "pairs": {"type": {"key": "string", "value": "string", "min": 0, "max": "unlimited"}}}}}})");
  Replica replica(
      selected_schema(schema, {{"T", {"number", "name", "row", "is", "maybe", "some", "pairs"}}}));
  replica.apply(Json::parse(R"({"T": {"u": {"initial": {
      "maybe": 1, "some": ["set", ["b", "a"]], "pairs": ["map", [["k", "v"], ["a", "b"]]]}}}})"));
  return replica;
}

TEST(Replica, BeginsWithWhatColumnsUsuallyHave) {
  auto replica = replica_with_a_row();
  replica.apply(Json::parse(R"({"T": {"v": {"insert": {}}}, "Other": 1})"));
  auto const &row = replica.rows("T").at("v");
  EXPECT_EQ(row.at("number"), 0);
  EXPECT_EQ(row.at("name"), "");
  EXPECT_EQ(row.at("row"), uuid("00000000-0000-0000-0000-000000000000"));
  EXPECT_EQ(row.at("is"), false);
  EXPECT_EQ(row.at("maybe"), set({}));
  EXPECT_EQ(row.at("some"), set({}));
  EXPECT_EQ(row.at("pairs"), map({}));
}

TEST(Replica, HasSetsAndMapsInOrder) {
  auto const replica = replica_with_a_row();
  auto const &row = replica.rows("T").at("u");
  EXPECT_EQ(row.at("maybe"), set({1}));
  EXPECT_EQ(row.at("some"), set({"a", "b"}));
  EXPECT_EQ(row.at("pairs"), map({{"a", "b"}, {"k", "v"}}));
}

TEST(Replica, TakesDifferencesOver) {
  auto replica = replica_with_a_row();
  replica.apply(Json::parse(R"({"T": {"u": {"modify": {
      "number": 7, "maybe": 2, "some": ["set", ["a", "c"]],
      "pairs": ["map", [["k", "v"], ["a", "z"], ["n", "m"]]]}}}})"));
  auto const &row = replica.rows("T").at("u");
  EXPECT_EQ(row.at("number"), 7);
  EXPECT_EQ(row.at("maybe"), set({2}));
  EXPECT_EQ(row.at("some"), set({"b", "c"}));
  EXPECT_EQ(row.at("pairs"), map({{"a", "z"}, {"n", "m"}}));
  replica.apply(Json::parse(R"({"T": {"u": {"delete": null}}})"));
  EXPECT_TRUE(replica.rows("T").empty());
}

TEST(Replica, RefusesWhatIsNoChange) {
  auto const words = [](std::string const &text) {
    return words_of([&] { replica_with_a_row().apply(Json::parse(text)); });
  };
  EXPECT_EQ(words("1"), "a change of the database is no object");
  EXPECT_EQ(words(R"({"T": []})"), "a change of the database is no object");
  EXPECT_EQ(words(R"({"T": {"u": 1}})"), "a change of the database is no object");
  EXPECT_EQ(words(R"({"T": {"u": {"insert": 1}}})"), "a change of the database is no object");
  EXPECT_EQ(words(R"({"T": {"x": {"modify": {}}}})"),
            "a change of the database is of no row that there is");
  EXPECT_EQ(words(R"({"T": {"u": {"modify": {"some": ["set", 1]}}}})"),
            "a set of the database has no list");
  EXPECT_EQ(words(R"({"T": {"u": {"modify": {"some": ["set", [[]]]}}}})"),
            "a value of the database is no atom");
  EXPECT_EQ(words(R"({"T": {"u": {"modify": {"pairs": 1}}}})"),
            "a value of the database is no map");
  EXPECT_EQ(words(R"({"T": {"u": {"modify": {"pairs": ["map", [1]]}}}})"),
            "an entry of a map of the database is no pair");
}

TEST(Schema, SaysWhatTheDatabaseLacks) {
  auto const schema = Json::parse(R"({"tables": {"T": {"columns": {}}}})");
  EXPECT_EQ(words_of([&] { selected_schema(schema, {{"X", {}}}); }), "the database has no table X");
  EXPECT_EQ(words_of([&] {
              selected_schema(schema, {{"T", {"c"}}});
            }),
            "the database has no column of T called c");
}

}  // namespace
}  // namespace simhost::ovsdb
