// Uplinks: the physical links of a switch and its uplink ports. The library allocates the lists that
// calls return, and releases them; the caller makes and frees its own.

%record(VSUplinks_entries)
%sized_record(VSUplinks, uplinks_new)
%sized_record(VSUplinkPorts, uplink_ports_new)
%sized_record(VSUplinkPortIds, uplink_port_ids_new)
%view_only(VSUplinks, entries)
%required(char const *text)

%{
#include "helpers/uplinks.h"
%}
%volatile_field(VSUplinks_entries::portID, port_number)
%include "vswitch/uplinks.h"

%extend VSUplinks {
  qex_uint32 __len__() { return $self->numEntries; }
  char const *__getitem__(int index) { return uplinks_name_at($self, index); }
  void __setitem__(int index, char const *text) { uplinks_set_name_at($self, index, text); }
}

%extend VSUplinkPorts {
  qex_uint32 __len__() { return $self->nUplinkPorts; }
  char const *__getitem__(int index) { return uplink_ports_name_at($self, index); }
  void __setitem__(int index, char const *text) { uplink_ports_set_name_at($self, index, text); }
}

%extend VSUplinkPortIds {
  qex_uint32 __len__() { return $self->nUplinkPorts; }
  char const *__getitem__(int index) { return uplink_port_ids_id_at($self, index); }
  void __setitem__(int index, char const *text) { uplink_port_ids_set_id_at($self, index, text); }
}
