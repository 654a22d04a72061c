// Teams follow what is kept of the links, and who is moved by that is announced when frames go so.
#include "daemon/devices/links.h"

#include <fmt/format.h>

#include <system_error>
#include <vector>

#include "model/teaming/team.h"
#include "storage/running/devices.h"
#include "storage/running/links.h"

namespace simhost::daemon {
namespace {

using storage::Link;

// The link as it is in the state, with what the device says in place of it.
Link link_by_device(Link link, std::string const &device, NetworkDevices const &devices) {
  auto const found = devices.find(device);
  link.driver = found.has_value();
  link.carrier = found && found->has_link;
  if (!link.carrier) {
    link.error_percent = 0;  // the wire that is there next may be another one
  }
  if (found) {
    auto const speed = wire_speed(device);
    link.full_duplex = speed.full_duplex;
    link.speed = speed.mbits.value_or(link.speed);
  }
  return link;
}

bool is_same(Link const &one, Link const &other) {
  return one.carrier == other.carrier && one.driver == other.driver && one.speed == other.speed &&
         one.full_duplex == other.full_duplex && one.partner == other.partner &&
         one.beacons == other.beacons && one.error_percent == other.error_percent;
}

Heard heard_by(storage::Transaction &transaction, storage::Uplink const &uplink,
               storage::Device const &device, HeardAt const &heard_at) {
  auto const port = uplink.port ? storage::find_port(transaction, *uplink.port) : std::nullopt;
  if (!port) {
    return {};
  }
  auto heard = heard_at(port->switch_key, device);
  if (!storage::is_in_lag(transaction, uplink.name)) {
    heard.partner.reset();
  }
  return heard;
}

struct Changed {
  std::string uplink;
  Link link;
};

std::vector<Changed> changed_links(storage::Transaction &transaction, NetworkDevices const &devices,
                                   HeardAt const &heard_at) {
  std::vector<Changed> changed;
  for (auto const &uplink : storage::all_uplinks(transaction)) {
    if (auto const device = storage::device_of(transaction, uplink.name)) {
      auto const known = storage::find_link(transaction, uplink.name).value_or(Link{});
      auto link = link_by_device(known, device->name, devices);
      auto const heard = heard_by(transaction, uplink, *device, heard_at);
      link.partner = heard.partner.value_or(known.partner);
      link.beacons = heard.beacons.value_or(known.beacons);
      link.error_percent = heard.error_percent.value_or(link.error_percent);
      if (!is_same(link, known)) {
        changed.push_back({.uplink = uplink.name, .link = link});
      }
    }
  }
  return changed;
}

void switch_to(std::string const &device, bool up, NetworkDevices const &devices,
               std::function<void(std::string const &)> const &say) {
  auto const found = devices.find(device);
  if (!found || found->is_up == up) {
    return;
  }
  try {
    switch_network_device(device, up);
  } catch (std::system_error const &error) {
    say(fmt::format("the device {} cannot be switched {}: {}", device, up ? "on" : "off",
                    error.code().message()));
  }
}

}  // namespace

void switch_devices(storage::Transaction &transaction, NetworkDevices const &devices,
                    std::function<void(std::string const &)> const &say) {
  for (auto const &uplink : storage::all_uplinks(transaction)) {
    if (auto const device = storage::device_of(transaction, uplink.name)) {
      auto const link = storage::find_link(transaction, uplink.name).value_or(Link{});
      switch_to(device->name, link.admin, devices, say);
    }
  }
  for (auto const &name : devices.switched_off()) {
    auto const holder = storage::find_device(transaction, name);
    if (holder && holder->port) {
      switch_to(name, true, devices, say);
    }
  }
}

bool links_differ(storage::Transaction &transaction, NetworkDevices const &devices,
                  HeardAt const &heard_at) {
  return !changed_links(transaction, devices, heard_at).empty();
}

void put_links(storage::ChangingTransaction &transaction, NetworkDevices const &devices,
               HeardAt const &heard_at) {
  for (auto const &[uplink, link] : changed_links(transaction, devices, heard_at)) {
    teaming::set_link(transaction, uplink, link);
  }
}

}  // namespace simhost::daemon
