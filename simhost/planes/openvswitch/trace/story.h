// What becomes of a frame in the words of the host, and which setting decided it: what
// ovs-vswitchd says, told by the cookies and tables of our pipeline.
#pragma once

#include <cstddef>
#include <cstdint>
#include <functional>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "planes/openvswitch/openflow/port.h"

namespace simhost::openvswitch {

/// A setting: of a port or, without one, of the switch.
struct SettingOf {
  std::string port;
  std::string name;  ///< as documents have it; empty: no setting decides it
};

struct StoryStep {
  enum class Kind { passes, dropped, delivered, copied };
  Kind kind = Kind::passes;
  std::string text;
  SettingOf setting = {};
  std::string to = {};  ///< where it is delivered or copied to: a port or an uplink
  std::vector<std::uint16_t> vlans = {};  ///< the VLANs of its tags there, the outermost first
};

/// A port or an uplink that has a device.
struct Station {
  std::string name;
  bool is_uplink = false;
};

struct Session {
  std::string name;
  SettingOf setting;
};

/// What the flows know by numbers.
struct Names {
  std::function<Station(openflow::Port)> station;  ///< of a device
  std::function<Session(std::uint32_t)> session;
};

/// Where a frame comes in.
struct Entry {
  Station station;
  /// Of what decides over which uplink its frames go.
  SettingOf teaming;
  /// Of what decides that a port sends nothing, if one does.
  SettingOf blocked;
  /// Of what decides whether the client may change its address.
  SettingOf change = {};
  /// Of what decides how many addresses are learned there.
  SettingOf limit = {};
  /// Whether there is no room for the source of a frame from an uplink, which is let through.
  bool has_no_room = false;
};

/// In which VLAN the source of the frame of which ovs-vswitchd said this would be learned: by its
/// primary one if it is private. Nothing of a frame that does not get so far.
std::optional<std::uint16_t> learning_domain(std::string_view text);

/// `text` is what ovs-vswitchd said of the frame.
std::vector<StoryStep> tell(std::string_view text, std::vector<std::uint8_t> const &frame,
                            Entry const &entry, Names const &names);

}  // namespace simhost::openvswitch
