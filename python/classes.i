// libvswitch: the same definitions once more, as classes over the flat functions. Only the Python
// that the generator writes for them is used, and the tree from which stubs are made.
//
//   %table(RECORD, count)         a record that is a sequence, and how many elements it has: a field
//                                 or a number
//   %counted(RECORD::field, count)  an array without a size, and the field that counts its elements
//   %answers(METHOD, type)        what a method answers, where the definitions only say an object

//   %null(METHOD, when)           that it answers null never, or only on a failure

%module libvswitch

%pythonbegin %{
from libvswitch._records import Record, Table
%}

// Every record has the base that prints it and keeps its memory; its fields are all it can be given.
%feature("python:abc", "Record");

%define %table(RECORD, COUNT)
%feature("python:abc", "Table") RECORD;
%feature("count", "COUNT") RECORD;
%enddef

%define %counted(FIELD, COUNT)
%feature("count", "COUNT") FIELD;
%enddef

%define %answers(METHOD, TYPE...)
%feature("answers", "TYPE") METHOD;
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

%answers(VSMcastFilters::get_mac_entry, str)
%answers(VSMcastFilters::get_ip_entry, str)
%answers(VSMcastFilters::get_ipv6_entry, str)
%answers(VSMcastFilterStats::get_ip_entry, str)
%answers(VSMcastFilterStats::get_ipv6_entry, str)
%answers(VSRuntimeOptionHeader::get_option_value, Union[int, bytes])
%answers(DVMirrorEntity::get_entity, str)
%answers(VSDVMirrorSessionIDs::__getitem__, bytes)

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

%include "libvswitch.i"

// Every class has registered itself; nobody else is to.
%pythoncode %{
for _name in [_name for _name in globals() if _name.endswith("_swigregister")]:
    del globals()[_name]
%}
