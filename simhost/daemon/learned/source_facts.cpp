// By the flows that a bridge was taught.
#include "daemon/learned/source_facts.h"

#include <algorithm>

#include "planes/openvswitch/compile/pipeline.h"

namespace simhost::daemon {

SourceFacts facts_of_source(Memory const &memory, storage::SwitchKey key, std::uint32_t port,
                            openflow::EthernetAddress const &address) {
  using openvswitch::Counted;
  auto const is_of = [&](openflow::Flow const &flow) {
    auto const field = flow.match.fields().find(openflow::Field::eth_dst);
    return field != flow.match.fields().end() && field->second.value == openflow::to_value(address);
  };
  auto const first =
      memory.learned(key, {.table = openvswitch::table::kFirstAddresses,
                           .cookie = openvswitch::cookie(Counted::first_address, port)});
  SourceFacts facts{.is_not_first = !first.empty() && std::ranges::none_of(first, is_of)};
  for (auto const &flow : memory.learned_addresses(key)) {
    ++facts.on_switch;
    if (openvswitch::number_of(flow.cookie) == port) {
      ++facts.at_port;
      if (auto const known = is_of(flow) ? learned_in(flow) : std::nullopt; known && known->vlan) {
        facts.learned.insert(*known->vlan);
      }
    }
  }
  return facts;
}

}  // namespace simhost::daemon
