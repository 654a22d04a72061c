// What ovs-vswitchd says when it is asked what becomes of a frame (ofproto/trace), line by line:
// the tables that the frame visits, and what is done to it.
#pragma once

#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

namespace simhost::openvswitch {

struct TraceLine {
  enum class Kind {
    visit,   ///< of a table
    action,  ///< `text` as ovs-ofctl says it
    remark,  ///< `text` on the action before
  };
  Kind kind = Kind::action;
  /// How deep it is: what a visit leads to is no less deep, and what comes after it no deeper.
  std::size_t depth = 0;
  std::uint8_t table = 0;    ///< of a visit; of anything else the table that does it
  bool missed = false;       ///< of a visit: no flow is for the frame
  std::uint64_t cookie = 0;  ///< of a visit's flow, or of the flow whose action it is
  std::string text = {};
};

std::vector<TraceLine> read_trace(std::string_view text);

}  // namespace simhost::openvswitch
