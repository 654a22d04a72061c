// What the host has allocated for its callers and they have not released: memory, and lists.
#pragma once

#include <cstddef>
#include <deque>
#include <list>
#include <memory>
#include <span>
#include <string>
#include <unordered_map>

#include "base/api.h"

namespace simhost {

/// Owns the blocks until they are released. Names of calls are literals and are not copied.
class Ledger {
 public:
  /// Allocates `size` bytes of zeros in the name of `call`. Throws std::bad_alloc.
  SIMHOST_API void *allocate(std::size_t size, char const *call);
  /// Frees what was allocated, whichever call did it; null does nothing. Throws Trapped for a
  /// pointer that was never allocated, or is released already.
  SIMHOST_API void release(void *memory, char const *call);

  /// Notes that something of `size` bytes at `address` is out which is not the ledger's memory, and
  /// which `taker` takes back.
  SIMHOST_API void note(void const *address, std::size_t size, char const *call, char const *taker);
  /// What was noted has another size now.
  SIMHOST_API void resize(void const *address, std::size_t size);
  /// What was noted is back.
  SIMHOST_API void forget(void const *address);

  [[nodiscard]] std::size_t count() const { return blocks_.size(); }
  /// Writes one line per block, oldest first, and a NUL into `text`, cut at its size. Returns the
  /// length of the whole report without the NUL.
  std::size_t report(std::span<char> text) const noexcept;
  /// One line per call and size, in the order of the names.
  [[nodiscard]] std::string summary() const;

 private:
  struct Block {
    void const *address;
    std::unique_ptr<std::byte[]> memory;  // null for what was noted only
    std::size_t size;
    char const *giver;
    char const *taker;  // of what was noted
  };
  struct Return {
    void const *address;
    char const *giver;
    char const *taker;
  };

  [[noreturn]] void refuse(void const *memory) const;

  std::list<Block> blocks_;  // oldest first
  std::unordered_map<void const *, std::list<Block>::iterator> by_address_;
  // Addresses come back to life with the next allocation, so this is asked only for the dead ones.
  std::deque<Return> returns_;
};

}  // namespace simhost
