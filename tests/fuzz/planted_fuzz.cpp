// Faults that the fuzzers must find, each after a word that no seed holds.

#include <cstdlib>
#include <cstring>
#include <limits>
#include <string_view>

#include "tests/fuzz/harness.h"

namespace {

void write_past_a_block(std::size_t offset) {
  Block const block(16);
  block.chars()[offset] = 1;
}

void overflow_an_integer(int addend) {
  int volatile sum = std::numeric_limits<int>::max() + addend;
  (void)sum;
}

void leak_a_block() {
  auto *volatile lost = static_cast<char *>(std::malloc(20));
  std::memset(lost, 1, 20);
  lost = nullptr;
}  // NOLINT(clang-analyzer-unix.Malloc): it is what the fault is

void hang() {
  bool volatile forever = true;
  while (forever) {
  }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(std::uint8_t const *data, std::size_t size) {
  std::string_view const word(reinterpret_cast<char const *>(data), size);
  char const *const chosen = std::getenv("PLANTED");
  std::string_view const fault = chosen != nullptr ? chosen : "";
  if (!word.starts_with("dvs")) {
    return 0;
  }
  if (fault == "past the end") {
    write_past_a_block(15 + size);
  } else if (fault == "overflow") {
    overflow_an_integer(static_cast<int>(size));
  } else if (fault == "leak") {
    leak_a_block();
  } else if (fault == "hang") {
    hang();
  } else if (fault == "untrue") {
    require(size < 3, "a word has less than three bytes");
  }
  return 0;
}
