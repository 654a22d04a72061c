// The rules of MAC learning and of filters.
#include "model/mac/properties.h"

#include <fmt/format.h>

#include <algorithm>
#include <span>

namespace simhost::mac {
namespace {

constexpr qex_uint8 kMulticastBit = 1;

}  // namespace

void check_learning(VSMACLearning const &learning) {
  if (learning.agingTime > VS_MAC_LEARNING_AGING_TIME_MAX || learning.reserved != 0) {
    throw Refused(QEX_BAD_PARAM);
  }
}

void check_management(VSPMACManagement const &management) {
  auto const policy = LearningOfPort<&VSPMACLearning::macLimitPolicy>::load(management);
  if (!form::is_among(policy, kLimitPolicies)) {
    throw Refused(QEX_BAD_PARAM);
  }
  if (management.portMACLearning.macLimit > VSPORT_MAC_LEARNING_LIMIT_ENTRIES_MAX) {
    throw Refused(QEX_LIMIT_EXCEEDED, fmt::format("a port learns at most {} addresses",
                                                  VSPORT_MAC_LEARNING_LIMIT_ENTRIES_MAX));
  }
}

void check_filter(VSExtraEthFilter const &filter) {
  if ((filter.flags & ~form::all_bits(kFrames)) != 0) {
    throw Refused(QEX_BAD_PARAM);
  }
  if (filter.numMulticastAddrs > VSWITCH_ETH_MAX_EXACT_MULTICAST_ADDRS) {
    throw Refused(QEX_LIMIT_EXCEEDED, fmt::format("a filter has at most {} multicast addresses",
                                                  VSWITCH_ETH_MAX_EXACT_MULTICAST_ADDRS));
  }
  auto const addresses = std::span(filter.multicastAddrs).first(filter.numMulticastAddrs);
  if (!std::all_of(addresses.begin(), addresses.end(),
                   [](auto const &address) { return (address[0] & kMulticastBit) != 0; })) {
    throw Refused(QEX_BAD_PARAM);
  }
}

}  // namespace simhost::mac
