// Reading a document with care: every value is asked for by what it must be, and what is wrong is
// told with the path of the key, such as "switches[0].version: -1 is below 0".
#pragma once

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

#include "model/properties/form.h"

namespace simhost::scenario {

using Json = nlohmann::ordered_json;

/// A document that cannot be used; what() says where and why.
class DocumentError : public std::runtime_error {
  using std::runtime_error::runtime_error;
};

/// Throws DocumentError for a text that is no JSON, or has a key twice in one object.
Json parsed(std::string_view text);

/// The word of a number; null for one that has none.
Json word_to_json(std::int64_t number, std::span<Word const> words);

struct NamedNode;

/// A value of a document and its path. The document must outlive it.
class Node {
 public:
  explicit Node(Json const &value, std::string path = "")
      : value_(&value), path_(std::move(path)) {}

  [[noreturn]] void fail(std::string const &why) const;

  [[nodiscard]] bool is_object() const { return value_->is_object(); }
  [[nodiscard]] bool is_text() const { return value_->is_string(); }

  /// The value must be an object that has no other keys.
  void only(std::initializer_list<std::string_view> keys) const;
  void only(std::span<std::string_view const> keys) const;
  [[nodiscard]] Node at(std::string_view key) const;
  [[nodiscard]] std::optional<Node> find(std::string_view key) const;
  [[nodiscard]] std::vector<NamedNode> members() const;
  /// The value must be an array.
  [[nodiscard]] std::vector<Node> items() const;

  [[nodiscard]] bool flag() const;
  [[nodiscard]] std::string text() const;
  [[nodiscard]] std::int64_t integer(std::int64_t least, std::int64_t greatest) const;
  [[nodiscard]] std::uint64_t counter() const;
  /// Seconds with up to three decimals, as milliseconds.
  [[nodiscard]] std::int64_t milliseconds() const;
  /// The number of one of the words.
  [[nodiscard]] std::int64_t choice(std::span<Word const> words) const;

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
struct NamedNode {
  std::string key;
  Node value;
};

}  // namespace simhost::scenario
