// Lists of named items that callers make and fill, each with an allocator of its own.
#pragma once

#include <cstddef>
#include <cstdint>
#include <deque>
#include <list>
#include <memory_resource>
#include <string>
#include <string_view>
#include <unordered_set>
#include <utility>
#include <vector>

#include "abi/ledger.h"
#include "base/api.h"
#include "base/bytes.h"
#include "nebpublic/handles.h"
#include "storage/properties.h"

namespace simhost {

/// How a list gets its memory: the caller's two functions, or the host's own way. Throws
/// std::bad_alloc.
class ListMemory : public std::pmr::memory_resource {
 public:
  /// Refuses one function without the other (QEX_BAD_PARAM).
  ListMemory(DVSData_MemAlloc alloc, DVSData_MemFree release);

  [[nodiscard]] bool is_hosts() const { return alloc_ == nullptr; }
  /// Bytes that are allocated in it.
  [[nodiscard]] std::size_t in_use() const { return in_use_; }

 private:
  void *do_allocate(std::size_t size, std::size_t alignment) override;
  void do_deallocate(void *memory, std::size_t size, std::size_t alignment) override;
  [[nodiscard]] bool do_is_equal(memory_resource const &other) const noexcept override;

  DVSData_MemAlloc alloc_;
  DVSData_MemFree release_;
  std::size_t in_use_ = 0;
};

/// A list lives, with all that it holds, in its own memory. Its functions run the caller's
/// allocator, so they are not for use under the host's lock, except with the host's own memory.
class SIMHOST_API DataList {
 public:
  /// Null for both functions is the host's own way. Refuses one without the other (QEX_BAD_PARAM).
  static DataList *make(DVSData_MemAlloc alloc, DVSData_MemFree release);
  static void destroy(DataList *list);
  DataList(DataList const &) = delete;
  DataList &operator=(DataList const &) = delete;

  [[nodiscard]] bool is_in_hosts_memory() const { return memory_.is_hosts(); }
  /// Bytes of the list and all that it holds.
  [[nodiscard]] std::size_t size() const { return sizeof(DataList) + memory_.in_use(); }
  /// Memory of the list's kind for a block that leaves it.
  void *allocate(std::size_t size);
  /// Adds an item or replaces the one of that name. Refuses no name (QEX_BAD_PARAM).
  void update(std::string_view name, BytesView value, storage::PropertyType type);
  /// Refuses version 0 (QEX_BAD_PARAM).
  [[nodiscard]] Bytes serialized(std::uint32_t version) const;

 private:
  struct Entry {
    std::pmr::string name;
    std::pmr::vector<std::byte> value;
    storage::PropertyType type;
  };

  explicit DataList(ListMemory memory) : memory_(std::move(memory)), entries_(&memory_) {}
  ~DataList() = default;

  ListMemory memory_;
  std::pmr::list<Entry> entries_;
};

/// The lists that are out, which the ledger is told of.
class DataLists {
 public:
  explicit DataLists(Ledger &ledger) : ledger_(ledger) {}

  SIMHOST_API void add(DataList *list, char const *call);
  /// The list holds more or less than before.
  SIMHOST_API void changed(DataList const &list);
  /// These throw Trapped for a list that was never made, or is freed already.
  [[nodiscard]] SIMHOST_API DataList &known(void *handle) const;
  SIMHOST_API DataList *release(void *handle);

 private:
  Ledger &ledger_;
  std::unordered_set<void *> lists_;
  std::deque<void *> freed_;
};

}  // namespace simhost
