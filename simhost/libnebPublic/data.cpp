// DVSData_*: lists of named items, and the items of the state.
#include "nebpublic/data.h"

#include <algorithm>

#include "core/boundary.h"
#include "core/data_lists.h"
#include "core/handles.h"
#include "core/properties.h"
#include "core/targets.h"
#include "libnebPublic/arguments.h"

using simhost::answer;
using simhost::Call;
using simhost::DataList;
using simhost::required;
using simhost::required_text;

namespace {

// Memory of the list's own kind with a copy of the bytes.
void *copy_for_caller(Call &call, DataList &list, simhost::BytesView bytes) {
  if (list.is_in_hosts_memory()) {
    return simhost::give_out<void>(call, bytes);
  }
  return call.aside([&] {
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
    auto &output = required(list);
    auto *const made = call.aside([&] { return DataList::make(alloc, release); });
    call.lists().add(made, call.name());
    output = made;
  });
}

void DVSData_Free(DVSDataHandle list) {
  simhost::run(__func__, [&](Call &call) {
    if (list != nullptr) {
      auto *const freed = call.lists().take_back(list);
      call.aside([&] { DataList::destroy(freed); });
    }
  });
}

QEX_ReturnStatus DVSData_Update(DVSDataHandle list, char const *name, void *data, qex_uint32 length,
                                qex_uint32 propertyType) {
  return answer(__func__, [&](Call &call) {
    auto &known = call.lists().known(simhost::required_handle(list));
    auto const item = required_text(name);
    auto const value = simhost::argument_bytes(data, length);
    auto const type = simhost::property_type(propertyType);
    call.aside([&] { known.update(item, value, type); });
    call.lists().changed(known);
  });
}

QEX_ReturnStatus DVSData_Serialize(DVSDataHandle list, void **bytes, qex_uint32 *length,
                                   NEBVersion version) {
  return answer(__func__, [&](Call &call) {
    auto &known = call.lists().known(simhost::required_handle(list));
    auto &bytes_output = required(bytes);
    auto &length_output = required(length);
    auto const block = known.serialized(version);
    bytes_output = copy_for_caller(call, known, block);
    length_output = static_cast<qex_uint32>(block.size());
  });
}

char const *DVSData_Name(DVSDataItem item) {
  char const *name = nullptr;
  simhost::run(__func__, [&](Call &call) {
    if (item != nullptr) {
      name = call.handles().item_behind(item).content.name.c_str();
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
    auto &value = call.handles().item_behind(item).content.property.value;
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
      type = static_cast<qex_uint32>(call.handles().item_behind(item).content.property.type);
    }
  });
  return type;
}

}  // extern "C"
