// The rules of teaming policies.
#include "model/teaming/properties.h"

#include <fmt/format.h>

#include <set>
#include <span>
#include <string_view>

namespace simhost::teaming {

void check_policy(VSTeamPolicy const &policy) {
  if (!form::is_among(policy.loadBalance, kBalances) ||
      (policy.linkCriteria & ~form::all_bits(kCriteria)) != 0 ||
      (policy.flags & ~form::all_bits(kFlags)) != 0 || policy.percentError > kMostPercent) {
    throw Refused(QEX_BAD_PARAM);
  }
  auto const count = qex_uint64{policy.numActive} + policy.numStandby;
  if (count > QEX_TEAM_MAX_UPLINKS) {
    throw Refused(QEX_LIMIT_EXCEEDED,
                  fmt::format("a team has at most {} uplinks", QEX_TEAM_MAX_UPLINKS));
  }
  std::set<std::string_view> names;
  for (auto const &field : std::span(policy.uplinkPortName).first(count)) {
    auto const name = text_in(field);
    if (name.empty() || !names.insert(name).second) {
      throw Refused(QEX_BAD_PARAM);
    }
  }
}

}  // namespace simhost::teaming
