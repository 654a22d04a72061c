// The list of calls so far, and what to return next; see recorder.h.
#include "recorder.h"

#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <iterator>
#include <map>
#include <optional>
#include <string>
#include <thread>
#include <vector>

#include "vswitch/call_trap.h"

// The trap of the module that loaded the host; absent if it was loaded by anything else.
#pragma weak exception_buffer
#pragma weak exception_status
#pragma weak exceptionType
#pragma weak exceptionMsg

namespace recording {
namespace {

using Bytes = std::vector<unsigned char>;

struct Trap {
  _object *type;
  std::string message;
  int value;
  bool after_outputs;
};

/** What one call, or every call, of a function is told to do. */
struct Rule {
  std::optional<std::uint64_t> result;
  std::map<unsigned, Bytes> outputs;
  std::optional<Trap> trap;
  std::chrono::milliseconds delay{0};
};

struct Function {
  std::string_view result;
  std::vector<Parameter> parameters;
  unsigned calls = 0;
  std::map<unsigned, Rule> rules;
  std::map<unsigned, std::size_t> captures;
};

struct State {
  std::map<std::string_view, Function> functions;
  std::string calls; /**< the items of a JSON list */
  bool takes_notes = true;
  Trap sprung{}; /**< owns the message that exceptionMsg refers to */
};

// Not destroyed: the libraries may be called until the very end of the process.
State &state() {
  static auto *const the_state = new State;
  return *the_state;
}

std::string quoted(std::string_view text) {
  return '"' + std::string(text) + '"';
}

std::string hex(void const *memory, std::size_t size) {
  static constexpr char digits[] = "0123456789abcdef";
  std::string result;
  result.reserve(2 * size);
  auto const *bytes = static_cast<unsigned char const *>(memory);
  for (std::size_t i = 0; i < size; ++i) {
    result += digits[bytes[i] / 16];
    result += digits[bytes[i] % 16];
  }
  return quoted(result);
}

std::string integer(Parameter const &parameter, std::uint64_t bits) {
  // Only a full-width unsigned integer is not its own sign extension.
  bool const is_unsigned = parameter.type.find("unsigned") != std::string_view::npos;
  return is_unsigned ? std::to_string(bits) : std::to_string(static_cast<std::int64_t>(bits));
}

std::string described(Parameter const &parameter, std::uint64_t bits, std::size_t capture) {
  auto const *address = reinterpret_cast<char const *>(bits);
  std::string value = "null";
  std::string memory = "null";
  if (parameter.kind == Kind::integer) {
    value = integer(parameter, bits);
  } else if (address != nullptr) {
    value =
        parameter.kind == Kind::text ? hex(address, std::strlen(address)) : std::to_string(bits);
    if (capture != 0) {
      memory = hex(address, capture);
    }
  }
  return R"({"type":)" + quoted(parameter.type) + R"(,"address":)" + std::to_string(bits) +
         R"(,"value":)" + value + R"(,"memory":)" + memory + "}";
}

/** A defect of the recorder's own: a test that goes on would prove nothing. */
[[noreturn]] void abort_because(char const *reason) {
  std::fputs(reason, stderr);
  std::abort();
}

std::string described(std::string_view name, Function const &function,
                      std::span<Argument const> arguments) {
  std::string items;
  for (unsigned i = 0; i < arguments.size(); ++i) {
    Parameter const &parameter = function.parameters[i];
    auto const capture = function.captures.find(i + 1);
    items += (i == 0 ? "" : ",") +
             described(parameter, arguments[i].bits,
                       capture == function.captures.end() ? parameter.memory : capture->second);
  }
  return R"({"function":)" + quoted(name) + R"(,"exception_status":)" +
         std::to_string(recorder_exception_status()) + R"(,"arguments":[)" + items + "]}";
}

/** The rule of this very call where it says something, the rule of every call where it does not. */
Rule rule_for(Function const &function, unsigned nth) {
  auto const every = function.rules.find(0);
  auto const own = function.rules.find(nth);
  Rule rule = own == function.rules.end() ? Rule{} : own->second;
  if (every != function.rules.end()) {
    Rule const &general = every->second;
    if (!rule.result) {
      rule.result = general.result;
    }
    if (!rule.trap) {
      rule.trap = general.trap;
    }
    if (rule.delay.count() == 0) {
      rule.delay = general.delay;
    }
    rule.outputs.insert(general.outputs.begin(), general.outputs.end());
  }
  return rule;
}

Function *find(char const *name) {
  auto const found = state().functions.find(name);
  return found == state().functions.end() ? nullptr : &found->second;
}

/** Changes the rule of a call; `argument` 0 concerns the call as a whole. */
template <typename Change>
int with_rule(char const *name, unsigned nth, unsigned argument, Change change) {
  Function *function = find(name);
  if (function == nullptr || argument > function->parameters.size()) {
    return -1;
  }
  change(function->rules[nth]);
  return 0;
}

}  // namespace

void declare(std::string_view function, std::string_view result,
             std::span<Parameter const> parameters) noexcept {
  state().functions[function] = {result, {parameters.begin(), parameters.end()}, 0, {}, {}};
}

Answer record(std::string_view name, std::span<Argument const> arguments) noexcept {
  Function &function = state().functions.at(name);
  if (state().takes_notes) {
    std::string &calls = state().calls;
    calls += (calls.empty() ? "" : ",") + described(name, function, arguments);
  }

  Rule const rule = rule_for(function, ++function.calls);
  std::this_thread::sleep_for(rule.delay);
  if (!rule.trap || rule.trap->after_outputs) {
    for (auto const &[argument, bytes] : rule.outputs) {
      if (auto *target = reinterpret_cast<void *>(arguments[argument - 1].bits)) {
        std::memcpy(target, bytes.data(), bytes.size());
      }
    }
  }
  if (rule.trap) {
    state().sprung = *rule.trap;
  }
  return {rule.result.value_or(0), rule.trap.has_value()};
}

void spring() noexcept {
  if (recorder_has_trap() == 0) {
    abort_because("recording host: told to spring the trap of a module that did not load it\n");
  }
  exceptionType = state().sprung.type;
  exceptionMsg = state().sprung.message.data();
  longjmp(exception_buffer, state().sprung.value);
}

}  // namespace recording

