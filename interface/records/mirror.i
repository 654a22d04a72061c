// Mirror session tables, and what running sessions tell. A table that the caller allocates, the
// caller frees; one that a call returns is released to the library. Sessions and entities lie in their
// table.

%record(DVMirrorIP)
%record(DVMirrorEntity)
%record(DVMirrorSession)
%record(DVMirrorSessionTable)
%record(VSDVMirrorSessionStats)
%record(VSDVMirrorSessionIDs)
%record(VSPromiscSessionActiveDsts)
%required(DVMirrorSession const *session)
%required(qex_SwitchPortID const *port)
%required(char const *text)

%{
#include "helpers/mirror.h"
#include "vswitch/properties.h"
%}
%volatile_field(VSDVMirrorSessionStats::mirrorPktCnt, count)
%volatile_field(VSDVMirrorSessionStats::mirrorPktFailCnt, count)
%volatile_field(VSDVMirrorSessionStats::mirroredPkts, count)
%volatile_field(VSDVMirrorSessionStats::discardedPkts, count)
%volatile_field(VSDVMirrorSessionStats::failedPkts, count)
%volatile_field(VSPromiscSessionActiveDsts::entries, port_number)
%volatile_field(DVMirrorEntity::portId, port_number)
%volatile_field(DVMirrorIP::pad, padding)
%volatile_field(DVMirrorSession::pad0, padding)
%volatile_field(DVMirrorSession::pad1, padding)
%volatile_field(DVMirrorSession::pad2, padding)
%volatile_field(DVMirrorSessionTable::pad, padding)
%include "vswitch/properties.h"
%include "vswitch/mirror.h"

%allocates(alloc_dvmirror_session_table, RESULT, free_dvmirror_session_table)
%releases(free_dvmirror_session_table, table)
%nullable(free_dvmirror_session_table, table)
DVMirrorSessionTable *alloc_dvmirror_session_table(int numSessions, int numEntities);
void free_dvmirror_session_table(DVMirrorSessionTable *table);
void MIRROR_ENCAP_TYPE(void);
void MIRROR_ASSERT(void);

%extend DVMirrorSessionTable {
  DVMirrorSession *get_first_session() { return mirror_first_session($self); }
  DVMirrorSession *__getitem__(int index) { return mirror_session_at($self, index); }
  void __setitem__(int index, DVMirrorSession const *session) {
    mirror_set_session_at($self, index, session);
  }
  DVMirrorEntity *get_first_session_entity(int index) { return mirror_entity_at($self, index); }
}

%extend DVMirrorEntity {
  DVMirrorEntity *next() { return mirror_next_entity($self); }
  PyObject *get_entity() {
    MirrorEntityText const text = mirror_entity_text($self);
    return SWIG_FromCharPtr(text.text);
  }
  void set_entity(char const *text) { mirror_set_entity_text($self, text); }
}

%extend VSDVMirrorSessionIDs {
  PyObject *__getitem__(int index) { return mirror_session_ids_at($self, index); }
}

%extend VSPromiscSessionActiveDsts {
  qex_SwitchPortID *__getitem__(int index) { return promisc_destination_at($self, index); }
  void __setitem__(int index, qex_SwitchPortID const *port) {
    promisc_set_destination_at($self, index, port);
  }
}
