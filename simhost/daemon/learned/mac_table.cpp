// Where an address is, one flow says, and when it was seen, another one.
#include "daemon/learned/mac_table.h"

#include <chrono>
#include <map>

#include "daemon/learned/memory.h"
#include "planes/openvswitch/compile/pipeline.h"

namespace simhost::daemon {
namespace {

std::map<KnownAddress, Unseen> by_address(std::span<Source const> sources) {
  std::map<KnownAddress, Unseen> unseen;
  for (auto const &source : sources) {
    if (auto const known = find_known_address(source.flow.match, openflow::Field::eth_src)) {
      unseen.emplace(*known, source.unseen);
    }
  }
  return unseen;
}

std::uint32_t seconds(std::chrono::nanoseconds time) {
  return static_cast<std::uint32_t>(std::chrono::duration_cast<std::chrono::seconds>(time).count());
}

}  // namespace

std::optional<KnownAddress> find_known_address(openflow::Match const &match,
                                               openflow::Field field) {
  auto const &fields = match.fields();
  auto const address = fields.find(field);
  auto const vlan = fields.find(openvswitch::field::kDomain);
  if (address == fields.end() || vlan == fields.end()) {
    return std::nullopt;
  }
  return KnownAddress(openflow::to_address<6>(address->second.value),
                      static_cast<std::uint16_t>(vlan->second.value));
}

std::vector<Learned> learned_of(std::span<openflow::FlowEntry const> flows,
                                std::span<Source const> sources) {
  std::vector<Learned> all;
  auto const unseen = by_address(sources);
  for (auto const &entry : flows) {
    auto const known = find_known_address(entry.flow.match, openflow::Field::eth_dst);
    if (known && learned_in(entry.flow)) {
      auto const source = unseen.find(*known);
      all.push_back({.address = known->first,
                     .vlan = known->second,
                     .port = openvswitch::number_of(entry.flow.cookie),
                     .age = seconds(source != unseen.end() ? source->second : entry.age)});
    }
  }
  return all;
}

}  // namespace simhost::daemon
