// Asking the data plane on behalf of those who ask for bytes.
#include "model/ports/runtime_state.h"

#include "base/outcomes.h"
#include "model/lookup.h"
#include "model/plane.h"
#include "model/ports/ports.h"
#include "model/ports/properties.h"
#include "model/properties/properties.h"
#include "qexapi/links.h"
#include "qexapi/switch_ports.h"
#include "storage/store.h"

namespace simhost {
namespace {

storage::Port get_port_key(storage::Transaction &transaction, storage::PropertyOwner const &owner) {
  return storage::get_port_row(transaction, owner.port_number.value());
}

// What is at the port, and whether the link between the two is up.
struct Attached {
  bool in_use;
  bool link_up;
};

Attached attached_to(storage::Transaction &transaction, storage::Port const &port) {
  if (port.kind == storage::PortKind::uplink) {
    auto const uplink = storage::uplink_at(transaction, port.number);
    return {.in_use = uplink.has_value(),
            .link_up = uplink && running_plane().link_is_up(transaction, *uplink)};
  }
  auto const owner = owner_of(port);
  bool const client = find_value(transaction, ports::client, owner).has_value();
  auto const side = find_stored(transaction, owner, ports::link.key);
  bool const side_up = !side || record_of<qex_uint32>(side->value) == QEX_LINK_STATE_UP;
  return {.in_use = client, .link_up = client && side_up};
}

}  // namespace

Bytes read_port_status(storage::Transaction &transaction, storage::PropertyOwner const &owner) {
  auto const port = get_port_key(transaction, owner);
  auto const attached = attached_to(transaction, port);
  bool const blocked = effective(transaction, ports::blocked, owner) != 0;
  qex_NEBPortStatus status{};
  status.flags = (attached.in_use ? qex_uint64{QEX_NEBPORT_STATUS_INUSE} : 0U) |
                 (attached.link_up ? qex_uint64{QEX_NEBPORT_STATUS_LINKUP} : 0U) |
                 (blocked ? qex_uint64{QEX_NEBPORT_STATUS_BLOCKED} : 0U);
  status.portID = static_cast<qex_uint32>(port.number);
  alias_of(transaction, port)
      .value_or(port.identifier)
      .copy(status.displayStr, sizeof status.displayStr - 1);
  return copied(bytes_of(status));
}

Bytes read_link_status(storage::Transaction &transaction, storage::PropertyOwner const &owner) {
  bool const up = attached_to(transaction, get_port_key(transaction, owner)).link_up;
  qex_uint32 const state = up ? QEX_LINK_STATE_UP : QEX_LINK_STATE_DOWN;
  return copied(bytes_of(state));
}

void write_link_status(Setting const &setting) {
  if (get_port_key(setting.transaction, setting.owner).kind == storage::PortKind::uplink) {
    throw Refused(QEX_READ_ONLY);
  }
  storage::put_property(setting.transaction, setting.owner, ports::link.key, setting.value,
                        ports::link.type);
}

Bytes read_port_statistics(storage::Transaction &transaction, storage::PropertyOwner const &owner) {
  auto const counters = running_plane().counters(
      transaction, {.switch_key = owner.switch_key, .port = owner.port_number});
  qex_NEBPortStatistics statistics{};
  show(counters, statistics);
  return copied(bytes_of(statistics));
}

Bytes read_learning_stats(storage::Transaction &transaction, storage::PropertyOwner const &owner) {
  auto const stats = running_plane().learning_stats(
      transaction, {.switch_key = owner.switch_key, .port = owner.port_number});
  return copied(bytes_of(stats));
}

}  // namespace simhost
