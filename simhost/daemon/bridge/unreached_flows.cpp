// Over several connections: in each turn of its loop Open vSwitch takes a few messages of each, and
// looks at all of its devices. So they are no longer one change, which nobody sees.
#include "daemon/bridge/unreached_flows.h"

#include <algorithm>
#include <future>
#include <iterator>
#include <limits>
#include <span>
#include <utility>
#include <vector>

#include "planes/openvswitch/compile/pipeline.h"

namespace simhost::daemon {
namespace {

using openflow::Changes;
using openflow::Connection;
using openflow::Flow;
using openvswitch::Deadline;
using openvswitch::Lives;

// It takes so many messages of a connection.
constexpr std::size_t kInATurn = 50;
// More than twice as many have no room to wait until they are accepted.
constexpr std::size_t kMostConnections = 32;
// To connect takes longer than one connection takes for fewer.
constexpr std::size_t kMany = 1000;

// It accepts one in each turn, so that each begins a turn after the one before.
std::size_t taken_in(std::size_t turns) {
  auto const connections = std::min(turns, kMostConnections);
  return kInATurn * (connections * turns - connections * (connections - 1) / 2);
}

// How many of these flows each connection takes, so that all end in the same turn.
std::vector<std::size_t> shares_of(std::size_t flows) {
  std::size_t turns = 1;
  while (taken_in(turns) < flows) {
    ++turns;
  }
  std::vector<std::size_t> shares;
  for (; flows > 0; --turns) {
    shares.push_back(std::min(flows, kInATurn * turns));
    flows -= shares.back();
  }
  return shares;
}

struct Part {
  Connection connection;
  std::span<Flow const *const> flows;
};

void add_gate_and_groups(Connection &connection, std::span<openflow::Group const> groups,
                         Deadline deadline) {
  Changes changes{openflow::FlowChange{.flow = gate()}};
  for (auto const &group : groups) {
    changes.emplace_back(
        openflow::GroupChange{.command = openflow::GroupCommand::add, .group = group});
  }
  connection.change(changes, deadline);
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
  if (wanted.flows.size() < kMany || !connection.is_bare(deadline)) {
    return 0;
  }
  std::vector<Flow const *> all;
  std::ranges::transform(wanted.flows, std::back_inserter(all),
                         [](Flow const &flow) { return &flow; });
  std::span<Flow const *const> flows(all);
  std::vector<Part> parts;
  for (auto const share : shares_of(all.size())) {
    parts.push_back({Connection(socket, deadline, lives), flows.first(share)});
    flows = flows.subspan(share);
  }
  // First, as flows lead to them.
  add_gate_and_groups(connection, wanted.groups, deadline);
  std::vector<std::future<void>> all_added;
  all_added.reserve(parts.size());
  for (auto &part : parts) {
    all_added.push_back(std::async(
        std::launch::async, [&part, deadline] { part.connection.add(part.flows, deadline); }));
  }
  for (auto &added : all_added) {
    added.get();
  }
  return wanted.groups.size() + all.size();
}

}  // namespace simhost::daemon
