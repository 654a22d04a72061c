/**
 * Failure reports that a wrapper makes before it calls anything. Each sets a Python error and is
 * called on the failing path only.
 */
#ifndef HELPERS_FAILURES_H
#define HELPERS_FAILURES_H

#include <Python.h>
#include <stdbool.h>
#include <string.h>

#ifdef __cplusplus
extern "C" {
#endif

/**
 * Raises the interpreter's own error for a wrong number of arguments and answers 0.
 *
 * `args` is the argument tuple, `expected` the number of arguments that `method` takes.
 */
int wrong_argument_count(PyObject *args, char const *method, int expected);

#ifdef __cplusplus
}
#endif

/**
 * Whether `method` accepts a null record: writers then store nothing, destructors have nothing to
 * free, and the printed form of no name is no text. Everything else needs a real record.
 *
 * Inline, because with the literal that every wrapper passes the compiler knows the answer.
 */
static inline bool accepts_null_record(char const *method) {
  size_t const length = strlen(method);
  return (length > 4 && strcmp(method + length - 4, "_set") == 0) ||
         strncmp(method, "delete_", 7) == 0 || strcmp(method, "qex_Name___repr__") == 0;
}

#endif