using recording::state;
using recording::with_rule;

void recorder_reset() {
  state().calls.clear();
  state().takes_notes = true;
  for (auto &[name, function] : state().functions) {
    function.calls = 0;
    function.rules.clear();
    function.captures.clear();
  }
}

char const *recorder_functions() {
  static std::string text;
  text.clear();
  for (auto const &[name, function] : state().functions) {
    std::string types;
    for (auto const &parameter : function.parameters) {
      types += (types.empty() ? "" : ",") + recording::quoted(parameter.type);
    }
    text += (text.empty() ? "{" : ",") + recording::quoted(name) + R"(:{"result":)" +
            recording::quoted(function.result) + R"(,"parameters":[)" + types + "]}";
  }
  text += text.empty() ? "{}" : "}";
  return text.c_str();
}

char const *recorder_calls() {
  static std::string text;
  text = "[" + state().calls + "]";
  return text.c_str();
}

void recorder_take_no_notes() {
  state().takes_notes = false;
}

int recorder_answer(char const *function, unsigned nth, std::uint64_t bits) {
  return with_rule(function, nth, 0, [=](auto &rule) { rule.result = bits; });
}

int recorder_output(char const *function, unsigned nth, unsigned argument, void const *bytes,
                    std::size_t size) {
  auto const *first = static_cast<unsigned char const *>(bytes);
  return argument == 0 ? -1 : with_rule(function, nth, argument, [=](auto &rule) {
    rule.outputs[argument] = {first, first + size};
  });
}

int recorder_capture(char const *function, unsigned argument, std::size_t size) {
  auto *found = recording::find(function);
  if (found == nullptr || argument == 0 || argument > found->parameters.size()) {
    return -1;
  }
  found->captures[argument] = size;
  return 0;
}

int recorder_delay(char const *function, unsigned nth, unsigned milliseconds) {
  return with_rule(function, nth, 0,
                   [=](auto &rule) { rule.delay = std::chrono::milliseconds(milliseconds); });
}

int recorder_spring(char const *function, unsigned nth, void *type, char const *message, int value,
                    int after_outputs) {
  return with_rule(function, nth, 0, [=](auto &rule) {
    rule.trap = recording::Trap{static_cast<_object *>(type), message, value, after_outputs != 0};
  });
}

int recorder_has_trap() {
  return &exception_buffer != nullptr && &exception_status != nullptr &&
                 &exceptionType != nullptr && &exceptionMsg != nullptr
             ? 1
             : 0;
}

int recorder_exception_status() {
  return &exception_status == nullptr ? 0 : exception_status;
}

void recorder_set_exception_status(int value) {
  if (&exception_status != nullptr) {
    exception_status = value;
  }
}
