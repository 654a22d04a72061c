// Values of a trace: whatever stands there is refused in words or becomes memory, and memory that
// is written down and read again is the same.
//
// An input is JSON that names a record or a call, so that what it found can be read.

#include <algorithm>
#include <string>
#include <string_view>

#include "recordings/core/decoded.h"
#include "recordings/core/values.h"
#include "tests/fuzz/harness.h"

namespace {

using recordings::Json;

template <typename Named>
auto const *named(Named const &all, Json const &name) {
  auto const found = std::ranges::find_if(all, [&](auto const &one) {
    return name.is_string() && one.name == name.get_ref<std::string const &>();
  });
  return found == all.end() ? nullptr : &*found;
}

std::string encoded(recordings::Record const &record, recordings::Bytes const &bytes,
                    std::int64_t form) {
  recordings::Line line;
  recordings::write_record(line, record, reinterpret_cast<std::uint64_t>(bytes.data()), form);
  return std::string(line.text());
}

void record(recordings::Record const &record, Json const &input) {
  auto const form = input.value("form", Json(recordings::no_form));
  auto const number = form.is_number_integer() ? form.get<std::int64_t>() : recordings::no_form;
  auto const bytes = recordings::decode_record(record, input.value("value", Json()), number);
  require(bytes.size() >= record.size, "a record is there as a whole");
  auto const written = encoded(record, bytes, number);
  auto const again = recordings::decode_record(record, Json::parse(written), number);
  require(encoded(record, again, number) == written, "what is written is read as it was");
}

void call(recordings::Call const &call, Json const &input) {
  auto const in = input.value("in", Json());
  auto const out = input.find("out");
  auto const given = recordings::decode_inputs(call, in);
  require(given.size() == call.arguments.size(), "each argument is there");
  if (out != input.end()) {
    recordings::decode_outputs(call, in, *out, input.value("result", Json()));
  }
  recordings::decode_result(call, input.value("result", Json()));
}

void decode(Json const &input) {
  if (!input.is_object()) {
    return;
  }
  static auto const all = [] {
    std::vector<recordings::Record> found;
    for (auto const *one : recordings::records) {
      found.push_back(*one);
    }
    return found;
  }();
  if (auto const *known = named(all, input.value("record", Json()))) {
    record(*known, input);
  }
  if (auto const *known = named(recordings::calls, input.value("call", Json()))) {
    call(*known, input);
  }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(std::uint8_t const *data, std::size_t size) {
  auto const input = Json::parse(data, data + size, nullptr, false);
  try {
    decode(input);
  } catch (recordings::Misfit const &misfit) {
    require(std::string_view(misfit.what()).size() > 2, "what is wrong is said");
  }
  return 0;
}
