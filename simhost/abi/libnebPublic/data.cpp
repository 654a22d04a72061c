// DVSData_*: lists of named items, and the items of the state. What makes or changes a list is a
// row of short calls: the caller's allocator runs between them, when no lock is held, nothing wants
// destroying, and the list is whole.
#include "nebpublic/data.h"

#include <algorithm>

#include "abi/boundary.h"
#include "abi/callers_code.h"
#include "abi/data_lists.h"
#include "abi/handles.h"
#include "abi/libnebPublic/arguments.h"
#include "abi/targets.h"
#include "model/properties/properties.h"

namespace simhost {
namespace {

// Memory that a call needs of a list's kind.
struct BlockRequest {
  ListMemory memory;
  std::size_t size;
};

// Goes on with a call that needs a block. `use` takes the call and the block, and returns what is
// not needed, which is released: null, the block, or another one.
template <typename Use>
QEX_ReturnStatus with_block(char const *name, BlockRequest const &request, Use const &use) {
  void *const block = allocate_block(request.memory, request.size);
  if (block == nullptr) {
    return QEX_NO_MEMORY;
  }
  void *unused = block;
  auto const status = stateless(resumed(name), [&](Call &call) { unused = use(call, block); });
  if (unused != nullptr) {
    release_block(request.memory, unused);
  }
  return status;
}

}  // namespace

extern "C" {

QEX_ReturnStatus DVSData_Alloc(DVSDataHandle *list, DVSData_MemAlloc alloc,
                               DVSData_MemFree release) {
  ListMemory const memory{.alloc = alloc, .release = release};
  auto const status = stateless(__func__, [&](Call &) {
    require(list);
    if ((alloc == nullptr) != (release == nullptr)) {
      refuse(QEX_BAD_PARAM);
    }
  });
  if (status != QEX_OK) {
    return status;
  }
  return with_block(__func__, {memory, sizeof(DataList)}, [&](Call &call, void *block) {
    auto *const made = DataList::make(block, memory);
    call.lists().add(made, call.name());
    *list = made;
    return nullptr;
  });
}

void DVSData_Free(DVSDataHandle list) {
  auto *const freed = stateless_or_trap(__func__, [&](Call &call) -> DataList * {
    return list == nullptr ? nullptr : call.lists().release(list);
  });
  if (freed != nullptr) {
    DataList::destroy(freed);
  }
}

QEX_ReturnStatus DVSData_Update(DVSDataHandle list, char const *name, void *data, qex_uint32 length,
                                qex_uint32 propertyType) {
  BlockRequest request{};
  auto const status = stateless(__func__, [&](Call &call) {
    auto const &updated = call.lists().get_list(require_handle(list));
    auto const item = require_text(name);
    auto const value = argument_bytes(data, length);
    property_type(propertyType);
    if (item.empty()) {
      refuse(QEX_BAD_PARAM);
    }
    request = {.memory = updated.memory(), .size = DataList::item_size(item, value)};
  });
  if (status != QEX_OK) {
    return status;
  }
  return with_block(__func__, request, [&](Call &call, void *block) {
    auto &updated = call.lists().get_list(list);
    auto *const replaced =
        updated.put(block, name, argument_bytes(data, length), property_type(propertyType));
    call.lists().changed(updated);
    return replaced;
  });
}

QEX_ReturnStatus DVSData_Serialize(DVSDataHandle list, void **bytes, qex_uint32 *length,
                                   NEBVersion version) {
  BlockRequest request{};
  auto const status = stateless(__func__, [&](Call &call) {
    auto const &serialized = call.lists().get_list(require_handle(list));
    require(bytes);
    require(length);
    auto const block = serialized.serialized(version);
    request = {.memory = serialized.memory(), .size = block.size()};
    if (request.memory.is_hosts()) {
      *bytes = allocate<void>(call, block);
      *length = static_cast<qex_uint32>(block.size());
    }
  });
  if (status != QEX_OK || request.memory.is_hosts()) {
    return status;
  }
  return with_block(__func__, request, [&](Call &call, void *block) {
    auto const content = call.lists().get_list(list).serialized(version);
    if (content.size() != request.size) {
      refuse(QEX_BUSY);  // the allocator, or another thread, has changed the list
    }
    std::copy(content.begin(), content.end(), static_cast<std::byte *>(block));
    *bytes = block;
    *length = static_cast<qex_uint32>(content.size());
    return nullptr;
  });
}

char const *DVSData_Name(DVSDataItem item) {
  return stateless_or_trap(__func__, [&](Call &call) {
    return item == nullptr ? nullptr : call.handles().get_item(item).content.name.c_str();
  });
}

qex_uint32 DVSData_Data(DVSDataItem item, void **data) {
  return stateless_or_trap(__func__, [&](Call &call) {
    if (item == nullptr) {
      return qex_uint32{0};
    }
    auto &value = call.handles().get_item(item).content.property.value;
    if (data != nullptr) {
      *data = value.data();
    }
    return static_cast<qex_uint32>(value.size());
  });
}

qex_uint32 DVSData_PropType(DVSDataItem item) {
  return stateless_or_trap(__func__, [&](Call &call) {
    return item == nullptr
               ? qex_uint32{0}
               : static_cast<qex_uint32>(call.handles().get_item(item).content.property.type);
  });
}

}  // extern "C"
}  // namespace simhost
