// Settings of MAC addresses: what switches and ports learn, and which frames a port takes.
#pragma once

#include <array>
#include <cstddef>
#include <cstring>

#include "model/ports/runtime_state.h"
#include "model/properties/descriptor.h"
#include "vswitch/mac_learning.h"
#include "vswitch/mac_tables.h"
#include "vswitch/port_mac_policies.h"
#include "vswitch/port_policies.h"
#include "vswitch/properties.h"

namespace simhost::mac {

struct AgingTime {
  using Object = VSMACLearning;
  static std::int64_t load(VSMACLearning const &learning) { return learning.agingTime; }
  static void store(VSMACLearning &learning, std::int64_t seconds) {
    learning.agingTime = static_cast<qex_uint32>(seconds) & 0xFFFFFF;
  }
};
struct LearnStatic {
  using Object = VSMACLearning;
  static std::int64_t load(VSMACLearning const &learning) { return learning.learnStatic; }
  static void store(VSMACLearning &learning, std::int64_t on) {
    learning.learnStatic = on != 0 ? 1 : 0;
  }
};

inline constexpr std::array kLearningMembers{
    form::member("aging_time", form::number<AgingTime>(0, VS_MAC_LEARNING_AGING_TIME_MAX),
                 "seconds until a learned address goes"),
    form::member("limit", form::number<&VSMACLearning::macLimit>(0, UINT32_MAX),
                 "learned addresses of the switch"),
    form::member("learn_static", form::boolean<LearnStatic>(),
                 "whether a static address moves when it is seen elsewhere"),
};

/// Refuses an ageing time past VS_MAC_LEARNING_AGING_TIME_MAX and reserved bits (QEX_BAD_PARAM).
SIMHOST_API void check_learning(VSMACLearning const &learning);

inline constexpr auto learning =
    property<VSMACLearning>(VSPROP_SWITCH_MAC_LEARNING)
        .of_switch()
        .typed()
        .defaults_to({.agingTime = VS_MAC_LEARNING_AGING_TIME_DEFAULT,
                      .learnStatic = VS_MAC_LEARNING_LEARN_STATIC_DEFAULT,
                      .reserved = 0,
                      .macLimit = VS_MAC_LEARNING_LIMIT_ENTRIES_DEFAULT})
        .obeys<check_learning>()
        .json("mac_learning", form::record<VSMACLearning>(kLearningMembers))
        .frames_obey()
        .says("MAC learning of the switch, instead of the host's");

inline constexpr std::array<Word, 2> kLimitPolicies{
    {{"allow", VSPORT_MAC_LEARNING_LIMIT_POLICY_ALLOW},
     {"drop", VSPORT_MAC_LEARNING_LIMIT_POLICY_DROP}}};

template <auto kField>
using LearningOfPort = form::In<&VSPMACManagement::portMACLearning, form::NumberField<kField>>;

inline constexpr std::array kManagementMembers{
    form::member("learning", form::boolean<LearningOfPort<&VSPMACLearning::learning>>(),
                 "whether the port learns addresses"),
    form::member(
        "flooding", form::boolean<LearningOfPort<&VSPMACLearning::flooding>>(),
        "whether frames for unknown addresses go out; without effect where no frames move"),
    form::member("limit",
                 form::number<LearningOfPort<&VSPMACLearning::macLimit>>(
                     0, VSPORT_MAC_LEARNING_LIMIT_ENTRIES_MAX),
                 "learned addresses"),
    form::member("limit_policy",
                 form::choice<LearningOfPort<&VSPMACLearning::macLimitPolicy>>(kLimitPolicies),
                 "what becomes of frames from an address past the limit"),
    form::member("mac_change", form::boolean<&VSPMACManagement::macChangeAllowed>(),
                 "whether the client may change its address; without effect where no frames move"),
};

/// Refuses an unknown policy (QEX_BAD_PARAM) and a limit past
/// VSPORT_MAC_LEARNING_LIMIT_ENTRIES_MAX (QEX_LIMIT_EXCEEDED).
SIMHOST_API void check_management(VSPMACManagement const &management);

inline constexpr auto management =
    property<VSPMACManagement>(VSPROP_PORT_MAC_MANAGEMENT)
        .of_port()
        .typed()
        .defaults_to(
            {.macChangeAllowed = 0,
             .portMACLearning = {.learning = 0,
                                 .flooding = 0,
                                 .macLimit = VSPORT_MAC_LEARNING_LIMIT_ENTRIES_DEFAULT,
                                 .macLimitPolicy = VSPORT_MAC_LEARNING_LIMIT_POLICY_ALLOW}})
        .obeys<check_management>()
        .json("mac_learning", form::record<VSPMACManagement>(kManagementMembers))
        .frames_obey()
        .frames_cannot(
            "`mac_change`: whose device is no other end of a veth pair, changes it unseen")
        .says("MAC learning of the port, and whether its client may change its address");

inline constexpr auto learning_stats = property<VSPMACLearningStats>(VSPROP_PORT_MAC_LEARNING_STATS)
                                           .of_port()
                                           .runtime()
                                           .computed_by(read_learning_stats)
                                           .says("what MAC learning of the port counted");

inline constexpr std::array<Word, 7> kFrames{{{"unicast", QEX_ETH_FILTER_UNICAST},
                                              {"multicast", QEX_ETH_FILTER_MULTICAST},
                                              {"all_multicast", QEX_ETH_FILTER_ALLMULTI},
                                              {"broadcast", QEX_ETH_FILTER_BROADCAST},
                                              {"promiscuous", QEX_ETH_FILTER_PROMISC},
                                              {"hashed_multicast", QEX_ETH_FILTER_USE_LADRF},
                                              {"sink", QEX_ETH_FILTER_SINK}}};

struct EthernetAddress {
  using Object = qex_EthAddress;
  static Bytes bytes(qex_EthAddress const &address) {
    return copied(std::as_bytes(std::span(address)));
  }
  static void put(qex_EthAddress &address, BytesView bytes) {
    std::memcpy(address, bytes.data(), sizeof address);
  }
};
inline constexpr auto kEthernetAddress = form::address<EthernetAddress>(FormKind::mac);

struct FilterAddresses {
  using Object = VSExtraEthFilter;
  static std::size_t count(VSExtraEthFilter const &filter) { return filter.numMulticastAddrs; }
  static void const *at(VSExtraEthFilter const &filter, std::size_t index) {
    return &filter.multicastAddrs[index];
  }
  static void *append(VSExtraEthFilter &filter) {
    return filter.numMulticastAddrs < VSWITCH_ETH_MAX_EXACT_MULTICAST_ADDRS
               ? &filter.multicastAddrs[filter.numMulticastAddrs++]
               : nullptr;
  }
};

inline constexpr std::array kFilterMembers{
    form::member("frames", form::bits<&VSExtraEthFilter::flags>(kFrames),
                 "frames that the port takes beside those for its client; `sink`: those that no "
                 "other port takes"),
    form::member(
        "addresses",
        form::list<FilterAddresses>(kEthernetAddress, VSWITCH_ETH_MAX_EXACT_MULTICAST_ADDRS),
        "multicast addresses"),
};

/// Refuses unknown bits and addresses that are not multicast (QEX_BAD_PARAM), and more than
/// VSWITCH_ETH_MAX_EXACT_MULTICAST_ADDRS (QEX_LIMIT_EXCEEDED).
SIMHOST_API void check_filter(VSExtraEthFilter const &filter);

inline constexpr auto ethernet_filter =
    property<VSExtraEthFilter>(VSPROP_PORT_EXTRA_ETH_FRP)
        .of_port()
        .typed()
        .defaults_to({})
        .obeys<check_filter>()
        .json("ethernet_filter", form::record<VSExtraEthFilter>(kFilterMembers))
        .frames_obey()
        .says(
            "frames that the port takes beside those for its client; without effect where no "
            "frames move");

inline constexpr std::array<Descriptor const *, 4> kProperties{&learning, &management,
                                                               &ethernet_filter, &learning_stats};

}  // namespace simhost::mac
