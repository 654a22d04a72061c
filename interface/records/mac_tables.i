// MAC tables. Tables are the library's and are released with VSQEX_FreeMemory; statistics and
// properties are the caller's.

%record(VSMACEntry)
%record(VSMACTable)
%record(VSMACLearningGlobalProps)
%record(VSPMACLearningStats)

%{
#include "helpers/tables.h"
#include "vswitch/device.h"
#include "vswitch/mac_tables.h"

/* Hidden from the generator: a typedef that it sees joins a class of spellings. */
typedef size_t SIZE;
%}

// A hardware address reads as text; it is written as bytes.
%typemap(out, noblock=1, python="text") unsigned char macAddress[6], unsigned char fixedHwID[6] {
  %set_output(mac_text($1));
}

// The raw bytes of an address, six of them whatever the object's length.
%typemap(in, noblock=1) (unsigned char *mac_str, SIZE) (Py_buffer view, int held = 0) {
  if (PyObject_GetBuffer($input, &view, PyBUF_SIMPLE) < 0) {
    PyErr_Clear();
    %argument_fail(SWIG_TypeError, "(unsigned char *mac_str, SIZE)", $symname, $argnum);
  }
  held = 1;
  $1 = view.buf;
  $2 = view.len;
}
%typemap(freearg, noblock=1) (unsigned char *mac_str, SIZE) {
  if (held$argnum) PyBuffer_Release(&view$argnum);
}
// The default, which nothing uses, would put a type into the table.
%typemap(typecheck) SIZE "";

// For what is made beside the module: one buffer stands for both parameters.
%feature("takes:mac_str", "buffer") VSMACEntry::set_mac_address;
%feature("takes:length", "part") VSMACEntry::set_mac_address;

%volatile_field(VSMACEntry::elapsed, time)
%volatile_field(VSPMACLearningStats::noLearningAllowedPkts, count)
%volatile_field(VSPMACLearningStats::noLearningDroppedPkts, count)
%volatile_field(VSPMACLearningStats::numMACsMoved, count)
%include "vswitch/device.h"
%include "vswitch/mac_tables.h"

%extend VSMACEntry {
  VSMACEntry __getitem__(int index) { return mac_entry_at($self, index); }
  void set_mac_address(unsigned char *mac_str, SIZE length) {
    (void)length;
    mac_entry_set_address($self, mac_str);
  }
}
