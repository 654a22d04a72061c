// Reports that wrappers make before they call anything.

#include "helpers/failures.h"

#include <gtest/gtest.h>

#include "tests/helpers/python_objects.h"
#include "tests/helpers/stock_runtime.h"

namespace {

/// Takes the pending error away, which must be of this type, and returns its text.
std::string take_error(PyObject *expected_type) {
  PyObject *type = nullptr;
  PyObject *value = nullptr;
  PyObject *traceback = nullptr;
  PyErr_Fetch(&type, &value, &traceback);
  PyErr_NormalizeException(&type, &value, &traceback);
  EXPECT_EQ(expected_type, type);
  Object const text(PyObject_Str(value));
  std::string result = PyUnicode_AsUTF8(text.get());
  Py_XDECREF(type);
  Py_XDECREF(value);
  Py_XDECREF(traceback);
  return result;
}

std::string report_of_count(char const *arguments, int expected) {
  report_argument_count(python(arguments).get(), "method", expected);
  return take_error(PyExc_TypeError);
}

TEST(ErrorKinds, HaveTheExceptionsOfTheWrapperRuntime) {
  for (int kind = -100; kind <= 100; ++kind) {
    EXPECT_EQ(stock_exception_of_kind(kind), exception_of_kind(kind)) << kind;
  }
}

TEST(Reports, AreMadeInTheModulesWords) {
  report_argument(-5, "VSDVS_SetMTU", 2, "qex_uint32");
  EXPECT_EQ("in method 'VSDVS_SetMTU', argument 2 of type 'qex_uint32'",
            take_error(PyExc_TypeError));
  report_null_argument("VSInfo_mtu_get", 1, "struct VSInfo *");
  EXPECT_EQ(
      "invalid null reference in method 'VSInfo_mtu_get', argument 1 of type 'struct VSInfo *'",
      take_error(PyExc_ValueError));
  report_null_variable("sha", "qex_uint8 [6]");
  EXPECT_EQ("invalid null reference in variable 'sha' of type 'qex_uint8 [6]'",
            take_error(PyExc_ValueError));
}

TEST(WrongArgumentCount, IsReportedInTheInterpretersWords) {
  EXPECT_EQ("method() takes exactly 1 argument (0 given)", report_of_count("()", 1));
  EXPECT_EQ("method() takes exactly 2 arguments (1 given)", report_of_count("(1,)", 2));
  EXPECT_EQ("method() takes exactly 2 arguments (3 given)", report_of_count("(1, 2, 3)", 2));
  EXPECT_EQ("method() takes exactly 8 arguments (7 given)", report_of_count("(1,) * 7", 8));
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
