// Conversions between Python's integers and texts and C's, held to what 128 bits and bytes say.
//
// Not tried, because nothing checks it: C texts without an end where a whole text is read.

#include <arpa/inet.h>

#include <array>
#include <climits>
#include <limits>
#include <optional>
#include <string>

#include "helpers/addresses.h"
#include "helpers/conversions.h"
#include "helpers/fast_paths.h"
#include "helpers/names.h"
#include "helpers/slots.h"
#include "tests/fuzz/python.h"

namespace {

__extension__ using Wide = __int128;

constexpr Wide kLeastSigned = std::numeric_limits<long>::min();
constexpr Wide kMostSigned = std::numeric_limits<long>::max();
constexpr Wide kMostUnsigned = std::numeric_limits<unsigned long>::max();

/// What a conversion returns and stores; nothing is stored where it fails.
struct Reading {
  int outcome;
  std::optional<Wide> value;

  bool operator==(Reading const &) const = default;
};

template <typename Value>
Reading read(int (*convert)(PyObject *, Value *), PyObject *object) {
  Value value{};
  int const outcome = convert(object, &value);
  require(outcome == convert(object, nullptr) || outcome == kNoMemory, "a test is a conversion");
  PyErr_Clear();
  return {outcome, outcome == kConverted ? std::optional<Wide>(value) : std::nullopt};
}

/// What the error reports.
int reported_outcome() {
  return PyErr_ExceptionMatches(PyExc_OverflowError) != 0 ? kOutOfRange : kWrongType;
}

/// An argument of a method, which reports what it cannot read, and the conversion that does.
template <typename Value>
Reading read_both(bool (*argument)(PyObject *, Value *, char const *, int, char const *),
                  int (*convert)(PyObject *, Value *), PyObject *object) {
  Value value{};
  Reading reported{kConverted, std::nullopt};
  if (argument(object, &value, "method", 1, "type")) {
    reported.value = value;
  } else {
    reported.outcome = reported_outcome();
  }
  PyErr_Clear();
  require(reported == read(convert, object), "an argument is read as its conversion does");
  return reported;
}

Reading signed_reading(Wide number, Wide least, Wide most) {
  if (number < kLeastSigned || number > kMostSigned) {
    return {kConverted, -1};
  }
  return least <= number && number <= most ? Reading{kConverted, number}
                                           : Reading{kOutOfRange, std::nullopt};
}

Reading unsigned_reading(Wide number, Wide most) {
  if (number < kLeastSigned || number > kMostUnsigned) {
    return {kWrongType, std::nullopt};
  }
  return 0 <= number && number <= most ? Reading{kConverted, number}
                                       : Reading{kOutOfRange, std::nullopt};
}

Reading char_reading(Wide number) {
  return CHAR_MIN <= number && number <= CHAR_MAX ? Reading{kConverted, number}
                                                  : Reading{kOutOfRange, std::nullopt};
}

Reading without_range(Reading reading) {
  return reading.outcome == kOutOfRange ? Reading{kWrongType, std::nullopt} : reading;
}

Object integer(Wide number) {
  auto const low = static_cast<unsigned long long>(number);
  auto const high = static_cast<long long>(number >> 64);
  Object const upper(PyLong_FromLongLong(high));
  Object const lower(PyLong_FromUnsignedLongLong(low));
  Object const width(PyLong_FromLong(64));
  Object const shifted(PyNumber_Lshift(upper.get(), width.get()));
  return Object(PyNumber_Add(shifted.get(), lower.get()));
}

/// Near to a power of two, where ranges end, or any of 96 bits.
Wide consume_number(Input &input) {
  Wide const near = input.ConsumeIntegralInRange(-2, 2);
  if (input.ConsumeBool()) {
    Wide const power = Wide{1} << input.ConsumeIntegralInRange(0, 90);
    return (input.ConsumeBool() ? power : -power) + near;
  }
  return (Wide{input.ConsumeIntegral<std::int32_t>()} << 64) +
         input.ConsumeIntegral<std::uint64_t>();
}

void integers(Input &input) {
  auto const number = consume_number(input);
  auto const object = integer(number);
  auto *const o = object.get();
  require(read_both(read_int, int_from_object, o) == signed_reading(number, INT_MIN, INT_MAX),
          "an int");
  require(read_both(read_unsigned_long, unsigned_long_from_object, o) ==
              unsigned_reading(number, kMostUnsigned),
          "an unsigned long");
  require(read_both(read_unsigned_long_long, unsigned_long_long_from_object, o) ==
              without_range(unsigned_reading(number, kMostUnsigned)),
          "an unsigned long long");
  require(read_both(read_unsigned_int, unsigned_int_from_object, o) ==
              unsigned_reading(number, UINT_MAX),
          "an unsigned int");
  require(read_both(read_unsigned_short, unsigned_short_from_object, o) ==
              unsigned_reading(number, USHRT_MAX),
          "an unsigned short");
  require(read_both(read_unsigned_char, unsigned_char_from_object, o) ==
              unsigned_reading(number, UCHAR_MAX),
          "an unsigned char");
  require(read(char_from_object, o) == char_reading(number), "a char");
}

/// A `str`, and its bytes if UTF-8 encodes it.
struct Str {
  Object object;
  std::optional<std::string> bytes;
};

Str consume_str(Input &input) {
  auto const bytes = input.ConsumeRandomLengthString(300);
  auto const size = static_cast<Py_ssize_t>(bytes.size());
  if (Object strict{PyUnicode_DecodeUTF8(bytes.data(), size, nullptr)}; strict) {
    return {std::move(strict), bytes};
  }
  PyErr_Clear();
  return {Object(PyUnicode_DecodeUTF8(bytes.data(), size, "surrogateescape")), std::nullopt};
}

std::string padded(std::string text, std::size_t size) {
  text.resize(size);
  return text;
}

/// Into an array of that size, whose content is then the text and zeros.
void store(int outcome, ArrayText const &text, std::string const &bytes, std::size_t capacity) {
  bool const fits = bytes.size() + 1 <= capacity || (capacity == 1 && bytes.size() == 1);
  require((outcome == kConverted) == fits, "text and NUL must fit");
  if (fits) {
    Block const array(capacity);
    std::memset(array.chars(), 0x5a, capacity);
    store_array_text(array.chars(), capacity, text);
    require(array.text() == padded(bytes, capacity), "a text is stored with zeros to the end");
  }
}

void str_to_text(Str const &str) {
  char *copy = nullptr;
  std::size_t size = 0;
  int const outcome = text_from_str(str.object.get(), &copy, &size);
  Made<char> const owned(copy);
  require((outcome == kConverted) == str.bytes.has_value(), "UTF-8 encodes it, or it fails");
  require(PyErr_Occurred() == nullptr, "a conversion of a text leaves no error");
  if (str.bytes) {
    require(std::string(copy, size) == *str.bytes + '\0', "a text has its bytes and a NUL");
  }
}

void str_to_array(Str const &str, std::size_t capacity) {
  ArrayText text{};
  int const outcome = array_text_from_str(str.object.get(), capacity, &text);
  if (str.bytes) {
    store(outcome, text, *str.bytes, capacity);
  } else {
    require(outcome == kWrongType, "UTF-8 encodes it, or it fails");
  }
}

void str_to_char(Str const &str) {
  auto const reading = read(char_from_object, str.object.get());
  if (!str.bytes || str.bytes->size() > 1) {
    require(reading.outcome == kWrongType, "one byte at most is a char");
  } else {
    char const byte = str.bytes->empty() ? '\0' : str.bytes->front();
    require(reading == Reading{kConverted, byte}, "one byte is a char, and so is none");
  }
}

/// Short texts are copied whatever their length.
void copy_ascii(Str const &str) {
  char const *text = nullptr;
  std::size_t length = 0;
  bool const is_short = is_ascii_text(str.object.get(), &text, &length) && length < kShortText;
  Block const frame(kShortText);
  char const *const copy = copy_short_text(str.object.get(), frame.chars());
  require((copy != nullptr) == is_short, "short texts are copied, and no other");
  if (copy != nullptr) {
    require(copy + length + 1 == frame.chars() + kShortText, "a copy ends where the frame does");
    require(std::string(copy, length) == str.bytes, "a copy is the text");
  }
}

void strs(Input &input) {
  auto const capacity = input.ConsumeIntegralInRange<std::size_t>(1, 200);
  auto const str = consume_str(input);
  str_to_text(str);
  str_to_array(str, capacity);
  str_to_char(str);
  copy_ascii(str);
}

void c_texts(Input &input) {
  auto const capacity = input.ConsumeIntegralInRange<std::size_t>(1, 200);
  auto const text = consume_text(input, 250);
  ArrayText converted{};
  store(array_text_from_chars(text.c_str(), capacity, &converted), converted, text, capacity);

  Block const slot(capacity);
  fill_slot(std::span(slot.chars(), capacity), text.c_str());
  require(slot.text() == padded(text, capacity), "a slot is cut or padded");
  require(SWIG_strnlen(slot.chars(), capacity) == std::min(text.size(), capacity),
          "no more is read than there is");

  qex_Name name{};
  fill_slot(std::span(name.string).first(sizeof name.string - 1), text.c_str());
  require(name_text(&name) == text.substr(0, sizeof name.string - 1), "a name is its text");
}

template <std::size_t Size>
void address(Input &input, int family, PyObject *(*text_of_address)(void const *)) {
  auto const block = Block::of(padded(input.ConsumeBytesAsString(Size), Size));
  auto const text = text_of(text_of_address(block.chars()));
  std::array<char, Size> parsed{};
  require(inet_pton(family, text.c_str(), parsed.data()) == 1 &&
              std::string(parsed.data(), Size) == block.text(),
          "the text of an address is that address");
}

void addresses(Input &input) {
  address<4>(input, AF_INET, ipv4_address_text);
  address<16>(input, AF_INET6, ipv6_address_text);
  auto const mac = Block::of(padded(input.ConsumeBytesAsString(6), 6));
  std::array<unsigned, 6> parsed{};
  auto const text = text_of(mac_address_text(mac.chars()));
  require(text.size() == 17 &&
              std::sscanf(text.c_str(), "%2x:%2x:%2x:%2x:%2x:%2x", &parsed[0], &parsed[1],
                          &parsed[2], &parsed[3], &parsed[4], &parsed[5]) == 6,
          "an Ethernet address has six bytes");
  require(std::equal(parsed.begin(), parsed.end(), mac.as<unsigned char>()),
          "the text of an address is that address");
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(std::uint8_t const *data, std::size_t size) {
  Input input(data, size);
  switch (input.ConsumeIntegralInRange(0, 3)) {
    case 0:
      integers(input);
      break;
    case 1:
      strs(input);
      break;
    case 2:
      c_texts(input);
      break;
    default:
      addresses(input);
      break;
  }
  return 0;
}
