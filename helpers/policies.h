/**
 * Methods of policy records: team policies, port VLAN policies, private-VLAN maps.
 */
#ifndef HELPERS_POLICIES_H
#define HELPERS_POLICIES_H

#include "vswitch/port_policies.h"
#include "vswitch/private_vlans.h"
#include "vswitch/teaming.h"

#ifdef __cplusplus
extern "C" {
#endif

/**
 * The name in a slot, in the record; null and a notice for an index of 32 and above.
 *
 * Warning: a negative index passes and reads what stands before the slots.
 */
char const *team_policy_name_at(VSTeamPolicy *policy, int index);

/** Fills a slot of 81 chars, without a terminator if the name takes them all; bounds likewise. */
void team_policy_set_name_at(VSTeamPolicy *policy, int index, char const *name);

/** A copy of an entry of the array that starts at `entries`. Warning: the index is not checked. */
VSPvlanMapEntry pvlan_entry_at(VSPvlanMapEntry *entries, int index);

/** A copy of a trailing range of the policy. Warning: the index is not checked. */
qex_NEBPortVIDRange vlan_policy_range_at(VSPortVlanPolicy *policy, int index);

#ifdef __cplusplus
}
#endif

#endif
