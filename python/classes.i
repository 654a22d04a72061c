// libvswitch: the same definitions once more, and what its classes are beyond them. Only the tree that
// the generator parsed is used: from it make_classes.py, make_calls.py and make_stubs.py write what
// Python gets.
//
//   %base(RECORD, Class)          the base of the record's class, in libvswitch/_by_hand.py
//   %by_hand(METHOD)              the base has the method
//   %helper(METHOD, function)     the function of helpers/ that the method is
//   %within(METHOD, array)        its index is one of the array's
//   %table(RECORD, count)         a record that is a sequence, and how many elements it has: a field
//                                 or a number
//   %counted(RECORD::field, count)  an array without a size, and the field that counts its elements
//   %followed(RECORD, element, count)  in its block, after all of its fields: so many records, as a
//                                 field counts them
//   %packed(RECORD, element, field, length)  likewise, up to as many bytes of the whole block as the
//                                 field says, each as long as its own field `length` says
//   %rest(RECORD::field, length)  an array that goes on to the end of its record, which is as long as
//                                 that field says
//   %view(RECORD::field, tag, constant)  of a union: the view that holds if the field `tag` is the
//                                 constant; FORM stands for the argument that names the form
//   %holds_text(RECORD::field)    an array of bytes that holds a text and its NUL
//   %same_bytes(RECORD::field)    another way to look at the first field of its union
//   %returns(METHOD, type)        what a method returns, where the definitions only say an object
//   %null(METHOD, when)           that it returns null never, or only on a failure

%module libvswitch

%define %base(RECORD, CLASS)
%feature("base", "CLASS") RECORD;
%enddef

%define %by_hand(METHOD)
%feature("by_hand", "1") METHOD;
%enddef

%define %helper(METHOD, FUNCTION)
%feature("helper", "FUNCTION") METHOD;
%enddef

%define %within(METHOD, ARRAY)
%feature("within:index", "ARRAY") METHOD;
%enddef

%define %table(RECORD, COUNT)
%feature("count", "COUNT") RECORD;
%enddef

%define %counted(FIELD, COUNT)
%feature("count", "COUNT") FIELD;
%enddef

%define %followed(RECORD, ELEMENT, COUNT)
%feature("followed", "ELEMENT COUNT") RECORD;
%enddef

%define %packed(RECORD, ELEMENT, SIZE, LENGTH)
%feature("packed", "ELEMENT SIZE LENGTH") RECORD;
%enddef

%define %rest(FIELD, LENGTH)
%feature("rest", "LENGTH") FIELD;
%enddef

%define %view(FIELD, TAG, CONSTANT)
%feature("view", "TAG CONSTANT") FIELD;
%enddef

%define %holds_text(FIELD)
%feature("holds_text", "1") FIELD;
%enddef

%define %same_bytes(FIELD)
%feature("same_bytes", "1") FIELD;
%enddef

%define %returns(METHOD, TYPE...)
%feature("returns", "TYPE") METHOD;
%enddef

%define %null(METHOD, WHEN)
%feature("null", "WHEN") METHOD;
%enddef

%table(VSUplinks, numEntries)
%table(VSUplinkPorts, nUplinkPorts)
%table(VSUplinkPortIds, nUplinkPorts)
%table(VSTeamPolicy, 32)
%table(VSMACTable, numEntries)
%table(VSDVMirrorSessionIDs, numEntries)
%table(VSPromiscSessionActiveDsts, numEntries)
%table(DVMirrorSessionTable, numSessions)

%base(VSLAGTable, LagTable)
%base(VSRuntimeOptions, RuntimeOptions)
%base(VSRuntimeOptionHeader, RuntimeOption)
%base(DVMirrorSessionTable, MirrorTable)
%base(VSMcastFilters, OfOneForm)
%base(VSMcastFilterStats, OfOneForm)
%by_hand(VSRuntimeOptions::add_int_option)
%by_hand(VSRuntimeOptions::add_str_option)
%by_hand(VSRuntimeOptions::set_options_length)
%by_hand(VSRuntimeOptions::get_first_option)
%by_hand(VSRuntimeOptions::get_next_option)
%by_hand(VSRuntimeOptionHeader::get_option_name)
%by_hand(VSRuntimeOptionHeader::get_option_value)

