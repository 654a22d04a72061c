// Lists over the caller's memory, and knowing them again.
#include "abi/data_lists.h"

#include <algorithm>
#include <new>
#include <span>

#include "abi/callers_code.h"
#include "abi/handles.h"
#include "base/blocks.h"
#include "base/outcomes.h"

namespace simhost {
namespace {

constexpr std::size_t kRememberedLists = 1024;

}  // namespace

// The bytes of the name and the value follow it.
struct DataList::Item {
  Item *next;
  std::size_t name_length;
  std::size_t value_length;
  storage::PropertyType type;

  [[nodiscard]] std::byte *bytes() { return reinterpret_cast<std::byte *>(this + 1); }
  [[nodiscard]] std::byte const *bytes() const {
    return reinterpret_cast<std::byte const *>(this + 1);
  }
  [[nodiscard]] std::string_view name() const {
    return {reinterpret_cast<char const *>(bytes()), name_length};
  }
  [[nodiscard]] BytesView value() const { return {bytes() + name_length, value_length}; }
  [[nodiscard]] std::size_t size() const { return sizeof(Item) + name_length + value_length; }
};

void *allocate_block(ListMemory const &memory, std::size_t size) {
  return memory.is_hosts() ? ::operator new(size, std::nothrow) : call_back(memory.alloc, size);
}

void release_block(ListMemory const &memory, void *block) {
  if (memory.is_hosts()) {
    ::operator delete(block);
  } else {
    call_back(memory.release, block);
  }
}

DataList *DataList::make(void *block, ListMemory const &memory) {
  return new (block) DataList(memory);
}

void DataList::destroy(DataList *list) {
  auto const memory = list->memory_;
  while (auto *const item = list->first_) {
    list->first_ = item->next;
    release_block(memory, item);
  }
  release_block(memory, list);
}

std::size_t DataList::item_size(std::string_view name, BytesView value) {
  return sizeof(Item) + name.size() + value.size();
}

void *DataList::put(void *block, std::string_view name, BytesView value,
                    storage::PropertyType type) {
  auto *const item = new (block)
      Item{.next = nullptr, .name_length = name.size(), .value_length = value.size(), .type = type};
  auto const name_bytes = std::as_bytes(std::span(name));
  std::copy(value.begin(), value.end(),
            std::copy(name_bytes.begin(), name_bytes.end(), item->bytes()));
  auto **link = &first_;
  while (*link != nullptr && (*link)->name() != name) {
    link = &(*link)->next;
  }
  auto *const replaced = *link;
  item->next = replaced == nullptr ? nullptr : replaced->next;
  *link = item;
  return replaced;
}

std::size_t DataList::size() const {
  auto size = sizeof(DataList);
  for (auto const *item = first_; item != nullptr; item = item->next) {
    size += item->size();
  }
  return size;
}

Bytes DataList::serialized(std::uint32_t version) const {
  if (version == 0) {
    throw Refused(QEX_BAD_PARAM);
  }
  std::uint32_t count = 0;
  for (auto const *item = first_; item != nullptr; item = item->next) {
    ++count;
  }
  Writer writer;
  writer.number(count);
  for (auto const *item = first_; item != nullptr; item = item->next) {
    writer.text(item->name());
    writer.number(static_cast<std::uint32_t>(item->type));
    writer.bytes(item->value());
  }
  return writer.block(BlockKind::list, version);
}

OwnedList make_list_of_host() {
  return OwnedList(DataList::make(::operator new(sizeof(DataList)), {nullptr, nullptr}));
}

void add_item(DataList &list, std::string_view name, BytesView value, storage::PropertyType type) {
  ::operator delete(list.put(::operator new(DataList::item_size(name, value)), name, value, type));
}

void DataLists::add(DataList *list, char const *call) {
  lists_.insert(list);
  ledger_.note(list, list->size(), call, "DVSData_Free");
}

void DataLists::changed(DataList const &list) {
  ledger_.resize(&list, list.size());
}

DataList &DataLists::get_list(void *handle) const {
  if (!lists_.contains(handle)) {
    bool const freed = std::find(freed_.begin(), freed_.end(), handle) != freed_.end();
    throw Trapped(TrapKind::runtime_error,
                  freed ? "the list " + text_of_address(handle) + " is freed already"
                        : "the host never gave out the list " + text_of_address(handle));
  }
  return *static_cast<DataList *>(handle);
}

DataList *DataLists::release(void *handle) {
  auto *const list = &get_list(handle);
  lists_.erase(handle);
  ledger_.forget(handle);
  freed_.push_back(handle);
  if (freed_.size() > kRememberedLists) {
    freed_.pop_front();
  }
  return list;
}

}  // namespace simhost
