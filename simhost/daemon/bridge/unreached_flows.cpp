// Over several connections: in each turn of its loop Open vSwitch takes a few messages of each, and
// looks at all of its devices. So they are no longer one change, which nobody sees.
#include "daemon/bridge/unreached_flows.h"

#include <algorithm>
#include <future>
#include <limits>
#include <span>
#include <vector>

#include "planes/openvswitch/compile/pipeline.h"

namespace simhost::daemon {
namespace {

using openflow::Changes;
using openflow::Connection;
using openflow::Flow;
using openvswitch::Deadline;
using openvswitch::Lives;

// It accepts one in each turn, so that more of them begin too late.
constexpr std::size_t kConnections = 16;
// To connect takes longer than one connection takes for fewer.
constexpr std::size_t kMany = 1000;

bool is_bare(Connection &connection, Deadline deadline) {
  return connection.aggregate({}, deadline).flows == 0 && connection.groups(deadline).empty();
}

void add_gate_and_groups(Connection &connection, std::span<openflow::Group const> groups,
                         Deadline deadline) {
  Changes changes{openflow::FlowChange{.flow = gate()}};
  for (auto const &group : groups) {
    changes.emplace_back(
        openflow::GroupChange{.command = openflow::GroupCommand::add, .group = group});
  }
  connection.change(changes, deadline);
}

void add_flows(std::filesystem::path const &socket, std::span<Flow const> flows, Deadline deadline,
               Lives const &lives) {
  Changes changes;
  changes.reserve(flows.size());
  for (auto const &flow : flows) {
    changes.emplace_back(openflow::FlowChange{.command = openflow::FlowCommand::add, .flow = flow});
  }
  Connection(socket, deadline, lives).change(changes, deadline);
}

}  // namespace

openflow::Flow gate() {
  Flow flow;
  flow.table = openvswitch::table::kAdmission;
  flow.priority = std::numeric_limits<std::uint16_t>::max();
  return flow;
}

std::size_t add_unreached(Connection &connection, std::filesystem::path const &socket,
                          openvswitch::Compiled const &wanted, Deadline deadline,
                          Lives const &lives) {
  std::span const flows(wanted.flows);
  if (flows.size() < kMany || !is_bare(connection, deadline)) {
    return 0;
  }
  // First, as flows lead to them.
  add_gate_and_groups(connection, wanted.groups, deadline);
  auto const share = (flows.size() + kConnections - 1) / kConnections;
  std::vector<std::future<void>> shares;
  for (std::size_t first = 0; first < flows.size(); first += share) {
    shares.push_back(std::async(std::launch::async, add_flows, socket,
                                flows.subspan(first, std::min(share, flows.size() - first)),
                                deadline, lives));
  }
  for (auto &done : shares) {
    done.get();
  }
  return wanted.groups.size() + flows.size();
}

}  // namespace simhost::daemon
