// What a switch is asked for.
#pragma once

#include <cstdint>
#include <vector>

#include "planes/openvswitch/openflow/action.h"
#include "planes/openvswitch/openflow/change.h"
#include "planes/openvswitch/openflow/match.h"
#include "planes/openvswitch/openflow/port.h"

namespace simhost::openflow {

/// The meter of all that goes up to controllers.
inline constexpr std::uint32_t kControllerMeter = 0xfffffffe;

/// Which flows are meant: all unless it says otherwise.
struct FlowFilter {
  std::uint8_t table = kAllTables;
  std::uint64_t cookie = 0;
  std::uint64_t cookie_mask = 0;
  Match match{};  // flows that match at least so much
};

/// A frame that the switch is to send.
struct PacketOut {
  Port in_port = kController;
  Actions actions{};
  std::vector<std::uint8_t> frame{};
};

/// Whether a monitor says what a change of its own connection changed.
enum class OwnChanges { untold, told };
/// Whether it begins with the flows that there are.
enum class PresentFlows { untold, told };

/// Flows of which each change is told.
struct FlowMonitor {
  std::uint32_t number;  // of one's own
  FlowFilter filter;
  OwnChanges own = OwnChanges::untold;
  PresentFlows present = PresentFlows::told;
};

/// Messages that a switch sends by itself.
struct AsyncMessages {
  bool packet_in = false;
  bool port_status = false;
  bool flow_removed = false;
  bool group_and_meter_changes = false;  ///< by others
};

}  // namespace simhost::openflow
