#include "planes/openvswitch/ovsdb/json.h"

#include <algorithm>
#include <map>
#include <set>

namespace simhost::ovsdb {
namespace {

constexpr unsigned kDeepest = 64;
constexpr std::size_t kLongest = std::size_t{64} << 20U;

bool is_space(char character) {
  return character == ' ' || character == '\n' || character == '\r' || character == '\t';
}

bool is_pair_of(Json const &value, char const *name) {
  return value.is_array() && value.size() == 2 && value[0] == name;
}

Json const &atom(Json const &value) {
  bool const is_row = is_pair_of(value, "uuid") || is_pair_of(value, "named-uuid");
  if (!value.is_primitive() && !(is_row && value[1].is_string())) {
    throw Malformed("a value of the database is no atom");
  }
  return value;
}

}  // namespace

void Splitter::append(std::span<std::uint8_t const> bytes) {
  text_.erase(0, begin_);
  seen_ -= begin_;
  begin_ = 0;
  text_.append(bytes.begin(), bytes.end());
}

std::optional<std::size_t> Splitter::find_end() {
  for (; seen_ < text_.size(); ++seen_) {
    auto const character = text_[seen_];
    if (in_string_) {
      bool const ends = character == '"' && !is_escaped_;
      is_escaped_ = character == '\\' && !is_escaped_;
      in_string_ = !ends;
    } else if (character == '"') {
      in_string_ = true;
    } else if (character == '{' || character == '[') {
      if (++depth_ > kDeepest) {
        throw Malformed("what the database sends is nested too deeply");
      }
    } else if (character == '}' || character == ']') {
      // That it is the right one is the parser's matter.
      if (--depth_ == 0) {
        return ++seen_;
      }
    }
  }
  return std::nullopt;
}

std::optional<Json> Splitter::next() {
  if (depth_ == 0) {
    while (begin_ < text_.size() && is_space(text_[begin_])) {
      ++begin_;
    }
    seen_ = std::max(seen_, begin_);
    if (begin_ < text_.size() && text_[begin_] != '{') {
      throw Malformed("what the database sends is no object of JSON");
    }
  }
  auto const end = find_end();
  if (text_.size() - begin_ > kLongest && (!end || *end - begin_ > kLongest)) {
    throw Malformed("what the database sends is too long");
  }
  if (!end) {
    return std::nullopt;
  }
  auto const begin = text_.begin() + static_cast<std::ptrdiff_t>(begin_);
  auto message = Json::parse(begin, text_.begin() + static_cast<std::ptrdiff_t>(*end), nullptr,
                             /*allow_exceptions=*/false);
  if (!message.is_object()) {
    throw Malformed("what the database sends is no object of JSON");
  }
  begin_ = *end;
  return message;
}

Json uuid(std::string const &text) {
  return Json::array({"uuid", text});
}

Json named_uuid(std::string const &name) {
  return Json::array({"named-uuid", name});
}

Json set(std::vector<Json> const &atoms) {
  return Json::array({"set", Json(atoms)});
}

Json map(std::vector<std::pair<Json, Json>> const &entries) {
  auto pairs = Json::array();
  for (auto const &[key, value] : entries) {
    pairs.push_back(Json::array({key, value}));
  }
  return Json::array({"map", std::move(pairs)});
}

std::vector<Json> atoms_of(Json const &value) {
  if (!is_pair_of(value, "set")) {
    return {atom(value)};
  }
  if (!value[1].is_array()) {
    throw Malformed("a set of the database has no list");
  }
  std::set<Json> atoms;
  for (auto const &one : value[1]) {
    atoms.insert(atom(one));
  }
  return {atoms.begin(), atoms.end()};
}

std::vector<std::pair<Json, Json>> entries_of(Json const &value) {
  if (!is_pair_of(value, "map") || !value[1].is_array()) {
    throw Malformed("a value of the database is no map");
  }
  std::map<Json, Json> entries;
  for (auto const &one : value[1]) {
    if (!one.is_array() || one.size() != 2) {
      throw Malformed("an entry of a map of the database is no pair");
    }
    entries[atom(one[0])] = atom(one[1]);
  }
  return {entries.begin(), entries.end()};
}

}  // namespace simhost::ovsdb
