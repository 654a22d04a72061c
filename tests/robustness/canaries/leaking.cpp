// A program with one fault for each sanitizer, to see that they end it.

#include <cstdlib>
#include <cstring>
#include <limits>
#include <string_view>

namespace {

void write_past_a_block() {
  auto *volatile block = static_cast<char volatile *>(std::malloc(20));
  int volatile const size = 20;
  block[size] = 1;
  std::free(const_cast<char *>(block));
}

int overflow_an_integer() {
  int volatile most = std::numeric_limits<int>::max();
  return most + 1;
}

void leak_a_block() {
  auto *volatile lost = static_cast<char *>(std::malloc(20));
  std::memset(lost, 1, 20);
  lost = nullptr;
}  // NOLINT(clang-analyzer-unix.Malloc): it is what the program is for

}  // namespace

int main(int count, char *arguments[]) {
  std::string_view const fault = count > 1 ? arguments[1] : "";
  if (fault == "past the end") {
    write_past_a_block();
  } else if (fault == "overflow") {
    return overflow_an_integer() == 0 ? 0 : 1;
  } else if (fault == "leak") {
    leak_a_block();
  }
  return 0;
}
