// Told to its control socket: OpenFlow has no word for it.
#include "daemon/bridge/cached_flows.h"

#include <fmt/format.h>

#include <chrono>
#include <stdexcept>
#include <vector>

#include "planes/openvswitch/compile/pipeline.h"
#include "planes/openvswitch/trace/control.h"

namespace simhost::daemon {
namespace {

using openvswitch::ControlCommand;

// What it says to each command; to forget is the last one.
std::vector<openvswitch::ControlReply> forget_after(std::filesystem::path const &folder,
                                                    std::vector<ControlCommand> commands,
                                                    openvswitch::Lives const &lives) {
  using namespace std::chrono_literals;
  constexpr auto kPatience = 2s;
  commands.push_back({.name = "revalidator/purge", .words = {}});
  auto replies = openvswitch::ask_control(openvswitch::find_control_socket(folder), commands,
                                          openvswitch::Deadline::clock::now() + kPatience, lives);
  if (replies.back().is_refused) {
    throw std::runtime_error("ovs-vswitchd: " + replies.back().text);
  }
  return replies;
}

}  // namespace

void forget_cached_flows(std::filesystem::path const &folder, openvswitch::Lives const &lives) {
  forget_after(folder, {}, lives);
}

bool forget_cached_flows(std::filesystem::path const &folder, std::string const &bridge,
                         std::uint64_t generation, openvswitch::Lives const &lives) {
  // Which flow an imagined frame meets where the marker is.
  auto const table = fmt::format("resubmit(,{})", openvswitch::table::kGeneration);
  auto const replies = forget_after(
      folder, {{.name = "ofproto/trace-packet-out", .words = {bridge, "in_port=LOCAL", table}}},
      lives);
  auto const marker = fmt::format("cookie {:#x}\n", generation);
  return replies.front().text.find(marker) != std::string::npos;
}

void change_and_forget(openflow::Connection &connection, openflow::Changes const &changes,
                       bool is_other_generation, std::function<bool()> const &forget,
                       openvswitch::Deadline deadline) {
  bool is_forgotten = !forget;
  connection.change(changes, deadline, [&] {
    if (forget && is_other_generation) {
      is_forgotten = forget();
    }
  });
  if (!is_forgotten) {
    forget();
  }
}

}  // namespace simhost::daemon
