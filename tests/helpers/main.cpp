// Starts the interpreter once for all tests of this program.

#include <Python.h>
#include <gtest/gtest.h>

int main(int argc, char **argv) {
  testing::InitGoogleTest(&argc, argv);
  Py_InitializeEx(0);
  int const result = RUN_ALL_TESTS();
  return Py_FinalizeEx() < 0 ? 1 : result;
}
