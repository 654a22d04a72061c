// JSON as OVSDB uses it (RFC 7047): texts that follow one another in a stream, and its notation for
// values.
#pragma once

#include <cstdint>
#include <nlohmann/json.hpp>
#include <optional>
#include <span>
#include <stdexcept>
#include <string>
#include <vector>

namespace simhost::ovsdb {

using Json = nlohmann::json;

/// What was received is no JSON, or not what the protocol has there.
class Malformed : public std::runtime_error {
 public:
  using runtime_error::runtime_error;
};

/// Finds the ends of the objects in a stream, which nothing else tells apart.
class Splitter {
 public:
  void append(std::span<std::uint8_t const> bytes);
  /// The next object that has come whole. Throws Malformed for other values, for what is no JSON,
  /// and for what is too deep or too long to be any message.
  std::optional<Json> next();

 private:
  std::optional<std::size_t> find_end();

  std::string text_;
  std::size_t begin_ = 0;  // of the object
  std::size_t seen_ = 0;   // how far its end was looked for
  unsigned depth_ = 0;
  bool in_string_ = false;
  bool is_escaped_ = false;
};

/// A row that exists.
Json uuid(std::string const &text);
/// A row that another operation of the same transaction inserts, with this "uuid-name".
Json named_uuid(std::string const &name);
Json set(std::vector<Json> const &atoms);
Json map(std::vector<std::pair<Json, Json>> const &entries);

/// The elements of a set, of which a single one may stand alone; in their order, each once. Throws
/// Malformed.
std::vector<Json> atoms_of(Json const &value);
/// Likewise of a map, in the order of their keys.
std::vector<std::pair<Json, Json>> entries_of(Json const &value);

}  // namespace simhost::ovsdb
