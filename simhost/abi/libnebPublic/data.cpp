// DVSData_*: lists of named items, and the items of the state.
#include "nebpublic/data.h"

#include <algorithm>

#include "abi/boundary.h"
#include "abi/data_lists.h"
#include "abi/handles.h"
#include "abi/libnebPublic/arguments.h"
#include "abi/targets.h"
#include "model/properties/properties.h"

using simhost::answer;
using simhost::Call;
using simhost::DataList;
using simhost::require;
using simhost::require_text;

namespace {

// Memory of the list's own kind with a copy of the bytes.
void *copy_for_caller(Call &call, DataList &list, simhost::BytesView bytes) {
  if (list.is_in_hosts_memory()) {
    return simhost::allocate<void>(call, bytes);
  }
  return call.unlocked([&] {
    auto *const memory = list.allocate(bytes.size());
    std::copy(bytes.begin(), bytes.end(), static_cast<std::byte *>(memory));
    return memory;
  });
}

}  // namespace

extern "C" {

QEX_ReturnStatus DVSData_Alloc(DVSDataHandle *list, DVSData_MemAlloc alloc,
                               DVSData_MemFree release) {
  return answer(__func__, [&](Call &call) {
    auto &output = require(list);
    auto *const made = call.unlocked([&] { return DataList::make(alloc, release); });
    call.lists().add(made, call.name());
    output = made;
  });
}

void DVSData_Free(DVSDataHandle list) {
  simhost::run(__func__, [&](Call &call) {
    if (list != nullptr) {
      auto *const freed = call.lists().release(list);
      call.unlocked([&] { DataList::destroy(freed); });
    }
  });
}

QEX_ReturnStatus DVSData_Update(DVSDataHandle list, char const *name, void *data, qex_uint32 length,
                                qex_uint32 propertyType) {
  return answer(__func__, [&](Call &call) {
    auto &known = call.lists().known(simhost::require_handle(list));
    auto const item = require_text(name);
    auto const value = simhost::argument_bytes(data, length);
    auto const type = simhost::property_type(propertyType);
    call.unlocked([&] { known.update(item, value, type); });
    call.lists().changed(known);
  });
}

QEX_ReturnStatus DVSData_Serialize(DVSDataHandle list, void **bytes, qex_uint32 *length,
                                   NEBVersion version) {
  return answer(__func__, [&](Call &call) {
    auto &known = call.lists().known(simhost::require_handle(list));
    auto &bytes_output = require(bytes);
    auto &length_output = require(length);
    auto const block = known.serialized(version);
    bytes_output = copy_for_caller(call, known, block);
    length_output = static_cast<qex_uint32>(block.size());
  });
}

char const *DVSData_Name(DVSDataItem item) {
  char const *name = nullptr;
  simhost::run(__func__, [&](Call &call) {
    if (item != nullptr) {
      name = call.handles().get_item(item).content.name.c_str();
    }
  });
  return name;
}

qex_uint32 DVSData_Data(DVSDataItem item, void **data) {
  qex_uint32 length = 0;
  simhost::run(__func__, [&](Call &call) {
    if (item == nullptr) {
      return;
    }
    auto &value = call.handles().get_item(item).content.property.value;
    length = static_cast<qex_uint32>(value.size());
    if (data != nullptr) {
      *data = value.data();
    }
  });
  return length;
}

qex_uint32 DVSData_PropType(DVSDataItem item) {
  qex_uint32 type = 0;
  simhost::run(__func__, [&](Call &call) {
    if (item != nullptr) {
      type = static_cast<qex_uint32>(call.handles().get_item(item).content.property.type);
    }
  });
  return type;
}

}  // extern "C"
