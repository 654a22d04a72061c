// A device is one uplink's or one port's, and time and wires are real wherever there is one.
#include "model/devices/devices.h"

#include <fmt/format.h>

#include <algorithm>

#include "base/outcomes.h"
#include "clock/clock.h"
#include "model/lookup.h"
#include "storage/store.h"

namespace simhost {
namespace {

// IFNAMSIZ of Linux, without the NUL.
constexpr std::size_t kLongestDevice = 15;

// Names that Linux takes, and Open vSwitch bears as well.
void check_name(std::string_view name) {
  auto const is_fit = [](char character) {
    auto const byte = static_cast<unsigned char>(character);
    return byte > ' ' && byte < 0x7F && character != '/' && character != ':' && character != '"' &&
           character != '\\';
  };
  if (name.empty() || name.size() > kLongestDevice || name == "." || name == ".." ||
      !std::ranges::all_of(name, is_fit)) {
    throw Refused(QEX_INVALID_NAME, fmt::format("'{}' is no name of a network device", name));
  }
}

void check_client(storage::MacBytes const &mac) {
  bool const is_zero = std::ranges::all_of(mac, [](auto byte) { return byte == std::byte{}; });
  if (is_zero || (mac.front() & std::byte{1}) != std::byte{}) {
    throw Refused(QEX_INVALID_ADDRESS, "no client has a multicast or zero address");
  }
}

std::string text_of(storage::Transaction &transaction, storage::DeviceHolder const &holder) {
  if (holder.uplink) {
    return fmt::format("the uplink '{}'", *holder.uplink);
  }
  if (!holder.port) {
    return "the underlay";
  }
  auto const port = storage::get_port_row(transaction, *holder.port);
  return fmt::format("the port '{}' of the switch '{}'", port.identifier,
                     storage::get_switch_row(transaction, port.switch_key).row.alias);
}

void check_free(storage::Transaction &transaction, std::string_view name,
                storage::DeviceHolder const &wanting) {
  auto const holder = storage::find_device(transaction, name);
  if (holder && (holder->uplink != wanting.uplink || holder->port != wanting.port)) {
    throw Refused(QEX_BUSY,
                  fmt::format("the device {} is at {}", name, text_of(transaction, *holder)));
  }
}

void check(storage::Transaction &transaction, std::string_view name,
           storage::DeviceHolder const &wanting) {
  check_name(name);
  check_free(transaction, name, wanting);
  require_real_time(transaction);
  running_plane().check_device(transaction, name);
}

void require_number(bool found) {
  if (!found) {
    throw Refused(QEX_NO_RESOURCES, "there is no number for another device");
  }
}

[[noreturn]] void refuse_tunnels(std::string_view uplink) {
  throw Refused(
      QEX_NOT_SUPPORTED,
      fmt::format("the uplink '{}' is tunnels: what comes over it cannot be set", uplink));
}

[[noreturn]] void refuse_wires(std::string_view owner, std::string_view device) {
  throw Refused(
      QEX_NOT_SUPPORTED,
      fmt::format("{} has the device {}: what comes over it cannot be set", owner, device));
}

}  // namespace

void require_real_time(storage::Transaction &transaction) {
  if (clock_is_stopped(transaction)) {
    throw Refused(QEX_NOT_SUPPORTED, "the clock stands, and frames go by real time");
  }
}

void check_underlay_device(storage::Transaction &transaction, std::string_view device) {
  check(transaction, device, {.uplink = std::nullopt, .port = std::nullopt});
}

void connect(storage::ChangingTransaction &transaction, storage::Port const &port,
             std::string_view device, std::optional<storage::MacBytes> const &mac) {
  if (port.kind == storage::PortKind::uplink) {
    throw Refused(QEX_NOT_SUPPORTED, "an uplink port has no device, its uplink has");
  }
  check(transaction, device, {.uplink = std::nullopt, .port = port.number});
  if (mac) {
    check_client(*mac);
  }
  require_number(storage::put_device(transaction, port.number, device, mac));
}

void disconnect(storage::ChangingTransaction &transaction, storage::Port const &port) {
  if (!storage::device_of(transaction, port.number)) {
    throw Refused(QEX_IS_DISCONNECTED, fmt::format("the port '{}' has no device", port.identifier));
  }
  storage::remove_device(transaction, port.number);
}

void connect(storage::ChangingTransaction &transaction, storage::Uplink const &uplink,
             std::string_view device) {
  if (storage::fabric_of(transaction, uplink.name)) {
    throw Refused(QEX_NOT_SUPPORTED,
                  fmt::format("the uplink '{}' is tunnels, and has no device", uplink.name));
  }
  check(transaction, device, {.uplink = uplink.name, .port = std::nullopt});
  require_number(storage::put_device(transaction, uplink.name, device));
}

void disconnect(storage::ChangingTransaction &transaction, storage::Uplink const &uplink) {
  if (!storage::device_of(transaction, uplink.name)) {
    throw Refused(QEX_IS_DISCONNECTED, fmt::format("the uplink '{}' has no device", uplink.name));
  }
  storage::remove_device(transaction, uplink.name);
}

Wires &get_wires(storage::Transaction &transaction, std::string_view uplink) {
  if (auto const device = storage::device_of(transaction, uplink)) {
    refuse_wires(fmt::format("the uplink '{}'", uplink), device->name);
  }
  if (storage::fabric_of(transaction, uplink)) {
    refuse_tunnels(uplink);
  }
  return get_wires();
}

Wires &get_wires(storage::Transaction &transaction, Place const &place) {
  if (!place.port) {
    for (auto const &uplink : storage::uplinks_of(transaction, place.switch_key)) {
      get_wires(transaction, uplink.name);
    }
  } else if (auto const uplink = storage::uplink_at(transaction, *place.port)) {
    get_wires(transaction, *uplink);
  } else if (auto const device = storage::device_of(transaction, *place.port)) {
    refuse_wires(text_of(transaction, {.uplink = std::nullopt, .port = place.port}), device->name);
  }
  return get_wires();
}

Wires &get_wires(storage::Transaction &transaction, CounterOwner const &owner) {
  if (!owner.session.empty()) {
    for (auto const &[port, device] : storage::port_devices(transaction, owner.switch_key)) {
      get_wires(transaction, Place{.switch_key = owner.switch_key, .port = port});
    }
  }
  return get_wires(transaction, Place{.switch_key = owner.switch_key, .port = owner.port});
}

void stop_clock_without_devices(storage::ChangingTransaction &transaction) {
  if (auto const device = storage::first_device(transaction)) {
    throw Refused(QEX_NOT_SUPPORTED,
                  fmt::format("the frames of the device {} go by real time", *device));
  }
  if (auto const uplink = storage::first_fabric(transaction)) {
    throw Refused(QEX_NOT_SUPPORTED,
                  fmt::format("the frames of the tunnels '{}' go by real time", *uplink));
  }
  stop_clock(transaction);
}

}  // namespace simhost
