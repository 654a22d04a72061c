// Starts the interpreter once for all tests of this program.
//
// With "lose-a-block" it loses one first, which LeakSanitizer must find here too, beside all that
// the interpreter keeps.

#include <Python.h>
#include <gtest/gtest.h>

#include <cstdlib>
#include <cstring>
#include <string_view>

namespace {

void lose_a_block() {
  auto *volatile lost = static_cast<char *>(std::malloc(20));
  std::memset(lost, 1, 20);
  lost = nullptr;
}  // NOLINT(clang-analyzer-unix.Malloc): it is what it is for

}  // namespace

int main(int argc, char **argv) {
  testing::InitGoogleTest(&argc, argv);
  Py_InitializeEx(0);
  if (argc > 1 && std::string_view(argv[1]) == "lose-a-block") {
    lose_a_block();
  }
  int const result = RUN_ALL_TESTS();
  return Py_FinalizeEx() < 0 ? 1 : result;
}
