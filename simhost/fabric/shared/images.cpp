// What is stored, as it is stored: nothing is read out of it.
#include <algorithm>
#include <utility>

#include "base/blocks.h"
#include "fabric/shared/settings.h"
#include "storage/properties.h"
#include "storage/running/addresses.h"
#include "storage/running/devices.h"
#include "storage/store.h"

namespace simhost::fabric {
namespace {

using storage::PropertyType;
using storage::Transaction;

// What is the image of a port.
struct Parts {
  std::string external_id;
  bool has_device = false;
  std::vector<storage::NamedProperty> properties;
  std::vector<storage::Address> addresses;
};

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

Bytes joined(Parts const &parts) {
  Writer writer;
  writer.text(parts.external_id);
  writer.number(parts.has_device ? 1 : 0);
  write_properties(writer, parts.properties);
  write_addresses(writer, parts.addresses);
  return writer.block(BlockKind::port_state, 0);
}

// The static and user addresses of a port, or of the team.
std::vector<storage::Address> addresses_at(Transaction &transaction, storage::SwitchKey key,
                                           std::optional<storage::PortNumber> port) {
  std::vector<storage::Address> all;
  for (auto const &placed : storage::fixed_addresses(transaction, key)) {
    if (placed.port == port) {
      all.push_back(placed.address);
    }
  }
  return all;
}

}  // namespace

Bytes image_of(Transaction &transaction, storage::FoundSwitch const &found) {
  Writer writer;
  writer.text(found.row.alias);
  writer.number(found.row.max_ports);
  writer.number(found.row.version);
  write_properties(writer,
                   storage::properties_of(transaction, storage::PropertyOwner::global(found.key)));
  write_addresses(writer, addresses_at(transaction, found.key, std::nullopt));
  return writer.block(BlockKind::state, 0);
}

Bytes image_of(Transaction &transaction, storage::Port const &port) {
  auto const owner = storage::PropertyOwner::port(port.switch_key, port.number);
  return joined({.external_id = storage::external_id_of(transaction, port.number),
                 .has_device = storage::device_of(transaction, port.number).has_value(),
                 .properties = storage::properties_of(transaction, owner),
                 .addresses = addresses_at(transaction, port.switch_key, port.number)});
}

std::map<storage::PortNumber, Bytes> images_of_ports(Transaction &transaction,
                                                     storage::SwitchKey key) {
  std::map<storage::PortNumber, Parts> all;
  for (auto const number : storage::client_numbers(transaction, key)) {
    all[number];
  }
  for (auto &[number, external] : storage::external_ids(transaction, key)) {
    all[number].external_id = external;
  }
  for (auto const &[number, device] : storage::port_devices(transaction, key)) {
    all[number].has_device = true;
  }
  for (auto &owned : storage::properties_of_ports(transaction, key)) {
    all[owned.port].properties.push_back(std::move(owned.named));
  }
  for (auto const &placed : storage::fixed_addresses(transaction, key)) {
    if (placed.port) {
      all[*placed.port].addresses.push_back(placed.address);
    }
  }
  std::map<storage::PortNumber, Bytes> images;
  for (auto const &[number, parts] : all) {
    images[number] = joined(parts);
  }
  return images;
}

}  // namespace simhost::fabric
