// Traces: any text is refused in words, or becomes calls whose places in it are right.

#include <string>
#include <string_view>

#include "recordings/player/script.h"
#include "tests/fuzz/harness.h"

namespace {

using recordings::Script;

void look(Script const &script, std::size_t size) {
  std::size_t calls = 0;
  for (std::size_t at = 0; at < script.events().size(); ++at) {
    auto const &event = script.events()[at];
    require(event.part < script.parts().size(), "an event is of a process");
    require(event.line > 1 && event.begin.size() + event.end.size() <= size, "it is in the text");
    require(!event.outer || *event.outer < at, "it is within what began before it");
    for (auto const inner : event.inner) {
      require(inner > at && script.events()[inner].outer == at, "what is within it says so");
    }
    calls += event.call == nullptr ? 0U : 1U;
  }
  require(calls == script.calls(), "calls are counted");
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(std::uint8_t const *data, std::size_t size) {
  try {
    Script const script(std::string(reinterpret_cast<char const *>(data), size));
    look(script, size);
    script.check_values();
  } catch (recordings::Unplayable const &unplayable) {
    require(std::string_view(unplayable.what()).starts_with("line "), "the line is said");
  }
  return 0;
}
