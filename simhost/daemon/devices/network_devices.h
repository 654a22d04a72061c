// The network devices of the machine, as far as the namespace of this process sees them.
#pragma once

#include <cstdint>
#include <functional>
#include <map>
#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "events/loop.h"

struct nlmsghdr;

namespace simhost::daemon {

struct NetworkDevice {
  unsigned index;  ///< another one for a device that was made anew under its name
  bool is_up;      ///< switched on
  bool has_link;
  std::uint32_t mtu;
  unsigned master = 0;       ///< the index of the bridge or bond that it is at; 0 for none
  bool has_ethernet = true;  ///< its frames are those of Ethernet, as a switch's are

  bool operator==(NetworkDevice const &) const = default;
};

/// What a device says of its wire.
struct WireSpeed {
  std::optional<std::uint32_t> mbits;  ///< per second; nothing for a device that has no such thing
  bool full_duplex;
};

/// All of them, as the kernel tells of them: asking for each of a thousand takes longer than all
/// else that a change takes.
class NetworkDevices {
 public:
  /// `changed` is told when one came, went or changed.
  NetworkDevices(events::Loop &loop, std::function<void()> changed);

  /// Takes over what the kernel told: what was done to a device before is known after it, and
  /// `changed` is told of it whoever took it over.
  void refresh();
  [[nodiscard]] std::optional<NetworkDevice> find(std::string_view name) const;
  /// Those that carry no packets of so many bytes, and how large ones they do.
  [[nodiscard]] std::map<std::string, std::uint32_t> smaller_than(std::uint32_t bytes) const;
  /// The names of those that are switched off.
  [[nodiscard]] std::vector<std::string> switched_off() const;
  /// The name of the bridge or bond of the kernel that a device is at; empty if it is at none.
  [[nodiscard]] std::string master_of(std::string_view name) const;

 private:
  void ask_for_all();
  void ask_for_all_again();
  // These return whether something is another now.
  bool take_told();
  bool take(std::span<char const> messages);
  bool take_device(nlmsghdr const &header);
  bool put(std::string const &name, NetworkDevice const &device);
  bool remove(unsigned index);

  events::Descriptor socket_;
  std::function<void()> changed_;
  std::map<std::string, NetworkDevice, std::less<>> devices_;
  std::map<unsigned, std::string> names_;
  bool is_asked_ = false;  // for all, of which some are still to be told
  bool is_to_be_asked_again_ = false;
  events::Loop::Watch watch_;
};

WireSpeed wire_speed(std::string_view device);
/// Switches it on or off. Throws std::system_error.
void switch_network_device(std::string_view name, bool up);
/// Has it carry packets of so many bytes. Throws std::system_error.
void set_network_device_mtu(std::string_view name, std::uint32_t bytes);
/// Whether the kernel tells those who ask there for addresses of this machine. Likewise.
bool resolves(std::string_view name);
void let_resolve(std::string_view name, bool resolves);

}  // namespace simhost::daemon
