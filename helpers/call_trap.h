/** The module's side of the call trap. */
#ifndef HELPERS_CALL_TRAP_H
#define HELPERS_CALL_TRAP_H

#include <Python.h>

#include "vswitch/call_trap.h"

#ifdef __cplusplus
extern "C" {
#endif

/** Raises what the library that sprang the trap left behind, and returns null. */
PyObject *raise_sprung_trap(void);

#ifdef __cplusplus
}
#endif

#endif
