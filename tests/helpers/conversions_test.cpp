// Which Python objects each C type accepts, at each bound and one past it.

#include "helpers/conversions.h"

#include <gtest/gtest.h>

#include <cstdlib>
#include <string>
#include <vector>

#include "tests/helpers/python_objects.h"

namespace {

/// A reading of `Value` as the generated wrappers call it.
template <typename Value>
using Reading = int (*)(PyObject *, Value *);

struct Case {
  char const *expression;
  int result;
  unsigned long long bits;  // the value, converted to the widest unsigned type; if converted
};

template <typename Value>
void expect_readings(Reading<Value> reading, std::vector<Case> const &cases) {
  constexpr Value kUntouched = 77;
  for (Case const &c : cases) {
    SCOPED_TRACE(c.expression);
    Object const object = python(c.expression);
    Value value = kUntouched;
    EXPECT_EQ(c.result, reading(object.get(), &value));
    if (c.result == kConverted) {
      EXPECT_EQ(static_cast<Value>(c.bits), value);
    } else {
      EXPECT_EQ(kUntouched, value) << "a failure must leave the target alone";
    }
    EXPECT_EQ(c.result, reading(object.get(), nullptr)) << "a test without a target must agree";
    EXPECT_EQ("", take_error_type());
  }
}

std::vector<Case> const kNoIntegers = {
    {"1.0", kWrongType, 0},  {"'1'", kWrongType, 0},
    {"b'1'", kWrongType, 0}, {"None", kWrongType, 0},
    {"[]", kWrongType, 0},   {"type('I', (), {'__index__': lambda s: 1})()", kWrongType, 0},
};

std::vector<Case> with_no_integers(std::vector<Case> cases) {
  cases.insert(cases.end(), kNoIntegers.begin(), kNoIntegers.end());
  return cases;
}

TEST(Int, TakesSigned32Bits) {
  expect_readings<int>(int_from_object,
                       with_no_integers({{"0", kConverted, 0},
                                         {"True", kConverted, 1},
                                         {"type('I', (int,), {})(5)", kConverted, 5},
                                         {"2**31 - 1", kConverted, 0x7fffffff},
                                         {"-2**31", kConverted, 0x80000000},
                                         {"2**31", kOutOfRange, 0},
                                         {"-2**31 - 1", kOutOfRange, 0},
                                         {"2**63 - 1", kOutOfRange, 0},
                                         {"-2**63", kOutOfRange, 0}}));
}

TEST(Int, BeyondSigned64BitsIsMinusOneWithTheErrorPending) {
  for (char const *expression : {"2**63", "-2**63 - 1", "10**100"}) {
    SCOPED_TRACE(expression);
    int value = 77;
    EXPECT_EQ(kConverted, int_from_object(python(expression).get(), &value));
    EXPECT_EQ(-1, value);
    EXPECT_EQ("OverflowError", take_error_type());
  }
}

TEST(UnsignedInt, TakesUnsigned32Bits) {
  expect_readings<unsigned int>(unsigned_int_from_object,
                                with_no_integers({{"0", kConverted, 0},
                                                  {"True", kConverted, 1},
                                                  {"2**32 - 1", kConverted, 0xffffffff},
                                                  {"2**32", kOutOfRange, 0},
                                                  {"2**64 - 1", kOutOfRange, 0},
                                                  {"2**64", kWrongType, 0},
                                                  {"-1", kOutOfRange, 0},
                                                  {"-2**63", kOutOfRange, 0},
                                                  {"-2**63 - 1", kWrongType, 0}}));
}

TEST(UnsignedShort, TakesUnsigned16Bits) {
  expect_readings<unsigned short>(unsigned_short_from_object,
                                  with_no_integers({{"65535", kConverted, 65535},
                                                    {"65536", kOutOfRange, 0},
                                                    {"-1", kOutOfRange, 0},
                                                    {"2**64", kWrongType, 0}}));
}

TEST(UnsignedChar, TakesUnsigned8Bits) {
  expect_readings<unsigned char>(unsigned_char_from_object,
                                 with_no_integers({{"255", kConverted, 255},
                                                   {"256", kOutOfRange, 0},
                                                   {"-1", kOutOfRange, 0},
                                                   {"2**64", kWrongType, 0}}));
}

TEST(UnsignedLong, TakesUnsigned64Bits) {
  expect_readings<unsigned long>(unsigned_long_from_object,
                                 with_no_integers({{"2**63", kConverted, 1ULL << 63},
                                                   {"2**64 - 1", kConverted, ~0ULL},
                                                   {"2**64", kWrongType, 0},
                                                   {"-1", kOutOfRange, 0},
                                                   {"-2**63", kOutOfRange, 0},
                                                   {"-2**63 - 1", kWrongType, 0}}));
}

TEST(UnsignedLongLong, CallsEveryFailureAWrongType) {
  expect_readings<unsigned long long>(unsigned_long_long_from_object,
                                      with_no_integers({{"2**63 - 1", kConverted, ~0ULL >> 1},
                                                        {"2**64 - 1", kConverted, ~0ULL},
                                                        {"2**64", kWrongType, 0},
                                                        {"-1", kWrongType, 0}}));
}

TEST(Unsigned, KeepsAnErrorThatAnEarlierArgumentLeftPending) {
  for (char const *expression : {"5", "2**64 - 1"}) {
    SCOPED_TRACE(expression);
    Object const object = python(expression);
    PyErr_SetString(PyExc_OverflowError, "from before");
    unsigned long value = 0;
    EXPECT_EQ(kConverted, unsigned_long_from_object(object.get(), &value));
    EXPECT_EQ("OverflowError", take_error_type());
  }
}

TEST(Char, TakesOneByteOfTextOrAnInteger) {
  expect_readings<char>(char_from_object, {{"''", kConverted, 0},
                                           {"'a'", kConverted, 'a'},
                                           {"'\\0'", kConverted, 0},
                                           {"'\\x7f'", kConverted, 0x7f},
                                           {"'\\x80'", kWrongType, 0},
                                           {"'ab'", kWrongType, 0},
                                           {"'\\ud800'", kWrongType, 0},
                                           {"127", kConverted, 127},
                                           {"-128", kConverted, 0x80},
                                           {"128", kOutOfRange, 0},
                                           {"-129", kOutOfRange, 0},
                                           {"2**200", kOutOfRange, 0},
                                           {"True", kConverted, 1},
                                           {"None", kWrongType, 0},
                                           {"b'a'", kWrongType, 0},
                                           {"1.0", kWrongType, 0}});
}

TEST(Text, IsACopyThatCountsItsNul) {
  char *text = nullptr;
  size_t size = 0;
  Object const object = python("'gr\\u00fc\\u00df'");
  ASSERT_EQ(kConverted, text_from_str(object.get(), &text, &size));
  EXPECT_EQ(std::string("gr\xc3\xbc\xc3\x9f"), text);
  EXPECT_EQ(7U, size);
  std::free(text);
}

TEST(Text, KeepsWhatFollowsAnEmbeddedNul) {
  char *text = nullptr;
  size_t size = 0;
  ASSERT_EQ(kConverted, text_from_str(python("'a\\0b'").get(), &text, &size));
  EXPECT_EQ(std::string({'a', '\0', 'b', '\0'}), std::string(text, size));
  std::free(text);
}

TEST(Text, RefusesWhatUtf8CannotEncode) {
  char *text = nullptr;
  size_t size = 77;
  EXPECT_EQ(kWrongType, text_from_str(python("'\\udc80'").get(), &text, &size));
  EXPECT_EQ(nullptr, text);
  EXPECT_EQ(77U, size);
  EXPECT_EQ("", take_error_type());
}

/// Stores the text of a Python expression into an array as a writer does; the failure otherwise.
int store(std::string const &expression, std::vector<char> &array) {
  Object const object = python(expression);
  ArrayText text = {};
  int const kind = array_text_from_str(object.get(), array.size(), &text);
  if (kind == kConverted) {
    store_array_text(array.data(), array.size(), text);
  }
  return kind;
}

std::string held(std::vector<char> const &array) {
  return {array.begin(), array.end()};
}

TEST(ArrayTextOfStr, TakesOneByteLessThanTheCapacity) {
  std::vector<char> array(5, 'x');
  EXPECT_EQ(kConverted, store("'abcd'", array));
  EXPECT_EQ(std::string({'a', 'b', 'c', 'd', '\0'}), held(array));
  EXPECT_EQ(kWrongType, store("'abcde'", array));
  EXPECT_EQ(kWrongType, store("'abc\\u00e9'", array));
  EXPECT_EQ(kWrongType, store("'\\ud800'", array));
  EXPECT_EQ(std::string({'a', 'b', 'c', 'd', '\0'}), held(array)) << "refused: must be unchanged";
}

TEST(ArrayTextOfStr, IsFollowedByZeros) {
  std::vector<char> array(5, 'x');
  EXPECT_EQ(kConverted, store("'ab'", array));
  EXPECT_EQ(std::string({'a', 'b', '\0', '\0', '\0'}), held(array));
}

TEST(ArrayTextOfStr, NeedsNoNulInAnArrayOfOneChar) {
  std::vector<char> array(1, 'x');
  EXPECT_EQ(kConverted, store("'a'", array));
  EXPECT_EQ("a", held(array));
  EXPECT_EQ(kConverted, store("''", array));
  EXPECT_EQ(std::string({'\0'}), held(array));
  EXPECT_EQ(kWrongType, store("'ab'", array));
}

TEST(ArrayTextOfChars, CountsItsNul) {
  ArrayText text = {};
  EXPECT_EQ(kConverted, array_text_from_chars("abcd", 5, &text));
  EXPECT_EQ(5U, text.size);
  EXPECT_EQ(kWrongType, array_text_from_chars("abcde", 5, &text));
}

TEST(ArrayTextOfChars, IsAllZerosWhereThereIsNoText) {
  std::vector<char> array(3, 'x');
  ArrayText text = {"y", 1};
  EXPECT_EQ(kConverted, array_text_from_chars(nullptr, array.size(), &text));
  store_array_text(array.data(), array.size(), text);
  EXPECT_EQ(std::string({'\0', '\0', '\0'}), held(array));
}

TEST(ArrayTextOfChars, MayComeFromTheArrayItself) {
  std::vector<char> array = {'a', 'b', 'c', '\0', 'x'};
  ArrayText text = {};
  EXPECT_EQ(kConverted, array_text_from_chars(array.data() + 1, array.size(), &text));
  store_array_text(array.data(), array.size(), text);
  EXPECT_EQ(std::string({'b', 'c', '\0', '\0', '\0'}), held(array));
}

TEST(Strnlen, StopsAtTheFirstNulAndAtTheMaximum) {
  EXPECT_EQ(2U, SWIG_strnlen("abc", 2));
  EXPECT_EQ(3U, SWIG_strnlen("abc", 10));
  EXPECT_EQ(0U, SWIG_strnlen("", 10));
}

TEST(Strnlen, ReadsNoMoreThanTheMaximum) {
  EXPECT_EQ(0U, SWIG_strnlen(nullptr, 0));
  std::vector<char> const unterminated(4, 'x');
  EXPECT_EQ(4U, SWIG_strnlen(unterminated.data(), 4));
}

}  // namespace
