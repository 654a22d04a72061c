// Device rows in SQL.
#include "storage/running/devices.h"

#include <algorithm>

#include "storage/query.h"

namespace simhost::storage {
namespace {

// What a device is read with; a macro, so that a statement is one literal.
#define SELECT_DEVICE "SELECT device.name, device.number, device.mac"

// Of a row that SELECT_DEVICE finds.
Device device_at(Query const &row) {
  Device device{.name = row.name(0), .number = row.number<std::uint16_t>(1)};
  if (!row.is_null(2)) {
    auto const bytes = row.bytes(2, std::tuple_size_v<MacBytes>);
    std::ranges::copy(bytes, device.mac.emplace().begin());
  }
  return device;
}

// One that was not used lately, as long as there are such: frames of the device that had it may
// still be on their way.
std::optional<std::int64_t> next_number(Transaction &transaction) {
  Query select(transaction,
               "SELECT ifnull(max(number), 0) + 1 FROM device"
               " HAVING ifnull(max(number), 0) < 65213"
               " UNION ALL SELECT * FROM (SELECT here.number + 1 FROM"
               " (SELECT 0 AS number UNION ALL SELECT number FROM device) AS here"
               " WHERE NOT EXISTS (SELECT 1 FROM device WHERE number = here.number + 1)"
               " AND here.number < 65213 ORDER BY here.number LIMIT 1) LIMIT 1");
  return select.first([](Query const &row) { return row.integer(0); });
}

}  // namespace

std::optional<Device> device_of(Transaction &transaction, std::string_view uplink) {
  Query select(transaction, SELECT_DEVICE " FROM device WHERE uplink = ?");
  return select.with(uplink).first(device_at);
}

std::optional<Device> device_of(Transaction &transaction, PortNumber port) {
  Query select(transaction, SELECT_DEVICE " FROM device WHERE port = ?");
  return select.with(port).first(device_at);
}

std::vector<PortDevice> port_devices(Transaction &transaction, SwitchKey key) {
  Query select(transaction, SELECT_DEVICE
               ", port.number FROM port"
               " JOIN device ON device.port = port.number"
               " WHERE port.switch = ? ORDER BY port.number");
  return select.with(key).all([](Query const &row) {
    return PortDevice{.port = row.port_number(3), .device = device_at(row)};
  });
}

bool has_port_device(Transaction &transaction, SwitchKey key) {
  Query select(transaction,
               "SELECT 1 FROM port JOIN device ON device.port = port.number"
               " WHERE port.switch = ? LIMIT 1");
  return select.with(key).next();
}

std::optional<DeviceHolder> find_device(Transaction &transaction, std::string_view name) {
  Query select(transaction,
               "SELECT uplink, port FROM device WHERE name = ?1"
               " UNION ALL SELECT NULL, NULL FROM underlay WHERE device = ?1");
  return select.with(name).first([](Query const &row) {
    DeviceHolder holder;
    if (!row.is_null(0)) {
      holder.uplink = row.name(0);
    } else if (!row.is_null(1)) {
      holder.port = row.port_number(1);
    }
    return holder;
  });
}

std::optional<std::string> first_device(Transaction &transaction) {
  Query select(transaction, "SELECT name FROM device ORDER BY name LIMIT 1");
  return select.first([](Query const &row) { return row.name(0); });
}

bool put_device(ChangingTransaction &transaction, std::string_view uplink,
                std::string_view device) {
  if (auto const present = device_of(transaction, uplink); present && present->name == device) {
    return true;
  }
  remove_device(transaction, uplink);
  auto const number = next_number(transaction);
  if (number) {
    Change insert(transaction, "INSERT INTO device (number, name, uplink) VALUES (?, ?, ?)");
    insert.with(*number).with(device).with(uplink).run();
  }
  return number.has_value();
}

bool put_device(ChangingTransaction &transaction, PortNumber port, std::string_view device,
                std::optional<MacBytes> const &mac) {
  if (auto const present = device_of(transaction, port); !present || present->name != device) {
    remove_device(transaction, port);
    auto const number = next_number(transaction);
    if (!number) {
      return false;
    }
    Change insert(transaction, "INSERT INTO device (number, name, port) VALUES (?, ?, ?)");
    insert.with(*number).with(device).with(port).run();
  }
  if (mac) {
    Change update(transaction, "UPDATE device SET mac = ? WHERE port = ?");
    update.with(std::span<std::byte const>(*mac)).with(port).run();
  } else {
    Change(transaction, "UPDATE device SET mac = NULL WHERE port = ?").with(port).run();
  }
  return true;
}

void remove_device(ChangingTransaction &transaction, std::string_view uplink) {
  Change(transaction, "DELETE FROM device WHERE uplink = ?").with(uplink).run();
}

void remove_device(ChangingTransaction &transaction, PortNumber port) {
  Change(transaction, "DELETE FROM device WHERE port = ?").with(port).run();
}

}  // namespace simhost::storage
