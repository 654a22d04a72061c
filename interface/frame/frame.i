// The frame: what every module over these definitions shares. Each file says what must stand before
// it; docs/development/overrides.md tells of each override of the generator's runtime.

// What of the runtime was wrong.
%include "frame/fixes/startup.i"
%include "frame/fixes/overloads.i"
%include "frame/fixes/pointer_objects.i"
%include "frame/fixes/checks.i"

// What of it was slow.
%include "frame/speed/arguments.i"
%include "frame/speed/vector_calls.i"
%include "frame/speed/pointer_objects.i"
%include "frame/speed/memory.i"
%include "frame/speed/results.i"

// How values and failures cross.
%include "frame/typemaps/failures.i"
%include "frame/typemaps/call_trap.i"
%include "frame/typemaps/pointers.i"
%include "frame/typemaps/scalars.i"
%include "frame/typemaps/texts.i"
%include "frame/typemaps/records.i"
%include "frame/typemaps/arrays.i"
%include "frame/typemaps/results.i"
%include "frame/typemaps/constants.i"
