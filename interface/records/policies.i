// Policies of switches and ports. The caller makes the records, fills or has them filled, and frees
// them; arrays of private-VLAN entries go to VSDVS_SetPrivateVLANMap.

%record(VSPvlanMapEntry)
%record(VSMACLearning)
%record(VSPortVlanPolicy)
%record(VSPropSecurity)
%record(VSExtraEthFilter)
%record(VSTeamPolicy)
%record(VSPMACLearning)
%record(VSPMACManagement)
%required(char const *text)

%{
#include "helpers/policies.h"
#include "vswitch/mac_learning.h"
#include "vswitch/port_mac_policies.h"
#include "vswitch/port_policies.h"
#include "vswitch/private_vlans.h"
#include "vswitch/teaming.h"
%}
%volatile_field(VSPvlanMapEntry::pad, padding)
%volatile_field(VSExtraEthFilter::pad, padding)
%volatile_field(VSPortVlanPolicy::pad, padding)
%include "vswitch/private_vlans.h"
%include "vswitch/mac_learning.h"
%include "vswitch/port_policies.h"
%include "vswitch/teaming.h"
%include "vswitch/port_mac_policies.h"

%extend VSPvlanMapEntry {
  VSPvlanMapEntry __getitem__(int index) { return pvlan_entry_at($self, index); }
}

%extend VSPortVlanPolicy {
  qex_NEBPortVIDRange get_vid_range(int index) { return vlan_policy_range_at($self, index); }
}

%extend VSTeamPolicy {
  char const *__getitem__(int index) { return team_policy_name_at($self, index); }
  void __setitem__(int index, char const *text) { team_policy_set_name_at($self, index, text); }
}

%record_array(VSPvlanMapEntry, pvlanmapentryArray)