%within(VSMcastFilters::get_mac_entry, macEntries)
%within(VSMcastFilters::get_ip_entry, ipv4Entries)
%within(VSMcastFilters::get_ipv6_entry, ipv6Entries)
%within(VSMcastFilterStats::get_ip_entry, ipv4Entries)
%within(VSMcastFilterStats::get_ipv6_entry, ipv6Entries)
%within(VSPortVlanPolicy::get_vid_range, vidRanges)

%counted(VSUplinks::entries, numEntries)
%counted(VSUplinkPorts::uplinkPortName, nUplinkPorts)
%counted(VSUplinkPortIds::uplinkPortId, nUplinkPorts)
%counted(VSMACTable::macEntries, numEntries)
%counted(VSMcastFilters::macEntries, numEntries)
%counted(VSMcastFilters::ipv4Entries, numEntries)
%counted(VSMcastFilters::ipv6Entries, numEntries)
%counted(VSMcastFilterStats::ipv4Entries, numEntries)
%counted(VSMcastFilterStats::ipv6Entries, numEntries)
%counted(VSDVMirrorSessionIDs::entries, numEntries)
%counted(VSPromiscSessionActiveDsts::entries, numEntries)
%counted(DVMirrorSessionTable::sessions, numSessions)
%counted(DVPortList::dvPort, nports)
%counted(VSLAGStatus::uplinkNames, numUplinks)
%counted(VSPortList::ports, numPorts)
%counted(VSPortVlanPolicy::vidRanges, numRanges)
%counted(qex_NEBPortVlanInfo::vidRanges, numRanges)

%followed(VSLAGTable, VSLAGStatus, numLAGs)
%followed(DVMirrorSessionTable, DVMirrorEntity, numEntities)
%packed(VSRuntimeOptions, VSRuntimeOptionHeader, totalLength, length)
%rest(VSRuntimeOptionHeader::data, length)

%view(VSMcastFilters::macEntries, FORM, VS_MCAST_FILTER_MODE_LEGACY)
%view(VSMcastFilters::ipv4Entries, FORM, VS_MCAST_FILTER_MODE_IGMP)
%view(VSMcastFilters::ipv6Entries, FORM, VS_MCAST_FILTER_MODE_MLD)
%view(VSMcastFilterStats::ipv4Entries, FORM, VS_MCAST_FILTER_MODE_IGMP)
%view(VSMcastFilterStats::ipv6Entries, FORM, VS_MCAST_FILTER_MODE_MLD)
%view(DVMirrorEntity::dvPortId, type, MIRROR_ENTTYPE_DVPORT)
%view(DVMirrorEntity::uplink, type, MIRROR_ENTTYPE_UPLINK)
%view(DVMirrorEntity::vlan, type, MIRROR_ENTTYPE_VLAN)
%view(DVMirrorEntity::ip, type, MIRROR_ENTTYPE_IP)
%view(DVMirrorEntity::portId, type, MIRROR_ENTTYPE_PORT)
%view(DVMirrorIP::ipv4, isIPv6, QEX_FALSE)
%view(DVMirrorIP::ipv6, isIPv6, QEX_TRUE)

%holds_text(VSInfo::dvsName)
%holds_text(VSInfo::nebID)
%holds_text(VSLAGStatus::name)

%same_bytes(qex_SocketIPv6AddressAddr___u6_addr::__u6_addr16)
%same_bytes(qex_SocketIPv6AddressAddr___u6_addr::__u6_addr32)

%returns(VSMcastFilters::get_mac_entry, str)
%returns(VSMcastFilters::get_ip_entry, str)
%returns(VSMcastFilters::get_ipv6_entry, str)
%returns(VSMcastFilterStats::get_ip_entry, str)
%returns(VSMcastFilterStats::get_ipv6_entry, str)
%returns(VSRuntimeOptionHeader::get_option_value, Union[int, bytes])
%returns(DVMirrorEntity::get_entity, str)
%returns(VSDVMirrorSessionIDs::__getitem__, bytes)

