// The measured functions as the generator makes them with its own typemaps only, in its default mode.

%module stock

%{
#include "vswitch/configuration.h"
#include "vswitch/queries.h"
%}

%include <typemaps.i>
%apply int *OUTPUT { int *portID };

// The library has no typemap for the record that a pointer points to, so a user writes one.
%typemap(in, numinputs=0) VSUplinks **uplinks (VSUplinks *record = NULL) "$1 = &record;"
%typemap(argout) VSUplinks **uplinks {
  $result = SWIG_Python_AppendOutput($result, SWIG_NewPointerObj(*$1, $*1_descriptor, 0));
}

// Flexible arrays have no writers.
%immutable VSUplinks::entries;

%include "qexapi/types.h"
%include "qexapi/names.h"
%include "vswitch/switch_info.h"
%include "vswitch/uplinks.h"

%extend VSUplinks {
  qex_uint32 __len__() { return $self->numEntries; }
  char const *__getitem__(int index) {
    return (qex_uint32)index < $self->numEntries ? $self->entries[index].name.string : NULL;
  }
}

typedef int QEX_ReturnStatus;
QEX_ReturnStatus VSDVS_SetMTU(char const *switchName, qex_uint32 mtu);
QEX_ReturnStatus VSDVS_DvPortIDToPortID(char const *switchName, char const *port, int *portID);
QEX_ReturnStatus VSQEX_GetVSInfo(char const *switchName, VSInfo *info);
QEX_ReturnStatus VSQEX_GetUplinks(char const *switchName, VSUplinks **uplinks);
