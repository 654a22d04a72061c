// DVSQEX_*: properties by their keys, one by one and as lists.
#include <array>

#include "abi/boundary.h"
#include "abi/data_lists.h"
#include "abi/libnebPublic/arguments.h"
#include "abi/targets.h"
#include "model/lookup.h"
#include "model/ports/ports.h"
#include "model/properties/properties.h"
#include "nebpublic/kernel_state.h"
#include "storage/store.h"

namespace simhost {
namespace {

// The owners that are neither a whole switch nor a port by its identifier.
struct HostPart {
  NamedSwitch owner;
};
struct NumberedUplinkPort {
  NamedSwitch owner;
  qex_uint32 number;
};

storage::PropertyOwner owner_of(storage::Transaction &transaction, HostPart const &target) {
  return storage::PropertyOwner::host(get_target(transaction, target.owner));
}
storage::PropertyOwner owner_of(storage::Transaction &transaction,
                                NumberedUplinkPort const &target) {
  auto const key = get_target(transaction, target.owner);
  return simhost::owner_of(get_uplink_port(transaction, key, target.number));
}

template <typename Target>
void get(ReadingCall &call, Target const &target, char const *key, void **data, int *length) {
  auto const name = require_text(key);
  auto const output = output_at(data, length);
  auto &transaction = call.transaction();
  auto const property = simhost::find_property(transaction, owner_of(transaction, target), name);
  if (!property) {
    refuse(QEX_NOT_FOUND);
  }
  allocate_copy(call, output, property->value);
}

template <typename Target>
void set(ChangingCall &call, Target const &target, char const *key, void const *data, int length,
         qex_uint32 type) {
  auto const name = require_text(key);
  auto const value = argument_bytes(data, length);
  auto const wanted_type = property_type(type);
  auto &transaction = call.transaction();
  set_property(transaction, owner_of(transaction, target), name, value, wanted_type);
}

template <typename Target>
void clear(ChangingCall &call, Target const &target, char const *key) {
  auto const name = require_text(key);
  auto &transaction = call.transaction();
  clear_property(transaction, owner_of(transaction, target), name);
}

// Which properties a list is to have.
struct Choice {
  KeyFamily family;
  qex_uint32 types;
};

void add_chosen(DataList &list, storage::Transaction &transaction,
                storage::PropertyOwner const &owner, Choice const &choice) {
  for (auto const &[name, property] : list_properties(transaction, owner)) {
    if (family_of(name) == choice.family &&
        (static_cast<qex_uint32>(property.type) & choice.types) != 0) {
      add_item(list, name, property.value, property.type);
    }
  }
}

// A list in the host's own memory of what the owners have; where two have it, of the last.
template <typename... Targets>
void make_list(ReadingCall &call, DVSDataHandle *output, Choice const &choice,
               Targets const &...targets) {
  auto &handle = require(output);
  if (choice.types == 0 || (choice.types & ~qex_uint32{ALL_PROP_TYPE}) != 0) {
    refuse(QEX_BAD_PARAM);
  }
  auto &transaction = call.transaction();
  std::array const owners{owner_of(transaction, targets)...};
  auto made = make_list_of_host();
  for (auto const &owner : owners) {
    add_chosen(*made, transaction, owner, choice);
  }
  call.lists().add(made.get(), call.name());
  handle = made.release();
}

}  // namespace

extern "C" {

QEX_ReturnStatus DVSQEX_GlobalPropGet(char const *switchId, char const *key, void **data,
                                      int *length) {
  return reading(__func__, [&](ReadingCall &call) {
    get(call, switch_identified(switchId), key, data, length);
  });
}

QEX_ReturnStatus DVSQEX_GlobalPropSet(char const *switchId, char const *key, void *data, int length,
                                      qex_uint32 propertyType) {
  return changing(__func__, [&](ChangingCall &call) {
    set(call, switch_identified(switchId), key, data, length, propertyType);
  });
}

QEX_ReturnStatus DVSQEX_GlobalPropClear(char const *switchId, char const *key) {
  return changing(__func__,
                  [&](ChangingCall &call) { clear(call, switch_identified(switchId), key); });
}

QEX_ReturnStatus DVSQEX_HostPropGet(char const *switchId, char const *key, void **data,
                                    int *length) {
  return reading(__func__, [&](ReadingCall &call) {
    get(call, HostPart{switch_identified(switchId)}, key, data, length);
  });
}

QEX_ReturnStatus DVSQEX_HostPropSet(char const *switchId, char const *key, void *data, int length,
                                    qex_uint32 propertyType) {
  return changing(__func__, [&](ChangingCall &call) {
    set(call, HostPart{switch_identified(switchId)}, key, data, length, propertyType);
  });
}

QEX_ReturnStatus DVSQEX_HostPropClear(char const *switchId, char const *key) {
  return changing(__func__, [&](ChangingCall &call) {
    clear(call, HostPart{switch_identified(switchId)}, key);
  });
}

QEX_ReturnStatus DVSQEX_PortDataGet(char const *switchId, char const *port, char const *key,
                                    void **data, int *length) {
  return reading(__func__, [&](ReadingCall &call) {
    get(call, port_of(switch_identified(switchId), port), key, data, length);
  });
}

QEX_ReturnStatus DVSQEX_PortDataSet(char const *switchId, char const *port, char const *key,
                                    void *data, int length, qex_uint32 propertyType) {
  return changing(__func__, [&](ChangingCall &call) {
    set(call, port_of(switch_identified(switchId), port), key, data, length, propertyType);
  });
}

QEX_ReturnStatus DVSQEX_PortDataClear(char const *switchId, char const *port, char const *key) {
  return changing(__func__, [&](ChangingCall &call) {
    clear(call, port_of(switch_identified(switchId), port), key);
  });
}

QEX_ReturnStatus DVSQEX_UplinkDataGet(char const *switchId, char const *key, qex_uint32 portID,
                                      void **data, int *length) {
  return reading(__func__, [&](ReadingCall &call) {
    get(call, NumberedUplinkPort{switch_identified(switchId), portID}, key, data, length);
  });
}

QEX_ReturnStatus DVSQEX_UplinkDataSet(char const *switchId, char const *key, qex_uint32 portID,
                                      void *data, int length, qex_uint32 propertyType) {
  return changing(__func__, [&](ChangingCall &call) {
    set(call, NumberedUplinkPort{switch_identified(switchId), portID}, key, data, length,
        propertyType);
  });
}

QEX_ReturnStatus DVSQEX_VendorGlobalPropList(char const *switchId, DVSDataHandle *list,
                                             qex_uint32 propertyTypes) {
  return reading(__func__, [&](ReadingCall &call) {
    make_list(call, list, {KeyFamily::vendor, propertyTypes}, switch_identified(switchId));
  });
}

QEX_ReturnStatus DVSQEX_VendorHostPropList(char const *switchId, DVSDataHandle *list,
                                           qex_uint32 propertyTypes) {
  return reading(__func__, [&](ReadingCall &call) {
    make_list(call, list, {KeyFamily::vendor, propertyTypes},
              HostPart{switch_identified(switchId)});
  });
}

QEX_ReturnStatus DVSQEX_VendorPortPropList(char const *switchId, char const *port,
                                           DVSDataHandle *list, qex_uint32 propertyTypes) {
  return reading(__func__, [&](ReadingCall &call) {
    make_list(call, list, {KeyFamily::vendor, propertyTypes},
              port_of(switch_identified(switchId), port));
  });
}

QEX_ReturnStatus DVSQEX_ExtraConfigPropList(char const *switchId, DVSDataHandle *list,
                                            qex_uint32 propertyTypes) {
  return reading(__func__, [&](ReadingCall &call) {
    auto const target = switch_identified(switchId);
    make_list(call, list, {KeyFamily::extra, propertyTypes}, target, HostPart{target});
  });
}

QEX_ReturnStatus DVSQEX_ExtraConfigPortPropList(char const *switchId, char const *port,
                                                DVSDataHandle *list, qex_uint32 propertyTypes) {
  return reading(__func__, [&](ReadingCall &call) {
    make_list(call, list, {KeyFamily::extra, propertyTypes},
              port_of(switch_identified(switchId), port));
  });
}

}  // extern "C"
}  // namespace simhost
