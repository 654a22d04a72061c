// Whether devices and the ways of tunnels can carry the packets of their switches: asked before a
// change is committed, and only of what the daemon did not agree to before.
#pragma once

#include <cstdint>
#include <map>
#include <optional>
#include <set>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "planes/openvswitch/line/line.h"
#include "storage/store.h"
#include "storage/switches.h"

namespace simhost::openvswitch {

class PacketSizes {
 public:
  /// A port or an uplink is to have this device.
  void add(std::string_view device) { added_.emplace(device); }

  /// What the daemon is to be asked of what a transaction leaves; nothing if it knows all of it.
  std::optional<Json> question(storage::Transaction &transaction);
  /// It agreed to that.
  void agreed() { agreed_ = asked_; }

 private:
  struct Sizes {
    std::map<std::int64_t, std::uint32_t> switches;
    std::map<std::string, std::uint32_t> devices;  // of uplinks, which come and go
    // By the device of the underlay, and the address of the peer.
    std::map<std::pair<std::string, std::vector<std::uint8_t>>, std::uint32_t> tunnels;

    bool operator==(Sizes const &) const = default;
  };

  Sizes agreed_;
  Sizes asked_;
  std::set<std::string, std::less<>> added_;
};

}  // namespace simhost::openvswitch
