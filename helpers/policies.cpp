// Bodies of the methods of policy records; see policies.h.

#include "helpers/policies.h"

#include <cstring>

#include "helpers/slots.h"

namespace {

using PortName = char[QEX_NEB_NAME_MAX_LEN];

PortName *name_at(VSTeamPolicy *policy, int index) {
  return signed_index_is_valid(index, QEX_TEAM_MAX_UPLINKS)
             ? element_at<PortName>(policy->uplinkPortName, index)
             : nullptr;
}

}  // namespace

extern "C" {

char const *team_policy_name_at(VSTeamPolicy *policy, int index) {
  PortName const *const name = name_at(policy, index);
  return name != nullptr ? *name : nullptr;
}

void team_policy_set_name_at(VSTeamPolicy *policy, int index, char const *name) {
  PortName *const slot = name_at(policy, index);
  if (slot != nullptr) {
    fill_slot(*slot, name);
  }
}

VSPvlanMapEntry pvlan_entry_at(VSPvlanMapEntry *entries, int index) {
  VSPvlanMapEntry entry;
  std::memcpy(&entry, element_at<VSPvlanMapEntry>(entries, index), sizeof entry);
  return entry;
}

qex_NEBPortVIDRange vlan_policy_range_at(VSPortVlanPolicy *policy, int index) {
  qex_NEBPortVIDRange range;
  std::memcpy(&range, element_at<qex_NEBPortVIDRange>(policy + 1, index), sizeof range);
  return range;
}

}  // extern "C"