%null(VSUplinks::__getitem__, failure)
%null(VSUplinkPorts::__getitem__, failure)
%null(VSUplinkPortIds::__getitem__, failure)
%null(VSTeamPolicy::__getitem__, failure)
%null(VSPromiscSessionActiveDsts::__getitem__, failure)
%null(DVMirrorSessionTable::__getitem__, failure)
%null(DVMirrorSessionTable::get_first_session, never)
%null(DVMirrorSessionTable::get_first_session_entity, never)
%null(DVMirrorEntity::next, never)
%null(VSRuntimeOptions::get_first_option, never)
%null(VSRuntimeOptionHeader::get_option_name, never)
%null(alloc_dvmirror_session_table, failure)
%null(new_vidrangeArray, failure)
%null(new_pvlanmapentryArray, failure)

// Records that only show as views into their parent have no class to register.
%ignore VSIOCtlQuery_mcastFilter;
%ignore VSIOCtlQuery_uplink;

// The generator documents no function of two forms.
%feature("docstring") DVSAliasToPortsetName
"Writes the name of the set of ports of the switch with an alias: a status and the text. With an
array of the caller's as well, only the status.";

// Which function of helpers/ a method is, where it is said what it does.
%helper(qex_Name::__repr__, name_text)
%helper(VSMACEntry::__getitem__, mac_entry_at)
%helper(VSMACEntry::set_mac_address, mac_entry_set_address)
%helper(VSMcastFilters::get_mac_entry, mcast_filters_mac_at)
%helper(VSMcastFilters::get_ip_entry, mcast_filters_ipv4_at)
%helper(VSMcastFilters::get_ipv6_entry, mcast_filters_ipv6_at)
%helper(VSMcastFilterStats::get_ip_entry, mcast_filter_stats_ipv4_at)
%helper(VSMcastFilterStats::get_ipv6_entry, mcast_filter_stats_ipv6_at)
%helper(VSRuntimeOptionHeader::get_option_name, runtime_option_name)
%helper(VSRuntimeOptionHeader::get_option_value, runtime_option_value)
%helper(VSRuntimeOptions::add_int_option, runtime_options_add_int)
%helper(VSRuntimeOptions::add_str_option, runtime_options_add_text)
%helper(VSRuntimeOptions::set_options_length, runtime_options_set_length)
%helper(VSRuntimeOptions::get_first_option, runtime_options_first)
%helper(VSRuntimeOptions::get_next_option, runtime_options_next)
%helper(DVMirrorEntity::next, mirror_next_entity)
%helper(DVMirrorEntity::get_entity, mirror_entity_text)
%helper(DVMirrorEntity::set_entity, mirror_set_entity_text)
%helper(DVMirrorSessionTable::get_first_session, mirror_first_session)
%helper(DVMirrorSessionTable::__getitem__, mirror_session_at)
%helper(DVMirrorSessionTable::__setitem__, mirror_set_session_at)
%helper(DVMirrorSessionTable::get_first_session_entity, mirror_entity_at)
%helper(VSDVMirrorSessionIDs::__getitem__, mirror_session_ids_at)
%helper(VSPromiscSessionActiveDsts::__getitem__, promisc_destination_at)
%helper(VSPromiscSessionActiveDsts::__setitem__, promisc_set_destination_at)
%helper(VSPvlanMapEntry::__getitem__, pvlan_entry_at)
%helper(VSPortVlanPolicy::get_vid_range, vlan_policy_range_at)
%helper(VSTeamPolicy::__getitem__, team_policy_name_at)
%helper(VSTeamPolicy::__setitem__, team_policy_set_name_at)
%helper(VSUplinks::__getitem__, uplinks_name_at)
%helper(VSUplinks::__setitem__, uplinks_set_name_at)
%helper(VSUplinkPorts::__getitem__, uplink_ports_name_at)
%helper(VSUplinkPorts::__setitem__, uplink_ports_set_name_at)
%helper(VSUplinkPortIds::__getitem__, uplink_port_ids_id_at)
%helper(VSUplinkPortIds::__setitem__, uplink_port_ids_set_id_at)

%include "libvswitch.i"
