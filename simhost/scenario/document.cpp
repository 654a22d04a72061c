// Every check names what it found.
#include "scenario/document.h"

#include <fmt/format.h>

#include <algorithm>
#include <cmath>
#include <cstdint>
#include <functional>
#include <set>

namespace simhost::scenario {
namespace {

std::string in_quotes(std::string_view key) {
  return fmt::format("'{}'", key);
}

// JSON lets the last of two like keys win, which hides a mistake.
class LikeKeys {
 public:
  bool operator()(int, Json::parse_event_t event, Json &value) {
    if (event == Json::parse_event_t::object_start) {
      open_.emplace_back();
    } else if (event == Json::parse_event_t::object_end) {
      open_.pop_back();
    } else if (event == Json::parse_event_t::key &&
               !open_.back().insert(value.get<std::string>()).second) {
      throw DocumentError("the key " + in_quotes(value.get<std::string>()) + " is there twice");
    }
    return true;
  }

 private:
  std::vector<std::set<std::string>> open_;
};

}  // namespace

Json parsed(std::string_view text) {
  try {
    LikeKeys like_keys;
    return Json::parse(text.begin(), text.end(), std::ref(like_keys));
  } catch (Json::exception const &error) {
    std::string_view const what = error.what();
    // Without the library's own number of the error in front.
    auto const message = what.substr(what.find("] ") + 2);
    throw DocumentError("no JSON: " + std::string(message));
  }
}

void Node::fail(std::string const &why) const {
  throw DocumentError((path_.empty() ? "the document" : path_) + ": " + why);
}

Json word_to_json(std::int64_t number, std::span<Word const> words) {
  auto const found = std::find_if(words.begin(), words.end(),
                                  [&](Word const &word) { return word.value == number; });
  return found == words.end() ? Json() : Json(found->text);
}

void Node::only(std::initializer_list<std::string_view> keys) const {
  only(std::span(keys.begin(), keys.size()));
}

void Node::only(std::span<std::string_view const> keys) const {
  for (auto const &member : members()) {
    if (std::find(keys.begin(), keys.end(), member.key) == keys.end()) {
      member.value.fail("unknown key");
    }
  }
}

Node Node::at(std::string_view key) const {
  auto node = find(key);
  if (!node) {
    fail(in_quotes(key) + " is missing");
  }
  return *std::move(node);
}

std::optional<Node> Node::find(std::string_view key) const {
  if (!value_->is_object()) {
    fail("must be an object");
  }
  auto const found = value_->find(std::string(key));
  if (found == value_->end()) {
    return std::nullopt;
  }
  return Node(*found, path_.empty() ? std::string(key) : path_ + "." + std::string(key));
}

std::vector<NamedNode> Node::members() const {
  if (!value_->is_object()) {
    fail("must be an object");
  }
  std::vector<NamedNode> all;
  for (auto const &[key, value] : value_->items()) {
    all.push_back({.key = key, .value = at(key)});
  }
  return all;
}

std::vector<Node> Node::items() const {
  if (!value_->is_array()) {
    fail("must be an array");
  }
  std::vector<Node> all;
  for (std::size_t index = 0; index < value_->size(); ++index) {
    all.emplace_back((*value_)[index], fmt::format("{}[{}]", path_, index));
  }
  return all;
}

std::int64_t Node::choice(std::span<Word const> words) const {
  auto const given = text();
  std::string known;
  for (auto const &word : words) {
    if (word.text == given) {
      return word.value;
    }
    known += known.empty() ? "" : ", ";
    known += word.text;
  }
  fail("'" + given + "' is none of " + known);
}

bool Node::flag() const {
  if (!value_->is_boolean()) {
    fail("must be true or false");
  }
  return value_->get<bool>();
}

std::string Node::text() const {
  if (!value_->is_string()) {
    fail("must be a text");
  }
  auto text = value_->get<std::string>();
  if (text.find('\0') != std::string::npos) {
    fail("must not contain NUL");
  }
  return text;
}

std::int64_t Node::integer(std::int64_t least, std::int64_t greatest) const {
  if (!value_->is_number_integer()) {
    fail("must be a whole number");
  }
  if (value_->is_number_unsigned() &&
      value_->get<std::uint64_t>() > static_cast<std::uint64_t>(INT64_MAX)) {
    fail(fmt::format("{} is above {}", value_->get<std::uint64_t>(), greatest));
  }
  auto const number = value_->get<std::int64_t>();
  if (number < least) {
    fail(fmt::format("{} is below {}", number, least));
  }
  if (number > greatest) {
    fail(fmt::format("{} is above {}", number, greatest));
  }
  return number;
}

std::uint64_t Node::counter() const {
  if (!value_->is_number_unsigned()) {
    fail("must be a whole number, 0 or more");
  }
  return value_->get<std::uint64_t>();
}

std::int64_t Node::milliseconds() const {
  constexpr double kMost = 1e12;
  if (!value_->is_number()) {
    fail("must be a number of seconds");
  }
  auto const seconds = value_->get<double>();
  if (!(seconds >= 0)) {
    fail("must not be negative");
  }
  if (seconds > kMost) {
    fail(fmt::format("is above {:.0f} seconds", kMost));
  }
  return std::llround(seconds * 1000);
}

}  // namespace simhost::scenario
