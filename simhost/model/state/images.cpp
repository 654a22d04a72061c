// Images hold what callers set; what the host derives from it is derived again.
#include "model/state/images.h"

#include <string>
#include <vector>

#include "base/blocks.h"
#include "base/outcomes.h"
#include "model/lookup.h"
#include "model/ports/ports.h"
#include "model/properties/properties.h"
#include "model/switches/properties.h"
#include "model/switches/switches.h"
#include "storage/shared.h"
#include "storage/store.h"
#include "storage/switches.h"

namespace simhost {
namespace {

using storage::PropertyOwner;

bool belongs(storage::PropertyType type, Extent extent) {
  return extent == Extent::whole || type == storage::PropertyType::config ||
         type == storage::PropertyType::policy;
}

void write_properties(Writer &writer, storage::Transaction &transaction, PropertyOwner const &owner,
                      Extent extent) {
  auto all = list_stored(transaction, owner);
  std::erase_if(all, [&](storage::NamedProperty const &named) {
    return !belongs(named.property.type, extent);
  });
  writer.number(static_cast<std::uint32_t>(all.size()));
  for (auto const &[name, property] : all) {
    writer.text(name);
    writer.number(static_cast<std::uint32_t>(property.type));
    writer.bytes(property.value);
  }
}

void read_properties(Reader &reader, storage::ChangingTransaction &transaction,
                     PropertyOwner const &owner) {
  for (auto left = reader.number(); left != 0; --left) {
    auto const name = reader.text();
    auto const type = property_type(reader.number());
    set_property(transaction, owner, name, reader.bytes(), type);
  }
}

void write_port(Writer &writer, storage::Transaction &transaction, storage::Port const &port,
                Extent extent) {
  writer.text(port.identifier);
  writer.number(port.kind == storage::PortKind::uplink ? 1 : 0);
  writer.text(storage::external_id_of(transaction, port.number));
  writer.text(storage::uplink_at(transaction, port.number).value_or(""));
  write_properties(writer, transaction, owner_of(port), extent);
}

// An uplink that is not here, or is somewhere else by now, is left where it is.
void attach_if_free(storage::ChangingTransaction &transaction, std::string const &uplink,
                    storage::PortNumber port) {
  auto const found = storage::find_uplink(transaction, uplink);
  if (found && !found->port) {
    storage::attach_uplink(transaction, uplink, port);
  }
}

void read_port(Reader &reader, storage::ChangingTransaction &transaction,
               storage::SwitchKey switch_key) {
  auto const identifier = reader.text();
  bool const is_uplink = reader.number() != 0;
  auto const port = is_uplink ? add_vacant_uplink_port(transaction, switch_key, identifier)
                              : add_client_port(transaction, switch_key, identifier);
  if (auto const external = reader.text(); !external.empty()) {
    set_external_id(transaction, port, external);
  }
  if (auto const uplink = reader.text(); is_uplink && !uplink.empty()) {
    attach_if_free(transaction, uplink, port.number);
  }
  read_properties(reader, transaction, owner_of(port));
}

void write_switch(Writer &writer, storage::Transaction &transaction,
                  storage::FoundSwitch const &found, Extent extent) {
  auto const &[key, row] = found;
  writer.text(row.alias);
  writer.text(row.identifier);
  writer.text(row.portset);
  writer.number(row.max_ports);
  writer.number(row.version);
  writer.number(row.persistent ? 1 : 0);
  writer.number(row.associated ? 1 : 0);
  write_properties(writer, transaction, PropertyOwner::global(key), extent);
  write_properties(writer, transaction, PropertyOwner::host(key), extent);
  auto const ports = storage::ports_of(transaction, key);
  writer.number(static_cast<std::uint32_t>(ports.size()));
  for (auto const &port : ports) {
    write_port(writer, transaction, port, extent);
  }
}

void skip_properties(Reader &reader) {
  for (auto left = reader.number(); left != 0; --left) {
    reader.text();
    reader.number();
    reader.bytes();
  }
}

// What comes after the head of a switch.
void skip_content(Reader &reader) {
  skip_properties(reader);
  skip_properties(reader);
  for (auto left = reader.number(); left != 0; --left) {
    reader.text();
    reader.number();
    reader.text();
    reader.text();
    skip_properties(reader);
  }
}

// One that is shared is as the hosts that share it decided.
void read_switch(Reader &reader, storage::ChangingTransaction &transaction) {
  auto const alias = reader.text();
  auto const identifier = reader.text();
  auto const portset = reader.text();
  auto const max_ports = reader.number();
  auto const version = reader.number();
  bool const persistent = reader.number() != 0;
  bool const associated = reader.number() != 0;
  if (storage::is_shared(transaction, identifier)) {
    skip_content(reader);
    return;
  }
  auto const key = create_switch(transaction, {.alias = alias,
                                               .identifier = identifier,
                                               .portset = portset,
                                               .max_ports = max_ports,
                                               .persistent = persistent,
                                               .version = version,
                                               .associated = associated});
  // A new switch has an MTU, and one that was written may not.
  clear(transaction, switches::mtu, PropertyOwner::global(key));
  read_properties(reader, transaction, PropertyOwner::global(key));
  read_properties(reader, transaction, PropertyOwner::host(key));
  for (auto left = reader.number(); left != 0; --left) {
    read_port(reader, transaction, key);
  }
}

}  // namespace

Bytes state_image(storage::Transaction &transaction, Extent extent) {
  auto all = storage::all_switches(transaction);
  if (extent == Extent::persistent) {
    std::erase_if(all, [](storage::FoundSwitch const &found) { return !found.row.persistent; });
  }
  Writer writer;
  writer.number(static_cast<std::uint32_t>(all.size()));
  for (auto const &found : all) {
    write_switch(writer, transaction, found, extent);
  }
  return writer.block(extent == Extent::whole ? BlockKind::state : BlockKind::persistent_state, 0);
}

void load_state(storage::ChangingTransaction &transaction, BytesView image, Extent extent) {
  Reader reader(image);
  bool const fits = reader.kind() == BlockKind::persistent_state ||
                    (reader.kind() == BlockKind::state && extent == Extent::whole);
  if (!fits) {
    throw Refused(QEX_BAD_PARAM);
  }
  clear_state(transaction);
  for (auto left = reader.number(); left != 0; --left) {
    read_switch(reader, transaction);
  }
  reader.end();
}

void clear_state(storage::ChangingTransaction &transaction) {
  for (auto const &found : storage::all_switches(transaction)) {
    if (!storage::is_shared(transaction, found.row.identifier)) {
      storage::remove_switch(transaction, found.key);
    }
  }
}

void sanitize_state(storage::ChangingTransaction &transaction) {
  for (auto const &[key, row] : storage::all_switches(transaction)) {
    bool const is_shared = storage::is_shared(transaction, row.identifier);
    if (!row.associated && !row.persistent && !is_shared) {
      storage::remove_switch(transaction, key);
      continue;
    }
    for (auto const &port : storage::ports_of(transaction, key)) {
      bool const is_own = !is_shared || port.kind == storage::PortKind::uplink;
      if (is_own && type_of(transaction, port) == DVSPORT_TYPE_ZOMBIE) {
        storage::remove_port(transaction, port.number);
      }
    }
  }
}

Bytes port_image(storage::Transaction &transaction, storage::Port const &port, Extent extent,
                 std::uint32_t version) {
  if (version == 0) {
    throw Refused(QEX_BAD_PARAM);
  }
  Writer writer;
  write_properties(writer, transaction, owner_of(port), extent);
  return writer.block(BlockKind::port_state, version);
}

void load_port(storage::ChangingTransaction &transaction, storage::Port const &port,
               BytesView image) {
  Reader reader(image);
  if (reader.kind() != BlockKind::port_state) {
    throw Refused(QEX_BAD_PARAM);
  }
  read_properties(reader, transaction, owner_of(port));
  reader.end();
}

}  // namespace simhost
