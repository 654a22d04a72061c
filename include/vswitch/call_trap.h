#ifndef VSWITCH_CALL_TRAP_H
#define VSWITCH_CALL_TRAP_H

/**
 * @file
 * The call trap: how a library of the host ends a call that it cannot carry out, without ending the
 * process.
 *
 * The caller arms the trap right before a call: it stores the result of `setjmp(exception_buffer)`
 * in `exception_status`, which is 0 then. A call that traps stores an exception type and a message
 * and jumps to the buffer with a value other than 0; the caller raises that exception. The jump
 * must come from the thread that armed the trap and while its call is running. Nothing that
 * the jump crosses is cleaned up.
 *
 * The module defines and exports the four globals; they are zero until first used.
 */

#include <setjmp.h>

#ifdef __cplusplus
extern "C" {
#endif

struct _object;

/** The context of the caller that armed the trap last. */
extern jmp_buf exception_buffer;

/** 0 after arming; after a jump, the value that it was made with. */
extern int exception_status;

/** The Python exception type to raise; the library stores it, a borrowed reference suffices. */
extern struct _object *exceptionType;

/** The NUL-terminated UTF-8 text to raise with it; the library's memory, valid after the jump. */
extern char *exceptionMsg;

#ifdef __cplusplus
}
#endif

#endif  // VSWITCH_CALL_TRAP_H
