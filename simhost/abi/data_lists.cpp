// Lists over the caller's memory, and knowing them again.
#include "abi/data_lists.h"

#include <algorithm>
#include <new>

#include "abi/handles.h"
#include "base/blocks.h"
#include "base/outcomes.h"

namespace simhost {
namespace {

constexpr std::size_t kRememberedLists = 1024;

}  // namespace

ListMemory::ListMemory(DVSData_MemAlloc alloc, DVSData_MemFree release)
    : alloc_(alloc), release_(release) {
  if ((alloc == nullptr) != (release == nullptr)) {
    throw Refused(QEX_BAD_PARAM);
  }
}

void *ListMemory::do_allocate(std::size_t size, std::size_t /*alignment*/) {
  auto *const memory = is_hosts() ? ::operator new(size) : alloc_(size);
  if (memory == nullptr) {
    throw std::bad_alloc();
  }
  in_use_ += size;
  return memory;
}

void ListMemory::do_deallocate(void *memory, std::size_t size, std::size_t /*alignment*/) {
  in_use_ -= size;
  if (is_hosts()) {
    ::operator delete(memory);
  } else {
    release_(memory);
  }
}

bool ListMemory::do_is_equal(memory_resource const &other) const noexcept {
  return this == &other;
}

DataList *DataList::make(DVSData_MemAlloc alloc, DVSData_MemFree release) {
  ListMemory memory(alloc, release);
  auto *const place = memory.allocate(sizeof(DataList), alignof(DataList));
  return new (place) DataList(ListMemory(alloc, release));
}

void DataList::destroy(DataList *list) {
  auto own = list->memory_;
  list->~DataList();
  own.deallocate(list, sizeof(DataList), alignof(DataList));
}

void *DataList::allocate(std::size_t size) {
  auto leaving = memory_;
  return leaving.allocate(size);
}

void DataList::update(std::string_view name, BytesView value, storage::PropertyType type) {
  if (name.empty()) {
    throw Refused(QEX_BAD_PARAM);
  }
  std::pmr::vector<std::byte> copy(value.begin(), value.end(), &memory_);
  auto const found = std::find_if(entries_.begin(), entries_.end(),
                                  [&](Entry const &entry) { return entry.name == name; });
  if (found != entries_.end()) {
    found->value = std::move(copy);
    found->type = type;
  } else {
    entries_.push_back({std::pmr::string(name, &memory_), std::move(copy), type});
  }
}

Bytes DataList::serialized(std::uint32_t version) const {
  if (version == 0) {
    throw Refused(QEX_BAD_PARAM);
  }
  Writer writer;
  writer.number(static_cast<std::uint32_t>(entries_.size()));
  for (auto const &entry : entries_) {
    writer.text(entry.name);
    writer.number(static_cast<std::uint32_t>(entry.type));
    writer.bytes(entry.value);
  }
  return writer.block(BlockKind::list, version);
}

void DataLists::add(DataList *list, char const *call) {
  lists_.insert(list);
  ledger_.note(list, list->size(), call, "DVSData_Free");
}

void DataLists::changed(DataList const &list) {
  ledger_.resize(&list, list.size());
}

DataList &DataLists::known(void *handle) const {
  if (!lists_.contains(handle)) {
    bool const freed = std::find(freed_.begin(), freed_.end(), handle) != freed_.end();
    throw Trapped(TrapKind::runtime_error,
                  freed ? "the list " + text_of_address(handle) + " is freed already"
                        : "the host never gave out the list " + text_of_address(handle));
  }
  return *static_cast<DataList *>(handle);
}

DataList *DataLists::release(void *handle) {
  auto *const list = &known(handle);
  lists_.erase(handle);
  ledger_.forget(handle);
  freed_.push_back(handle);
  if (freed_.size() > kRememberedLists) {
    freed_.pop_front();
  }
  return list;
}

}  // namespace simhost
