// _libvswitch: flat functions over the two libraries through which a host controls its virtual
// switches. This file is the table of contents; the order of its parts is the order in which the
// module installs constants and variables.

%module _libvswitch

// The frame: how calls are made and how values cross. Each file states what must stand before it.
%include "frame/runtime.i"
%include "frame/call_trap.i"
%include "frame/scalars.i"
%include "frame/texts.i"
%include "frame/records.i"
%include "frame/results.i"

// The host kernel interface.
%include "records/types.i"
%include "records/status.i"
%include "records/variables.i"
%include "records/names.i"

// libvswitch.
%include "records/switch_info.i"
%include "calls/configuration.i"
%include "calls/queries.i"
%include "calls/status_text.i"
