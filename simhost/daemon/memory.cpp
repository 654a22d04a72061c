// A flow is made anew by the one that taught it, as that is now.
#include "daemon/memory.h"

#include <utility>

#include "planes/openvswitch/compile/pipeline.h"
#include "planes/openvswitch/reconcile/relearning.h"

namespace simhost::daemon {
namespace {

using openflow::Flow;
using openvswitch::LearnedFlows;

// The number of the port that a cookie names.
std::uint32_t port_in(std::uint64_t cookie) {
  return static_cast<std::uint32_t>(cookie);
}

}  // namespace

std::optional<std::uint32_t> Memory::follow(storage::SwitchKey key,
                                            openflow::FlowUpdate const &update) {
  using Event = openflow::FlowUpdate::Event;
  auto &flows = bridges_[key].flows;
  auto const place = openflow::place(update.flow);
  if (update.event == Event::removed) {
    flows.erase(place);
  }
  if (update.event == Event::removed || update.event >= Event::own) {
    return std::nullopt;
  }
  auto const known = flows.find(place);
  auto const port = port_in(update.flow.cookie);
  bool const moved = update.flow.table == openvswitch::table::kLearnedAddresses &&
                     known != flows.end() && port_in(known->second.cookie) != port;
  flows.insert_or_assign(place, update.flow);
  return moved ? std::optional(port) : std::nullopt;
}

void Memory::follow_devices(storage::SwitchKey key,
                            std::map<std::string, std::uint32_t> const &devices) {
  auto &bridge = bridges_[key];
  if (bridge.devices == devices) {
    return;
  }
  for (auto const &[device, port] : std::exchange(bridge.devices, devices)) {
    auto const now = devices.find(device);
    if (now == devices.end() || now->second != port) {
      std::erase_if(bridge.flows, [gone = port](auto const &flow) {
        return port_in(flow.second.cookie) == gone;
      });
    }
  }
}

void Memory::forget(storage::SwitchKey key) {
  bridges_[key].flows.clear();
}

template <typename Condition>
std::vector<Flow> Memory::flows_that(storage::SwitchKey key, Condition const &condition) const {
  std::vector<Flow> flows;
  if (auto const found = bridges_.find(key); found != bridges_.end()) {
    for (auto const &[place, flow] : found->second.flows) {
      if (condition(flow)) {
        flows.push_back(flow);
      }
    }
  }
  return flows;
}

std::vector<Flow> Memory::learned_at(storage::SwitchKey key, std::uint32_t port) const {
  return flows_that(key, [&](Flow const &flow) { return port_in(flow.cookie) == port; });
}

std::vector<Flow> Memory::learned(storage::SwitchKey key, LearnedFlows const &known) const {
  return flows_that(key, [&](Flow const &flow) {
    return flow.table == known.table && flow.cookie == known.cookie;
  });
}

std::vector<Flow> Memory::recall(storage::SwitchKey key, std::span<Flow const> wanted) const {
  std::vector<Flow> recalled;
  auto const found = bridges_.find(key);
  if (found == bridges_.end()) {
    return recalled;
  }
  openvswitch::Teachers const teachers(wanted);
  for (auto const &[place, flow] : found->second.flows) {
    auto const learn = teachers.how_learned({.table = flow.table, .cookie = flow.cookie});
    if (auto again = learn ? openvswitch::relearned(*learn, flow) : std::nullopt) {
      recalled.push_back(*std::move(again));
    }
  }
  return recalled;
}

}  // namespace simhost::daemon
