// Bodies of the methods of the uplink lists; see uplinks.h.

#include "helpers/uplinks.h"

#include <cstdlib>

#include "helpers/slots.h"

namespace {

/// A record with room for `count` trailing slots; a negative count asks for more than there is.
template <typename Record>
Record *allocate(int count, size_t slot_size) {
  return static_cast<Record *>(
      std::malloc(sizeof(Record) + static_cast<size_t>(count) * slot_size));
}

template <typename Record>
Record *ports_new(int count, size_t slot_size) {
  auto *const record = allocate<Record>(count, slot_size);
  if (record != nullptr) {
    record->nUplinkPorts = static_cast<qex_uint32>(count);
  }
  return record;
}

VSUplinks_entries *entry_at(VSUplinks *uplinks, int index) {
  return index_is_valid(index, uplinks->numEntries)
             ? element_at<VSUplinks_entries>(uplinks + 1, index)
             : nullptr;
}

using PortName = char[QEX_NEB_NAME_MAX_LEN];
using PortId = char[QEX_NEB_PORT_ID_MAX_LEN];

PortName *name_at(VSUplinkPorts *ports, int index) {
  return index_is_valid(index, ports->nUplinkPorts) ? element_at<PortName>(ports + 1, index)
                                                    : nullptr;
}

PortId *id_at(VSUplinkPortIds *ids, int index) {
  return index_is_valid(index, ids->nUplinkPorts) ? element_at<PortId>(ids + 1, index) : nullptr;
}

}  // namespace

extern "C" {

VSUplinks *uplinks_new(int count) {
  auto *const uplinks = allocate<VSUplinks>(count, sizeof(qex_Name));
  if (uplinks != nullptr) {
    uplinks->numEntries = static_cast<qex_uint32>(count);
  }
  return uplinks;
}

VSUplinkPorts *uplink_ports_new(int count) {
  return ports_new<VSUplinkPorts>(count, sizeof(PortName));
}

VSUplinkPortIds *uplink_port_ids_new(int count) {
  return ports_new<VSUplinkPortIds>(count, sizeof(PortId));
}

char const *uplinks_name_at(VSUplinks *uplinks, int index) {
  VSUplinks_entries const *const entry = entry_at(uplinks, index);
  return entry != nullptr ? entry->name.string : nullptr;
}

char const *uplink_ports_name_at(VSUplinkPorts *ports, int index) {
  PortName const *const name = name_at(ports, index);
  return name != nullptr ? *name : nullptr;
}

char const *uplink_port_ids_id_at(VSUplinkPortIds *ids, int index) {
  PortId const *const id = id_at(ids, index);
  return id != nullptr ? *id : nullptr;
}

void uplinks_set_name_at(VSUplinks *uplinks, int index, char const *name) {
  VSUplinks_entries *const entry = entry_at(uplinks, index);
  if (entry != nullptr) {
    fill_slot(entry->name.string, name);
  }
}

void uplink_ports_set_name_at(VSUplinkPorts *ports, int index, char const *name) {
  PortName *const slot = name_at(ports, index);
  if (slot != nullptr) {
    fill_slot(*slot, name);
  }
}

void uplink_port_ids_set_id_at(VSUplinkPortIds *ids, int index, char const *id) {
  PortId *const slot = id_at(ids, index);
  if (slot != nullptr) {
    fill_slot(*slot, id);
  }
}

}  // extern "C"
