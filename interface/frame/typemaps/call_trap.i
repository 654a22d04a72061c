// The call trap: a call that traps jumps back into the wrapper that called it, which raises
// the exception that the library named. Readers and writers of fields call nothing and arm nothing.
// Stands before every function that arms it.

%{
#include "helpers/call_trap.h"
%}

// What the sprung trap leaves behind is deliberate: copies of text arguments may have been handed on
// by the library whose call trapped, so nobody knows whether they are still in use.
%exception {
  exception_status = setjmp(exception_buffer);
  if (exception_status != 0) return raise_sprung_trap();
  $action
}

// For a function that must run outside the trap.
%define %untrapped(NAME)
%exception NAME "$action"
%enddef
