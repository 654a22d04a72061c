// What is stored, as it is stored: nothing is read out of it.
#include <algorithm>
#include <cstdint>
#include <utility>

#include "base/blocks.h"
#include "fabric/shared/settings.h"
#include "storage/properties.h"
#include "storage/running/addresses.h"
#include "storage/running/devices.h"
#include "storage/store.h"
#include "storage/tunnels/fabrics.h"

namespace simhost::fabric {
namespace {

using storage::PropertyType;
using storage::Transaction;

void write_properties(Writer &writer, std::vector<storage::NamedProperty> const &properties) {
  for (auto const &[name, property] : properties) {
    if (property.type == PropertyType::config || property.type == PropertyType::policy) {
      writer.text(name);
      writer.number(static_cast<std::uint32_t>(property.type));
      writer.bytes(property.value);
    }
  }
}

void write_addresses(Writer &writer, std::vector<storage::Address> const &addresses) {
  for (auto const &address : addresses) {
    writer.bytes(address.name.mac);
    writer.number(address.name.vid);
    writer.number(address.name.vni);
    writer.number(address.type);
  }
}

void write_fabric(Writer &writer, storage::Fabric const &fabric) {
  writer.number(static_cast<std::uint32_t>(fabric.encapsulation));
  writer.number(fabric.key);
  for (auto const &peer : fabric.peers) {
    writer.bytes(peer);
  }
}

}  // namespace

Bytes image_of(Transaction &transaction, storage::FoundSwitch const &found) {
  Writer writer;
  writer.text(found.row.alias);
  writer.number(found.row.max_ports);
  writer.number(found.row.version);
  write_properties(writer,
                   storage::properties_of(transaction, storage::PropertyOwner::global(found.key)));
  write_addresses(writer, storage::fixed_addresses(
                              transaction, {.switch_key = found.key, .port = std::nullopt}));
  if (auto const fabric = storage::fabric_of(transaction, found.key)) {
    write_fabric(writer, *fabric);
  }
  return writer.block(BlockKind::state, 0);
}

Bytes image_of(Transaction &transaction, storage::Port const &port) {
  Writer writer;
  writer.text(storage::external_id_of(transaction, port.number));
  writer.number(storage::device_of(transaction, port.number) ? 1 : 0);
  write_properties(writer, storage::properties_of(transaction, storage::PropertyOwner::port(
                                                                   port.switch_key, port.number)));
  write_addresses(writer, storage::fixed_addresses(
                              transaction, {.switch_key = port.switch_key, .port = port.number}));
  return writer.block(BlockKind::port_state, 0);
}

}  // namespace simhost::fabric
