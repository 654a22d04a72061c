// Settings of teaming: which uplinks switches and ports use.
#pragma once

#include <array>
#include <cstddef>

#include "model/properties/descriptor.h"
#include "vswitch/properties.h"
#include "vswitch/teaming.h"
#include "vswitch/uplinks.h"

namespace simhost::teaming {

inline constexpr std::array<Word, 6> kBalances{{{"none", TEAM_FRP_TYPE_NONE},
                                                {"ip", TEAM_FRP_TYPE_LB_IP},
                                                {"mac", TEAM_FRP_TYPE_LB_SRCMAC},
                                                {"port", TEAM_FRP_TYPE_LB_SRCID},
                                                {"explicit", TEAM_FRP_TYPE_FO_EXPLICIT},
                                                {"load", TEAM_FRP_TYPE_LB_LBT}}};
inline constexpr std::array<Word, 9> kCriteria{{{"speed", TEAM_FRP_CRIT_LINK_SPEED},
                                                {"speed_at_least", TEAM_FRP_CRIT_LINK_SPEED_GTE},
                                                {"duplex", TEAM_FRP_CRIT_LINK_DUPLEX},
                                                {"lacp", TEAM_FRP_CRIT_LACP_PORT_DOWN},
                                                {"beacon", TEAM_FRP_CRIT_BEACON_STATE},
                                                {"errors", TEAM_FRP_CRIT_LINK_ERR},
                                                {"link", TEAM_FRP_CRIT_LINK_STATE},
                                                {"blocked", TEAM_FRP_CRIT_PORT_BLOCKED},
                                                {"driver", TEAM_FRP_CRIT_DRV_PRESENT}}};
inline constexpr std::array<Word, 9> kFlags{{{"all_available", TEAM_FRP_FLAG_ALL_AVAILABLE},
                                             {"reverse", TEAM_FRP_FLAG_REVERSE},
                                             {"best_effort", TEAM_FRP_FLAG_BEST_EFFORT},
                                             {"rolling", TEAM_FRP_FLAG_ROLLING},
                                             {"shotgun", TEAM_FRP_FLAG_SHOTGUN},
                                             {"notify", TEAM_FRP_FLAG_NOTIFY_SWITCH},
                                             {"block_output", TEAM_FRP_FLAG_BLOCK_OUTPUT},
                                             {"lacp_client", TEAM_FRP_FLAG_LACP_CLIENT},
                                             {"lst", TEAM_FRP_FLAG_LST}}};
inline constexpr int kMostPercent = 100;

/// The two runs of names in a policy; the active ones come first, and are said first.
struct ActiveNames {
  using Object = VSTeamPolicy;
  static std::size_t count(VSTeamPolicy const &policy) { return policy.numActive; }
  static void const *at(VSTeamPolicy const &policy, std::size_t index) {
    return &policy.uplinkPortName[index];
  }
  static void *append(VSTeamPolicy &policy) {
    return policy.numActive < QEX_TEAM_MAX_UPLINKS ? &policy.uplinkPortName[policy.numActive++]
                                                   : nullptr;
  }
};
struct StandbyNames {
  using Object = VSTeamPolicy;
  static std::size_t count(VSTeamPolicy const &policy) { return policy.numStandby; }
  static void const *at(VSTeamPolicy const &policy, std::size_t index) {
    return &policy.uplinkPortName[policy.numActive + index];
  }
  static void *append(VSTeamPolicy &policy) {
    auto const used = policy.numActive + policy.numStandby;
    if (used >= QEX_TEAM_MAX_UPLINKS) {
      return nullptr;
    }
    ++policy.numStandby;
    return &policy.uplinkPortName[used];
  }
};
inline constexpr auto kName = form::of_uplinks(form::array_text<char[QEX_NEB_NAME_MAX_LEN]>());

inline constexpr std::array kMembers{
    form::member("balance", form::choice<&VSTeamPolicy::loadBalance>(kBalances),
                 "`none`, `explicit`: the first uplink; the others spread the ports by their "
                 "numbers, of which `load` moves ports to uplinks that carry less where frames "
                 "move"),
    form::member("criteria", form::bits<&VSTeamPolicy::linkCriteria>(kCriteria),
                 "what takes an uplink out of use"),
    form::member("flags", form::bits<&VSTeamPolicy::flags>(kFlags),
                 "`notify` announces moves, `rolling` moves only when it must; the others are kept "
                 "without effect"),
    form::member("speed", form::number<&VSTeamPolicy::speed>(0, UINT16_MAX),
                 "Mbit/s, for the criteria"),
    form::member("full_duplex", form::boolean<&VSTeamPolicy::fullDuplex>(),
                 "for the criterion `duplex`"),
    form::member("error_percent", form::number<&VSTeamPolicy::percentError>(0, kMostPercent),
                 "for the criterion `errors`: how many damaged frames of 100 the policy bears"),
    form::member("active", form::list<ActiveNames>(kName, QEX_TEAM_MAX_UPLINKS),
                 "uplink ports, uplinks or link-aggregation groups; none named means all uplinks"),
    form::member("standby", form::list<StandbyNames>(kName, QEX_TEAM_MAX_UPLINKS), "likewise"),
};

/// Refuses unknown values and bits, no or the same name twice (QEX_BAD_PARAM), more than
/// QEX_TEAM_MAX_UPLINKS names (QEX_LIMIT_EXCEEDED) and a name that does not end
/// (QEX_NAME_TOO_LONG). A name that no uplink port bears yet is fine.
SIMHOST_API void check_policy(VSTeamPolicy const &policy);

/// All uplinks, chosen by the port that sends.
inline constexpr auto of_switch =
    property<VSTeamPolicy>(VSPROP_SWITCH_TEAMING)
        .of_switch()
        .typed()
        .defaults_to({.loadBalance = TEAM_FRP_TYPE_LB_SRCID,
                      .linkCriteria = TEAM_FRP_CRIT_LINK_STATE,
                      .percentError = 0,
                      .fullDuplex = 0,
                      .speed = 0,
                      .flags = TEAM_FRP_FLAG_ALL_AVAILABLE | TEAM_FRP_FLAG_NOTIFY_SWITCH,
                      .numActive = 0,
                      .numStandby = 0,
                      .uplinkPortName = {}})
        .obeys<check_policy>()
        .json("teaming", form::record<VSTeamPolicy>(kMembers))
        .frames_obey()
        .says("which uplinks carry what the ports of the switch send");

inline constexpr auto policy = property<VSTeamPolicy>(VSPROP_PORT_TEAMING_POLICY)
                                   .of_port()
                                   .typed()
                                   .inherits(of_switch)
                                   .obeys<check_policy>()
                                   .json("teaming", form::record<VSTeamPolicy>(kMembers))
                                   .frames_obey()
                                   .says("the port's own teaming, instead of its switch's");

/// One more than the name of an uplink port has: what callers have room for.
inline constexpr auto bound_uplink =
    property<std::string>(VSPROP_PORT_TEAMING_OVERRIDE)
        .of_port()
        .typed()
        .up_to(QEX_NEB_NAME_MAX_LEN)
        .of_uplinks()
        .defaults_to("")
        .json("uplink")
        .frames_obey()
        .says("the one uplink that the port uses whatever its teaming says");

inline constexpr auto transmit_uplink = property<qex_Bool>(VSPROP_PORT_TX_UPLINK)
                                            .of_port()
                                            .typed()
                                            .defaults_to(0)
                                            .json("transmit_uplink")
                                            .frames_obey()
                                            .says(
                                                "whether what the port sends always goes out over "
                                                "an uplink; without effect where no frames move");

inline constexpr std::array<Descriptor const *, 4> kProperties{&of_switch, &policy, &bound_uplink,
                                                               &transmit_uplink};

}  // namespace simhost::teaming
