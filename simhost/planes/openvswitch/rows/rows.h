// The rows of Open vSwitch's database that are this host's: bridges and the devices at them. What
// is followed of it, read from a replica, and told, as operations of the OVSDB protocol (RFC 7047).
#pragma once

#include <cstdint>
#include <map>
#include <set>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "planes/openvswitch/ovsdb/json.h"
#include "planes/openvswitch/ovsdb/replica.h"

namespace simhost::openvswitch {

using ovsdb::Json;

/// Devices that are one link together, by LACP.
struct LagRow {
  std::set<std::string> devices;  ///< of the bridge
  std::string system;             ///< an address: by it, and
  std::uint16_t key = 1;          ///< by this, not 0, partners know the group
  bool is_fast = false;           ///< it is told of its partner each second, not each 30 seconds

  bool operator==(LagRow const &) const = default;
};

/// A port that is no device of the machine: Open vSwitch wraps its frames and sends them to a peer.
struct TunnelRow {
  std::uint16_t number = 0;  ///< its OpenFlow port
  std::string type;          ///< "vxlan" or "geneve"
  std::map<std::string, std::string> options;

  bool operator==(TunnelRow const &) const = default;
};

struct BridgeRow {
  std::string name;      ///< unique among all bridges
  std::string datapath;  ///< "netdev" or "system"
  /// Devices by their names, and the OpenFlow port that each has.
  std::map<std::string, std::uint16_t> devices = {};
  /// By the names of their rows, which begin with that of the bridge, and "-".
  std::map<std::string, LagRow> lags = {};
  /// Likewise tunnels.
  std::map<std::string, TunnelRow> tunnels = {};
  /// How many flows each of these tables may have; the switch learns no more.
  std::map<std::uint8_t, std::uint32_t> limits = {};
  /// It forwards by itself, between the machine and its devices: what it gets for the machine may
  /// be in a tunnel.
  bool is_underlay = false;
  /// Its own address of Ethernet, in text; empty for one that Open vSwitch chooses.
  std::string address = {};

  bool operator==(BridgeRow const &) const = default;
};

/// One that is there, with how the database knows its parts.
struct PresentBridge {
  std::string id;
  BridgeRow row;
  std::map<std::string, std::string> ports;  ///< identifiers of the rows, by device or group
  std::map<std::string, std::string> interfaces = {};  ///< likewise of devices in groups
  std::set<std::string> altered_lags = {};             ///< by somebody else
  bool is_altered = false;                             ///< not as this host makes its bridges
};

/// What of a whole database is this host's, and what all hosts have in common.
struct PresentRows {
  bool is_new = true;  ///< without the one row of Open_vSwitch that each has
  std::vector<PresentBridge> bridges;
  std::string owner;            ///< who writes them; empty if nobody does
  std::uint32_t most_tags = 0;  ///< of the frames that the switch tells apart
  /// Devices of others' bridges, with these; and what each bridge and data path has by itself.
  std::map<std::string, std::string> elsewhere = {};
  /// Why Open vSwitch cannot use devices that are at this host's bridges, and these themselves.
  std::map<std::string, std::string> errors = {};
};

/// The columns that present_rows() reads.
void select_rows(ovsdb::Selected &selected);
/// The bridges are those of `host`. Throws std::runtime_error for rows that do not fit together.
PresentRows present_rows(ovsdb::Replica const &replica, std::string_view host);

/// Makes the present ones as they are wanted; none for those that are so already.
Json operations(PresentRows const &present, std::span<BridgeRow const> wanted,
                std::string_view host, std::uint32_t most_tags);
/// Says who writes them, in words. Open vSwitch itself does not look at that.
Json signature(std::string const &owner);

}  // namespace simhost::openvswitch
