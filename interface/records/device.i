// Switches, their ports and uplinks as the kernel runs them, and the commands of its device. The
// caller makes the records, queries fill them.

%record(VSInfo)
%record(VSStats)
%record(VSRARPStats)
%record(VSServicePortTeamingStats)
%record(VSPortList)
%record(VSPortInfo_ethFrpAccepted)
%record(VSPortInfo_vlan)
%record(VSPortInfo)
%record(VSVLANBitmap)
%record(VSVLAN)
%view_only(VSPortInfo, ethFrpAccepted)
%view_only(VSPortInfo, vlan)

%record(VSIOCtlQuery)
%record(VSIOCtlData)
%inner_record(VSIOCtlQuery_mcastFilter)
%inner_record(VSIOCtlQuery_uplink)
%view_only(VSIOCtlQuery, mcastFilter)
%view_only(VSIOCtlQuery, uplink)

%{
#include "vswitch/device_queries.h"
#include "vswitch/mcast_filter_modes.h"
#include "vswitch/port_info.h"
#include "vswitch/statistics.h"
#include "vswitch/switch_info.h"
%}
%volatile_field(VSInfo::nebID, switch_id)
%volatile_field(VSRARPStats::rarpPktsSent, count)
%volatile_field(VSRARPStats::maxRARPTime, time)
%volatile_field(VSRARPStats::rarpTime, time)
%volatile_field(VSServicePortTeamingStats::txFromSrvPort, count)
%volatile_field(VSServicePortTeamingStats::txUsingSrvPortFRP, count)
%volatile_field(VSServicePortTeamingStats::txUsingPktSrcPortFRP, count)
%volatile_field(VSServicePortTeamingStats::txErrors, count)
%volatile_field(VSServicePortTeamingStats::rxToSrvPort, count)
%volatile_field(VSServicePortTeamingStats::rxRpfOverride, count)
%include "vswitch/switch_info.h"
%include "vswitch/statistics.h"
%include "vswitch/device_queries.h"
%include "vswitch/mcast_filter_modes.h"
%include "vswitch/port_info.h"
