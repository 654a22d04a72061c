// What only a simulated host offers: libsimhost.so exports these, so that a program which finds one
// of them knows that the host it talks to is simulated. For C, C++ and foreign-function interfaces.
#ifndef SIMHOST_CONTROL_SIMHOST_H
#define SIMHOST_CONTROL_SIMHOST_H

#include <stddef.h>

#ifdef __cplusplus
extern "C" {
#endif

/** The version of the simulated host: "major.minor.patch". Static text. */
char const *simhost_version(void);

/** How many blocks of memory the host has given out in this process and not got back. */
size_t simhost_ledger_count(void);

/**
 * One line per block that is out, oldest first: "<address> <size> bytes from <call>".
 *
 * @param text receives as much as fits and a NUL; null if `size` is 0
 * @param size bytes at `text`
 * @return bytes of the whole report without its NUL
 */
size_t simhost_ledger_report(char *text, size_t size);

#ifdef __cplusplus
}
#endif

#endif  // SIMHOST_CONTROL_SIMHOST_H
