// Readings of Python integers and texts as C values; see conversions.h for what each accepts.

#include "helpers/conversions.h"

#include <climits>
#include <cstdlib>
#include <cstring>
#include <limits>
#include <optional>
#include <string_view>

#include "helpers/exported.h"

namespace {

/// Keeps an error that an earlier argument left pending out of sight, and puts it back.
class PendingErrorGuard {
 public:
  PendingErrorGuard() { PyErr_Fetch(&type_, &value_, &traceback_); }
  ~PendingErrorGuard() { PyErr_Restore(type_, value_, traceback_); }
  PendingErrorGuard(PendingErrorGuard const &) = delete;
  PendingErrorGuard &operator=(PendingErrorGuard const &) = delete;

 private:
  PyObject *type_ = nullptr;
  PyObject *value_ = nullptr;
  PyObject *traceback_ = nullptr;
};

/// The value of an integer object above the signed 64-bit maximum, if 64 unsigned bits hold it.
std::optional<unsigned long long> beyond_signed(PyObject *integer) {
  PendingErrorGuard const guard;
  unsigned long long const value = PyLong_AsUnsignedLongLong(integer);
  if (PyErr_Occurred() != nullptr) {
    PyErr_Clear();
    return std::nullopt;
  }
  return value;
}

template <typename Narrow>
int narrow_unsigned_from_object(PyObject *object, Narrow *value) {
  unsigned long wide = 0;
  int const result = unsigned_long_from_object(object, &wide);
  if (result != kConverted) {
    return result;
  }
  if (wide > std::numeric_limits<Narrow>::max()) {
    return kOutOfRange;
  }
  if (value != nullptr) {
    *value = static_cast<Narrow>(wide);
  }
  return kConverted;
}

struct Utf8 {
  std::string_view bytes;
  int failure = kConverted;
};

/// The bytes belong to the object and live as long as it does.
Utf8 utf8_of(PyObject *str) {
  Py_ssize_t length = 0;
  char const *const bytes = PyUnicode_AsUTF8AndSize(str, &length);
  if (bytes != nullptr) {
    return {{bytes, static_cast<size_t>(length)}};
  }
  bool const no_memory = PyErr_ExceptionMatches(PyExc_MemoryError) != 0;
  PyErr_Clear();
  return {{}, no_memory ? kNoMemory : kWrongType};
}

}  // namespace

extern "C" {

int int_from_object(PyObject *object, int *value) {
  if (!PyLong_Check(object)) {
    return kWrongType;
  }
  long const wide = PyLong_AsLong(object);
  if (wide < INT_MIN || wide > INT_MAX) {
    return kOutOfRange;
  }
  if (value != nullptr) {
    *value = static_cast<int>(wide);
  }
  return kConverted;
}

int unsigned_long_from_object(PyObject *object, unsigned long *value) {
  if (!PyLong_Check(object)) {
    return kWrongType;
  }
  int overflow = 0;
  long const low = PyLong_AsLongAndOverflow(object, &overflow);
  auto reading = static_cast<unsigned long>(low);
  if (overflow < 0) {
    return kWrongType;
  }
  if (overflow > 0) {
    std::optional<unsigned long long> const high = beyond_signed(object);
    if (!high) {
      return kWrongType;
    }
    reading = *high;
  } else if (low < 0) {
    return kOutOfRange;
  }
  if (value != nullptr) {
    *value = reading;
  }
  return kConverted;
}

int unsigned_long_long_from_object(PyObject *object, unsigned long long *value) {
  unsigned long reading = 0;
  if (unsigned_long_from_object(object, &reading) != kConverted) {
    return kWrongType;
  }
  if (value != nullptr) {
    *value = reading;
  }
  return kConverted;
}

int unsigned_int_from_object(PyObject *object, unsigned int *value) {
  return narrow_unsigned_from_object(object, value);
}

int unsigned_short_from_object(PyObject *object, unsigned short *value) {
  return narrow_unsigned_from_object(object, value);
}

int unsigned_char_from_object(PyObject *object, unsigned char *value) {
  return narrow_unsigned_from_object(object, value);
}

int char_from_object(PyObject *object, char *value) {
  char byte = 0;
  if (PyUnicode_Check(object)) {
    Utf8 const utf8 = utf8_of(object);
    if (utf8.failure != kConverted) {
      return utf8.failure;
    }
    if (utf8.bytes.size() > 1) {
      return kWrongType;
    }
    byte = utf8.bytes.empty() ? '\0' : utf8.bytes.front();
  } else if (PyLong_Check(object)) {
    int overflow = 0;
    long const wide = PyLong_AsLongAndOverflow(object, &overflow);
    if (overflow != 0 || wide < CHAR_MIN || wide > CHAR_MAX) {
      return kOutOfRange;
    }
    byte = static_cast<char>(wide);
  } else {
    return kWrongType;
  }
  if (value != nullptr) {
    *value = byte;
  }
  return kConverted;
}

int text_from_str(PyObject *str, char **text, size_t *size) {
  Utf8 const utf8 = utf8_of(str);
  if (utf8.failure != kConverted) {
    return utf8.failure;
  }
  size_t const with_nul = utf8.bytes.size() + 1;
  if (text != nullptr) {
    auto *const copy = static_cast<char *>(std::malloc(with_nul));
    if (copy == nullptr) {
      return kNoMemory;
    }
    std::memcpy(copy, utf8.bytes.data(), with_nul);
    *text = copy;
  }
  if (size != nullptr) {
    *size = with_nul;
  }
  return kConverted;
}

int array_text_from_str(PyObject *str, size_t capacity, ArrayText *text) {
  Utf8 const utf8 = utf8_of(str);
  if (utf8.failure != kConverted) {
    return utf8.failure;
  }
  *text = {utf8.bytes.data(), utf8.bytes.size() + 1};
  return fit_array_text(capacity, text);
}

int array_text_from_chars(char const *chars, size_t capacity, ArrayText *text) {
  *text = {chars, chars != nullptr ? std::strlen(chars) + 1 : 0};
  return fit_array_text(capacity, text);
}

void store_array_text(char *array, size_t capacity, ArrayText text) {
  if (text.size != 0) {
    std::memmove(array, text.bytes, text.size);
  }
  std::memset(array + text.size, 0, capacity - text.size);
}

EXPORTED size_t SWIG_strnlen(const char *s, size_t maxlen) {
  return maxlen == 0 ? 0 : ::strnlen(s, maxlen);
}

}  // extern "C"
