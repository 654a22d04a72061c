// The bounds of the policies' fields.
#include "model/policies.h"

#include <algorithm>
#include <set>
#include <span>
#include <string_view>

#include "base/bytes.h"
#include "base/outcomes.h"

namespace simhost {
namespace {

constexpr qex_uint32 kLinkCriteria =
    TEAM_FRP_CRIT_LINK_SPEED | TEAM_FRP_CRIT_LINK_SPEED_GTE | TEAM_FRP_CRIT_LINK_DUPLEX |
    TEAM_FRP_CRIT_LACP_PORT_DOWN | TEAM_FRP_CRIT_BEACON_STATE | TEAM_FRP_CRIT_LINK_ERR |
    TEAM_FRP_CRIT_LINK_STATE | TEAM_FRP_CRIT_PORT_BLOCKED | TEAM_FRP_CRIT_DRV_PRESENT;
constexpr qex_uint32 kTeamFlags =
    TEAM_FRP_FLAG_ALL_AVAILABLE | TEAM_FRP_FLAG_REVERSE | TEAM_FRP_FLAG_BEST_EFFORT |
    TEAM_FRP_FLAG_ROLLING | TEAM_FRP_FLAG_SHOTGUN | TEAM_FRP_FLAG_NOTIFY_SWITCH |
    TEAM_FRP_FLAG_BLOCK_OUTPUT | TEAM_FRP_FLAG_LACP_CLIENT | TEAM_FRP_FLAG_LST;
constexpr qex_uint32 kSecurityFlags = VSPORT_SECURITY_DISALLOW_PROMISC |
                                      VSPORT_SECURITY_DISALLOW_MAC_CHANGE |
                                      VSPORT_SECURITY_DISALLOW_FORGED_SRC;
constexpr qex_uint32 kFilterFlags = QEX_ETH_FILTER_UNICAST | QEX_ETH_FILTER_MULTICAST |
                                    QEX_ETH_FILTER_ALLMULTI | QEX_ETH_FILTER_BROADCAST |
                                    QEX_ETH_FILTER_PROMISC | QEX_ETH_FILTER_USE_LADRF |
                                    QEX_ETH_FILTER_SINK;
constexpr qex_uint8 kMulticastBit = 1;

}  // namespace

void check_teaming(VSTeamPolicy const &policy) {
  if (policy.loadBalance > TEAM_FRP_TYPE_LB_LBT || (policy.linkCriteria & ~kLinkCriteria) != 0 ||
      (policy.flags & ~kTeamFlags) != 0 || policy.percentError > 100) {
    throw Refused(QEX_BAD_PARAM);
  }
  auto const count = qex_uint64{policy.numActive} + policy.numStandby;
  if (count > QEX_TEAM_MAX_UPLINKS) {
    throw Refused(QEX_LIMIT_EXCEEDED);
  }
  std::set<std::string_view> names;
  for (auto const &field : std::span(policy.uplinkPortName).first(count)) {
    auto const name = text_in(field);
    if (name.empty() || !names.insert(name).second) {
      throw Refused(QEX_BAD_PARAM);
    }
  }
}

void check_mac_learning(VSMACLearning const &learning) {
  if (learning.agingTime > VS_MAC_LEARNING_AGING_TIME_MAX || learning.reserved != 0) {
    throw Refused(QEX_BAD_PARAM);
  }
}

void check_mac_management(VSPMACManagement const &management) {
  auto const policy = static_cast<int>(management.portMACLearning.macLimitPolicy);
  if (policy != VSPORT_MAC_LEARNING_LIMIT_POLICY_ALLOW &&
      policy != VSPORT_MAC_LEARNING_LIMIT_POLICY_DROP) {
    throw Refused(QEX_BAD_PARAM);
  }
  if (management.portMACLearning.macLimit > VSPORT_MAC_LEARNING_LIMIT_ENTRIES_MAX) {
    throw Refused(QEX_LIMIT_EXCEEDED);
  }
}

void check_security(VSPropSecurity const &security) {
  if ((security.flags & ~kSecurityFlags) != 0) {
    throw Refused(QEX_BAD_PARAM);
  }
}

void check_eth_filter(VSExtraEthFilter const &filter) {
  if ((filter.flags & ~kFilterFlags) != 0) {
    throw Refused(QEX_BAD_PARAM);
  }
  if (filter.numMulticastAddrs > VSWITCH_ETH_MAX_EXACT_MULTICAST_ADDRS) {
    throw Refused(QEX_LIMIT_EXCEEDED);
  }
  auto const addresses = std::span(filter.multicastAddrs).first(filter.numMulticastAddrs);
  if (!std::all_of(addresses.begin(), addresses.end(),
                   [](auto const &address) { return (address[0] & kMulticastBit) != 0; })) {
    throw Refused(QEX_BAD_PARAM);
  }
}

}  // namespace simhost
