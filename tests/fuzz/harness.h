// What the harnesses share: memory of exactly the wanted size, and a way to say what is wrong.
#ifndef TESTS_FUZZ_HARNESS_H
#define TESTS_FUZZ_HARNESS_H

#include <fuzzer/FuzzedDataProvider.h>

#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <memory>
#include <string>

/// Where inputs come from: numbers from the end, bytes from the front.
using Input = FuzzedDataProvider;

/// Ends the run, which leaves the input behind as a finding.
inline void require(bool holds, char const *what) {
  if (!holds) {
    std::fprintf(stderr, "does not hold: %s\n", what);
    std::abort();
  }
}

struct Free {
  void operator()(void *memory) const { std::free(memory); }
};

/// A record that a helper allocated.
template <typename Record>
using Made = std::unique_ptr<Record, Free>;

/// A block of exactly so many bytes, with nothing of ours before it or after it.
class Block {
 public:
  explicit Block(std::size_t size) : bytes_(new std::byte[size]()), size_(size) {}
  template <typename Bytes>
  static Block of(Bytes const &bytes) {
    Block block(bytes.size());
    if (!bytes.empty()) {
      std::memcpy(block.bytes_.get(), bytes.data(), bytes.size());
    }
    return block;
  }

  /// The whole block as a record; what it lacks of one is nobody's to touch.
  template <typename Record>
  [[nodiscard]] Record *as() const {
    return reinterpret_cast<Record *>(bytes_.get());
  }
  [[nodiscard]] char *chars() const { return as<char>(); }
  [[nodiscard]] std::size_t size() const { return size_; }
  [[nodiscard]] std::string text() const { return {chars(), size_}; }

 private:
  std::unique_ptr<std::byte[]> bytes_;
  std::size_t size_;
};

/// A record whose first bytes are of the input and whose others are zero.
template <typename Record>
Record consume_record(Input &input) {
  Record record{};
  input.ConsumeData(&record, sizeof record);
  return record;
}

/// A text as C sees one: without NULs.
inline std::string consume_text(Input &input, std::size_t longest) {
  auto text = input.ConsumeRandomLengthString(longest);
  text.resize(std::min(text.size(), text.find('\0')));
  return text;
}

/// An index that is near to being one of `count`, or any number.
inline int consume_index(Input &input, int count) {
  return input.ConsumeBool() ? input.ConsumeIntegralInRange<int>(-2, count + 1)
                             : input.ConsumeIntegral<int>();
}

#endif
