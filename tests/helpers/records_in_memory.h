// Records for tests: blocks of exactly the wanted size, and what a call prints about them.
#ifndef TESTS_HELPERS_RECORDS_IN_MEMORY_H
#define TESTS_HELPERS_RECORDS_IN_MEMORY_H

#include <gtest/gtest.h>
#include <malloc.h>

#include <cstddef>
#include <cstdlib>
#include <cstring>
#include <memory>
#include <string>
#include <vector>

#include "tests/helpers/python_objects.h"

constexpr char kNotice[] = "Invalid array index.";

/// What a call writes to standard output.
template <typename Call>
std::string printed_by(Call const &call) {
  testing::internal::CaptureStdout();
  call();
  return testing::internal::GetCapturedStdout();
}

/// The value of a `str` of which the reference is taken over.
inline std::string text_of(PyObject *str) {
  Object const owned(str);
  Py_ssize_t size = 0;
  char const *const text = PyUnicode_AsUTF8AndSize(owned.get(), &size);
  return {text, static_cast<size_t>(size)};
}

/// A record in a block that may go on before it and after it, all bytes alike at first.
template <typename Record>
class Block {
 public:
  explicit Block(size_t after = 0, char filling = '\0', size_t in_front = 0)
      : bytes_(in_front + sizeof(Record) + after, filling), in_front_(in_front) {}

  Record *get() { return reinterpret_cast<Record *>(bytes_.data() + in_front_); }
  Record *operator->() { return get(); }

  /// All bytes, those in front of the record included.
  [[nodiscard]] std::string bytes() const { return {bytes_.begin(), bytes_.end()}; }

  /// Overwrites bytes, counted from the record's first one.
  void put(std::ptrdiff_t offset, std::string const &data) {
    std::memcpy(reinterpret_cast<char *>(get()) + offset, data.data(), data.size());
  }

 private:
  std::vector<char> bytes_;
  size_t in_front_;
};

struct Free {
  void operator()(void *memory) const { std::free(memory); }
};

/// A record from an allocating function.
template <typename Record>
using Made = std::unique_ptr<Record, Free>;

/// While it lives, fresh memory is not zero, so that what fills it with zeros is seen.
class FreshMemoryIsNotZero {
 public:
  FreshMemoryIsNotZero() { mallopt(M_PERTURB, 0x5a); }
  ~FreshMemoryIsNotZero() { mallopt(M_PERTURB, 0); }
  FreshMemoryIsNotZero(FreshMemoryIsNotZero const &) = delete;
  FreshMemoryIsNotZero &operator=(FreshMemoryIsNotZero const &) = delete;
};

/// What `size` bytes of fresh memory hold.
inline std::string fresh_memory(size_t size) {
  // The compiler would take what it knows to be fresh memory for anything at all.
  void *(*volatile allocate)(size_t) = std::malloc;
  Made<char> const memory(static_cast<char *>(allocate(size)));
  std::string bytes(memory.get(), size);
  EXPECT_NE(std::string(size, '\0'), bytes) << "fresh memory shows nothing if it is zero";
  return bytes;
}

/// The allocator rounds up: to 16 bytes, and by as much again when a rest is too small to keep.
constexpr size_t kRounding = 32;

#endif
