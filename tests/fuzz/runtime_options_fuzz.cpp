// Runtime options lists: built and walked by the module's methods, read and written by the host.
//
// Not tried, because nothing checks it: the name of a type that has none, an option of length 0, a
// position that is not in the list, a length that goes past the memory of the list.

#include <string>
#include <variant>
#include <vector>

#include "helpers/runtime_options.h"
#include "model/options/runtime_options.h"
#include "tests/fuzz/host.h"
#include "tests/fuzz/python.h"

namespace {

struct Option {
  int type;
  std::variant<std::uint32_t, std::string> value;
};

constexpr std::size_t kLongestText = VS_CHARDEV_MAX_RUNTIME_STRING_OPTION_LENGTH - 1;

Option consume_option(Input &input) {
  auto const type = input.ConsumeIntegralInRange<int>(0, VS_NUM_RT_OPT - 1);
  if (type > VS_RT_OPT_ALLOW_MIRROR_STATS) {
    return {type, consume_text(input, kLongestText + 2)};
  }
  return {type, input.ConsumeIntegral<std::uint32_t>()};
}

std::size_t size_of(Option const &option) {
  auto const *const text = std::get_if<std::string>(&option.value);
  return sizeof(VSRuntimeOptionHeader) + (text != nullptr ? text->size() + 1 : 4);
}

bool is_short(Option const &option) {
  auto const *const text = std::get_if<std::string>(&option.value);
  return text == nullptr || text->size() <= kLongestText;
}

VSRuntimeOptionHeader *add(VSRuntimeOptions *list, VSRuntimeOptionHeader *at,
                           Option const &option) {
  if (auto const *const text = std::get_if<std::string>(&option.value)) {
    return runtime_options_add_text(list, at, "", option.type, text->c_str());
  }
  return runtime_options_add_int(list, at, "", option.type,
                                 static_cast<int>(std::get<std::uint32_t>(option.value)));
}

Option read(VSRuntimeOptionHeader *at) {
  Object const value(runtime_option_value(at));
  require(value != nullptr, "an option has a value");
  if (PyBytes_Check(value.get())) {
    return {at->type, std::string(PyBytes_AsString(value.get()))};
  }
  return {at->type, static_cast<std::uint32_t>(PyLong_AsUnsignedLong(value.get()))};
}

/// Walks a list as callers do.
std::vector<Option> walked(VSRuntimeOptions *list) {
  std::vector<Option> found;
  auto *at = list->totalLength > sizeof *list ? runtime_options_first(list) : nullptr;
  for (; at != nullptr; at = runtime_options_next(list, at)) {
    found.push_back(read(at));
    std::string name = runtime_option_name(at);
    require(get_runtime_option_type_from_name(name.data()) == at->type, "names lead to types");
  }
  return found;
}

void require_same(std::vector<Option> const &one, std::vector<Option> const &other) {
  require(one.size() == other.size(), "a walk finds as many options as were added");
  for (std::size_t index = 0; index < one.size(); ++index) {
    require(one[index].type == other[index].type && one[index].value == other[index].value,
            "a walk finds the options that were added");
  }
}

/// What the host is given or allocates: a list in memory of its own size.
void offer(VSRuntimeOptions const &list) {
  simhost::storage::ChangingTransaction transaction(shared_host());
  is_accepted([&] { simhost::set_runtime_options(transaction, list); });
  std::vector<std::uint16_t> types(VS_NUM_RT_OPT);
  for (std::size_t type = 0; type < types.size(); ++type) {
    types[type] = static_cast<std::uint16_t>(type);
  }
  auto const answer = Block::of(simhost::packed_runtime_options(transaction, types));
  require(walked(answer.as<VSRuntimeOptions>()).size() == VS_NUM_RT_OPT,
          "a walk finds all options of the host");
}

void build_and_walk(Input &input) {
  auto const capacity = input.ConsumeIntegralInRange<std::size_t>(0, 700);
  Made<VSRuntimeOptions> const list(runtime_options_new(static_cast<int>(capacity)));
  auto *at = runtime_options_first(list.get());
  std::vector<Option> added;
  std::size_t used = sizeof(VSRuntimeOptions);
  while (input.remaining_bytes() > 0) {
    auto const option = consume_option(input);
    auto *const next = add(list.get(), at, option);
    bool const fits = is_short(option) && used + size_of(option) < capacity;
    require((next != nullptr) == fits, "an option is added if it ends before the last byte");
    if (fits) {
      added.push_back(option);
      used += size_of(option);
      at = next;
    }
  }
  runtime_options_set_length(list.get(), static_cast<int>(used - sizeof(VSRuntimeOptions)));
  require_same(walked(list.get()), added);
  offer(*list);
}

/// Any bytes to the host, whose length is at most what they say it is.
void offer_any(Input &input) {
  auto const bytes = input.ConsumeRemainingBytes<std::uint8_t>();
  if (bytes.size() < sizeof(VSRuntimeOptions)) {
    return;
  }
  auto const block = Block::of(bytes);
  auto *const list = block.as<VSRuntimeOptions>();
  if (list->totalLength <= VS_CHARDEV_MAX_RUNTIME_OPTIONS_LENGTH) {
    list->totalLength = std::min<qex_uint32>(list->totalLength, bytes.size());
  }
  offer(*list);
}

void look_up(Input &input) {
  auto name = consume_text(input, 32);
  auto const type = get_runtime_option_type_from_name(name.data());
  require(0 <= type && type <= VS_NUM_RT_OPT, "a name leads to a type or to none");
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(std::uint8_t const *data, std::size_t size) {
  Input input(data, size);
  switch (input.ConsumeIntegralInRange(0, 2)) {
    case 0:
      build_and_walk(input);
      break;
    case 1:
      offer_any(input);
      break;
    default:
      look_up(input);
      break;
  }
  return 0;
}
