// Lists of named items that callers make and fill, each with an allocator of its own.
#pragma once

#include <cstddef>
#include <cstdint>
#include <deque>
#include <memory>
#include <string_view>
#include <unordered_set>

#include "abi/ledger.h"
#include "base/api.h"
#include "base/bytes.h"
#include "nebpublic/handles.h"
#include "storage/properties.h"

namespace simhost {

/// How a list gets its memory: the caller's two functions, or the host's own way for null.
struct ListMemory {
  DVSData_MemAlloc alloc;
  DVSData_MemFree release;

  [[nodiscard]] bool is_hosts() const { return alloc == nullptr; }
};

/// These run the caller's code, so no call may be running, unless the memory is the host's. Null if
/// there is none.
SIMHOST_API void *allocate_block(ListMemory const &memory, std::size_t size);
SIMHOST_API void release_block(ListMemory const &memory, void *block);

/// A list is one block of its own kind of memory, and each item is another. It allocates none of
/// them, so that the caller's allocator runs before the list is changed, and after it.
class SIMHOST_API DataList {
 public:
  /// An empty list in a block of sizeof(DataList) bytes.
  static DataList *make(void *block, ListMemory const &memory);
  /// Releases all blocks of a list that nobody knows any more, with release_block().
  static void destroy(DataList *list);
  DataList(DataList const &) = delete;
  DataList &operator=(DataList const &) = delete;

  /// Bytes of the block of an item.
  static std::size_t item_size(std::string_view name, BytesView value);
  /// Adds an item in a block of item_size() bytes, or replaces the one of that name. Returns the
  /// block of the item that was replaced; null if it is a new one.
  [[nodiscard]] void *put(void *block, std::string_view name, BytesView value,
                          storage::PropertyType type);

  [[nodiscard]] ListMemory const &memory() const { return memory_; }
  /// Bytes of the list and all that it holds.
  [[nodiscard]] std::size_t size() const;
  /// Refuses version 0 (QEX_BAD_PARAM).
  [[nodiscard]] Bytes serialized(std::uint32_t version) const;

 private:
  struct Item;

  explicit DataList(ListMemory const &memory) : memory_(memory) {}
  ~DataList() = default;

  ListMemory memory_;
  Item *first_ = nullptr;
};

/// For a list in the host's memory.
struct DestroyList {
  void operator()(DataList *list) const { DataList::destroy(list); }
};
using OwnedList = std::unique_ptr<DataList, DestroyList>;

/// An empty list in the host's memory, and an item more in it. Both throw std::bad_alloc.
SIMHOST_API OwnedList make_list_of_host();
SIMHOST_API void add_item(DataList &list, std::string_view name, BytesView value,
                          storage::PropertyType type);

/// The lists that callers have, which the ledger is told of.
class DataLists {
 public:
  explicit DataLists(Ledger &ledger) : ledger_(ledger) {}

  SIMHOST_API void add(DataList *list, char const *call);
  /// The list holds more or less than before.
  SIMHOST_API void changed(DataList const &list);
  /// These throw Trapped for a list that was never made, or is freed already.
  [[nodiscard]] SIMHOST_API DataList &get_list(void *handle) const;
  SIMHOST_API DataList *release(void *handle);

 private:
  Ledger &ledger_;
  std::unordered_set<void *> lists_;
  std::deque<void *> freed_;
};

}  // namespace simhost
