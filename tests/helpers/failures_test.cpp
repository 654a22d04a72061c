// Reports that wrappers make before they call anything.

#include "helpers/failures.h"

#include <gtest/gtest.h>

#include "tests/helpers/python_objects.h"

namespace {

std::string report(char const *arguments, int expected) {
  EXPECT_EQ(0, wrong_argument_count(python(arguments).get(), "method", expected));
  PyObject *type = nullptr;
  PyObject *value = nullptr;
  PyObject *traceback = nullptr;
  PyErr_Fetch(&type, &value, &traceback);
  PyErr_NormalizeException(&type, &value, &traceback);
  EXPECT_EQ(PyExc_TypeError, type);
  Object const text(PyObject_Str(value));
  std::string result = PyUnicode_AsUTF8(text.get());
  Py_XDECREF(type);
  Py_XDECREF(value);
  Py_XDECREF(traceback);
  return result;
}

TEST(WrongArgumentCount, IsReportedInTheInterpretersWords) {
  EXPECT_EQ("method() takes exactly 1 argument (0 given)", report("()", 1));
  EXPECT_EQ("method() takes exactly 2 arguments (1 given)", report("(1,)", 2));
  EXPECT_EQ("method() takes exactly 2 arguments (3 given)", report("(1, 2, 3)", 2));
  EXPECT_EQ("method() takes exactly 8 arguments (7 given)", report("(1,) * 7", 8));
}

TEST(NullRecord, IsForWritersDestructorsAndThePrintedFormOfNames) {
  EXPECT_TRUE(accepts_null_record("VSInfo_mtu_set"));
  EXPECT_TRUE(accepts_null_record("delete_VSInfo"));
  EXPECT_TRUE(accepts_null_record("qex_Name___repr__"));
  EXPECT_FALSE(accepts_null_record("VSInfo_mtu_get"));
  EXPECT_FALSE(accepts_null_record("VSUplinks___setitem__"));
  EXPECT_FALSE(accepts_null_record("VSRuntimeOptions_set_options_length"));
  EXPECT_FALSE(accepts_null_record("_set"));
}

}  // namespace
