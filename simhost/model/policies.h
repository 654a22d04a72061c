// What the host does without a policy, and what it accepts as one. Each function refuses a record
// that it does not.
#pragma once

#include "vswitch/mac_learning.h"
#include "vswitch/port_mac_policies.h"
#include "vswitch/port_policies.h"
#include "vswitch/teaming.h"

namespace simhost {

/// The teaming of a switch that has none set: all uplinks, chosen by the port that sends.
inline constexpr VSTeamPolicy kDefaultTeaming{
    .loadBalance = TEAM_FRP_TYPE_LB_SRCID,
    .linkCriteria = TEAM_FRP_CRIT_LINK_STATE,
    .percentError = 0,
    .fullDuplex = 0,
    .speed = 0,
    .flags = TEAM_FRP_FLAG_ALL_AVAILABLE | TEAM_FRP_FLAG_NOTIFY_SWITCH,
    .numActive = 0,
    .numStandby = 0,
    .uplinkPortName = {},
};

/// Refuses unknown values and bits, no or the same name twice (QEX_BAD_PARAM), more than
/// QEX_TEAM_MAX_UPLINKS names (QEX_LIMIT_EXCEEDED) and a name that does not end
/// (QEX_NAME_TOO_LONG). A name that no uplink port bears yet is fine.
void check_teaming(VSTeamPolicy const &policy);
/// Refuses an ageing time past VS_MAC_LEARNING_AGING_TIME_MAX and reserved bits (QEX_BAD_PARAM).
void check_mac_learning(VSMACLearning const &learning);
/// Refuses an unknown policy (QEX_BAD_PARAM) and a limit past
/// VSPORT_MAC_LEARNING_LIMIT_ENTRIES_MAX (QEX_LIMIT_EXCEEDED).
void check_mac_management(VSPMACManagement const &management);
/// Refuses unknown bits (QEX_BAD_PARAM).
void check_security(VSPropSecurity const &security);
/// Refuses unknown bits and addresses that are not multicast (QEX_BAD_PARAM), and more than
/// VSWITCH_ETH_MAX_EXACT_MULTICAST_ADDRS (QEX_LIMIT_EXCEEDED).
void check_eth_filter(VSExtraEthFilter const &filter);

}  // namespace simhost
