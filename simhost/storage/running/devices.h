// The rows of the network devices that uplinks and ports have: what frames come and go through.
#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "storage/ports.h"

namespace simhost::storage {

using MacBytes = std::array<std::byte, 6>;

/// Of an uplink or of a port that is no uplink port.
struct Device {
  std::string name;
  /// By which the data path knows it: unique on the host, 1 to 65,213; kept while the device stays.
  std::uint16_t number = 0;
  /// The address of the client that a port reaches through it, if it is known.
  std::optional<MacBytes> mac = std::nullopt;

  bool operator==(Device const &) const = default;
};

/// What has a device: an uplink, a port, or else the underlay.
struct DeviceHolder {
  std::optional<std::string> uplink;
  std::optional<PortNumber> port;
};

struct PortDevice {
  PortNumber port;
  Device device;
};

std::optional<Device> device_of(Transaction &transaction, std::string_view uplink);
std::optional<Device> device_of(Transaction &transaction, PortNumber port);
/// The devices of a switch's ports that are no uplink ports, in the order of the ports.
std::vector<PortDevice> port_devices(Transaction &transaction, SwitchKey key);
/// Whether there are any.
bool has_port_device(Transaction &transaction, SwitchKey key);
/// Whose device `name` is.
std::optional<DeviceHolder> find_device(Transaction &transaction, std::string_view name);
/// The name of a device that an uplink or a port has, if any has one.
std::optional<std::string> first_device(Transaction &transaction);

/// Replaces what was there, by a device of the same name in place. No two have one device. The
/// number is chosen; false if there is none left.
bool put_device(ChangingTransaction &transaction, std::string_view uplink, std::string_view device);
bool put_device(ChangingTransaction &transaction, PortNumber port, std::string_view device,
                std::optional<MacBytes> const &mac);
void remove_device(ChangingTransaction &transaction, std::string_view uplink);
void remove_device(ChangingTransaction &transaction, PortNumber port);

}  // namespace simhost::storage
