// Makes calls of a trace on the host of this process, for Python: with inputs as a trace has them,
// and of each call its end as the recorder writes it.

#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

#include "recordings/core/api.h"
#include "recordings/core/decoded.h"
#include "recordings/core/line.h"
#include "recordings/core/shapes.h"
#include "recordings/core/trap.h"
#include "recordings/core/values.h"
#include "recordings/replayer/host.h"
#include "recordings/replayer/stand_ins.h"

namespace recordings {
namespace {

/// A text for Python, which stays until the next one.
char const *returned(std::string_view text) {
  static std::string kept;
  kept = text;
  return kept.c_str();
}

/// How many bytes a call may write where an output is to be.
std::size_t room_of(Argument const &argument) {
  switch (argument.passing) {
    case Passing::out_number:
    case Passing::out_text:
      return argument.width;
    case Passing::out_record:
      return argument.record->size;
    default:
      return sizeof(void *);
  }
}

bool is_address(Argument const &argument) {
  return argument.passing == Passing::handle || argument.passing == Passing::released ||
         argument.passing == Passing::function;
}

/// What a call is given, and the memory that it lies in.
class Given {
 public:
  Given(Call const &call, Json const &inputs) : values_(decode_inputs(call, inputs)) {
    for (std::size_t at = 0; at < values_.size(); ++at) {
      words_.push_back(word(call.arguments[at], values_[at]));
    }
  }

  [[nodiscard]] Words words() const { return words_.data(); }

 private:
  static std::uint64_t word(Argument const &argument, Decoded &value) {
    if (value.is_null || argument.passing == Passing::number || is_address(argument)) {
      return value.is_null ? 0 : value.word;
    }
    if (is_output(argument)) {
      value.bytes.resize(room_of(argument));
    }
    // Something is there, even if it is nothing.
    value.bytes.reserve(1);
    return reinterpret_cast<std::uint64_t>(value.bytes.data());
  }

  std::vector<Decoded> values_;
  std::vector<std::uint64_t> words_;
};

void write_end(Line &line, Call const &call, Words words, Ended const &ended) {
  line.raw("{");
  if (ended.trap != 0) {
    write_trap(line, ended.trap_type, ended.trap_text, ended.trap);
  } else {
    write_result(line, call, ended.result);
    // What a call that is refused leaves has no meaning.
    if (has_outputs(call) && (call.result != Result::status || ended.result == 0)) {
      write_outputs(line, call, words, ended.result);
    }
  }
  line.raw("}");
}

std::string refusal(std::string_view why) {
  return Json{{"refused", why}}.dump(-1, ' ', true, Json::error_handler_t::replace);
}

std::string made(std::size_t number, char const *inputs, Visitor visitor) {
  try {
    Call const &call = calls[number];
    if (!has_function(number)) {
      return refusal("the host lacks it");
    }
    Given const given(call, Json::parse(inputs));
    Visiting const visiting(visitor);
    auto const ended = make_call(number, given.words());
    Line line;
    write_end(line, call, given.words(), ended);
    return line.is_whole() ? std::string(line.text()) : refusal("no memory to tell of it");
  } catch (std::exception const &error) {
    return refusal(error.what());
  }
}

}  // namespace
}  // namespace recordings

extern "C" {

/// Finds the host's functions as the module has them; null, or what is lacking.
RECORDINGS_API char const *replayer_open(char const *module) {
  auto const lacking = recordings::find_host(module);
  return lacking.empty() ? nullptr : recordings::returned(lacking);
}

/// Why a call cannot be given these inputs, or null.
RECORDINGS_API char const *replayer_check(std::size_t number, char const *inputs) {
  try {
    recordings::decode_inputs(recordings::calls[number], recordings::Json::parse(inputs));
    return nullptr;
  } catch (std::exception const &error) {
    return recordings::returned(error.what());
  }
}

/// Makes a call; addresses in its inputs are those of this process. How it ended, or "refused".
RECORDINGS_API char const *replayer_make(std::size_t number, char const *inputs,
                                         recordings::Visitor visitor) {
  return recordings::returned(recordings::made(number, inputs, visitor));
}
}
