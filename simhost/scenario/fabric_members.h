// Members of what joins a host to others, as members.h has them of all else.
#pragma once

#include <array>
#include <cstdint>
#include <string>
#include <string_view>

#include "model/fabric/fabric.h"
#include "scenario/members.h"

namespace simhost::scenario {

inline constexpr std::array<Word, 2> kEncapsulations{
    {{"vxlan", static_cast<std::int64_t>(storage::Encapsulation::vxlan)},
     {"geneve", static_cast<std::int64_t>(storage::Encapsulation::geneve)}}};
inline constexpr auto kPeer = form::address<WholeAddress>(FormKind::ip);
inline constexpr std::array kFabricMembers{
    form::required_member("encapsulation",
                          form::choice<&FabricSpec::encapsulation>(kEncapsulations),
                          "how frames are wrapped"),
    form::required_member("key", form::number<&FabricSpec::key>(0, storage::kGreatestTunnelKey),
                          "the number by which the hosts of the switch know its frames"),
    form::required_member(
        "peers", form::list<form::VectorField<&FabricSpec::peers>>(kPeer, storage::kMostTunnels),
        "the addresses of all hosts of the switch"),
    form::sparse(kUplink, text_member<&FabricSpec::uplink>(),
                 "what its uplink is called, chosen by the host unless given"),
};

struct UnderlayMembers {
  std::string device = {};
  std::string address = {};
  std::string gateway = {};
};
inline constexpr std::string_view kAddress = "address";
inline constexpr std::string_view kGateway = "gateway";
inline constexpr std::array kUnderlayMembers{
    form::required_member("device", text_member<&UnderlayMembers::device>(),
                          "the network device that carries the tunnels"),
    form::required_member(kAddress, text_member<&UnderlayMembers::address>(),
                          "of this host, with the bits of its network"),
    form::sparse(kGateway, text_member<&UnderlayMembers::gateway>(),
                 "by which peers in other networks are reached"),
};

}  // namespace simhost::scenario
