// Values of a trace as they lie in memory: the way back from what values.h writes.
//
// A trace may come from anywhere. What does not fit the tables is refused, with its place in the
// line.
#pragma once

#include <cstdint>
#include <nlohmann/json.hpp>
#include <stdexcept>
#include <string_view>
#include <vector>

#include "recordings/core/shapes.h"

namespace recordings {

using Json = nlohmann::json;
using Bytes = std::vector<char>;

/// A value that is not what the tables say: where it stands, and what is wrong.
class Misfit : public std::runtime_error {
 public:
  using std::runtime_error::runtime_error;
};

/// A value of which the recorder wrote why it could not follow it.
class Unread : public Misfit {
 public:
  using Misfit::Misfit;
};

/// null if the object has none of this name.
Json member_of(Json const &object, std::string_view name);

/// What one argument gives or leaves.
struct Decoded {
  bool is_null = false;    ///< a pointer that leads nowhere; of an output, that it has no place
  std::uint64_t word = 0;  ///< a number; of a pointer that is known by its number, that
  Bytes bytes;             ///< what is to lie where the pointer leads, all of it
};

/// What a caller gives: an element for each argument, of outputs only whether they have a place.
std::vector<Decoded> decode_inputs(Call const &call, Json const &in);

/// What a call left: an element for each argument, of inputs nothing.
std::vector<Decoded> decode_outputs(Call const &call, Json const &in, Json const &out,
                                    Json const &result);

/// What a call returned that has no status.
Decoded decode_result(Call const &call, Json const &result);

/// A record with what follows it in the same block; `form` is that of its addresses, or no_form.
Bytes decode_record(Record const &record, Json const &given, std::int64_t form);

}  // namespace recordings
