// Reading a document with care: every value is asked for by what it must be, and what is wrong is
// told with the path of the key, such as "switches[0].mtu: 99 is below 1280".
#pragma once

#include <algorithm>
#include <array>
#include <cstddef>
#include <cstdint>
#include <initializer_list>
#include <nlohmann/json.hpp>
#include <optional>
#include <span>
#include <stdexcept>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace simhost::scenario {

using Json = nlohmann::ordered_json;

/// A document that cannot be used; what() says where and why.
class DocumentError : public std::runtime_error {
  using std::runtime_error::runtime_error;
};

/// Throws DocumentError for a text that is no JSON, or has a key twice in one object.
Json parsed(std::string_view text);

/// A text and what it stands for.
template <typename Value>
struct Choice {
  std::string_view text;
  Value value;
};

/// The text of a value; null for one that is not among the choices.
template <typename Value, std::size_t kCount>
Json choice_to_json(Value value, std::array<Choice<Value>, kCount> const &choices) {
  auto const found = std::find_if(choices.begin(), choices.end(),
                                  [&](auto const &choice) { return choice.value == value; });
  return found == choices.end() ? Json() : Json(found->text);
}

struct Member;

/// A value of a document and its path. The document must outlive it.
class Node {
 public:
  explicit Node(Json const &value, std::string path = "")
      : value_(&value), path_(std::move(path)) {}

  [[noreturn]] void fail(std::string const &why) const;

  /// The value must be an object that has no other keys.
  void only(std::initializer_list<std::string_view> keys) const;
  [[nodiscard]] Node at(std::string_view key) const;
  [[nodiscard]] std::optional<Node> find(std::string_view key) const;
  [[nodiscard]] std::vector<Member> members() const;
  /// The value must be an array.
  [[nodiscard]] std::vector<Node> items() const;

  [[nodiscard]] bool flag() const;
  static bool flag_of(Node const &node) { return node.flag(); }
  [[nodiscard]] std::string text() const;
  [[nodiscard]] std::int64_t integer(std::int64_t least, std::int64_t greatest) const;
  [[nodiscard]] std::uint64_t counter() const;
  /// Seconds with up to three decimals, as milliseconds.
  [[nodiscard]] std::int64_t milliseconds() const;
  template <typename Value, std::size_t kCount>
  [[nodiscard]] Value choice(std::span<Choice<Value> const, kCount> choices) const {
    auto const given = text();
    std::string known;
    for (auto const &choice : choices) {
      if (choice.text == given) {
        return choice.value;
      }
      known += known.empty() ? "" : ", ";
      known += choice.text;
    }
    fail("'" + given + "' is none of " + known);
  }

  /// What `read` makes of the value under a key, or `otherwise` if there is none.
  template <typename Value, typename Read>
  [[nodiscard]] Value get(std::string_view key, Value otherwise, Read const &read) const {
    auto const node = find(key);
    return node ? static_cast<Value>(read(*node)) : otherwise;
  }

 private:
  Json const *value_;
  std::string path_;
};

/// A key of an object and its value.
struct Member {
  std::string key;
  Node value;
};

}  // namespace simhost::scenario
