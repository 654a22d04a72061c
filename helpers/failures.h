/**
 * Failure reports that a wrapper makes before it calls anything. Each sets a Python error and is
 * called on the failing path only.
 */
#ifndef HELPERS_FAILURES_H
#define HELPERS_FAILURES_H

#include <Python.h>
#include <stdbool.h>

/** Keeps what leads here out of the way of what does not. */
#define COLD __attribute__((cold))

#ifdef __cplusplus
extern "C" {
#endif

/**
 * The exception that reports an error kind, a borrowed reference. Kinds are the small negative
 * numbers of the wrapper runtime; a generic error is a wrong type, an unknown kind a runtime error.
 */
PyObject *exception_of_kind(int kind);

/** "in method '...', argument <position> of type '...'", with the exception of `kind`. */
void report_argument(int kind, char const *method, int position, char const *type) COLD;

/** "invalid null reference in method '...', argument <position> of type '...'", a ValueError. */
void report_null_argument(char const *method, int position, char const *type) COLD;

/** "invalid null reference in variable '...' of type '...'", a ValueError. */
void report_null_variable(char const *name, char const *type) COLD;

/**
 * Raises the interpreter's own error for a wrong number of arguments; null, as a call returns then.
 *
 * `args` is the argument tuple, `expected` the number of arguments that `method` takes.
 */
PyObject *report_argument_count(PyObject *args, char const *method, int expected) COLD;

/**
 * Whether `method` accepts a null record: writers then store nothing, destructors have nothing to
 * free, and the printed form of no name is no text. Everything else needs a real record.
 */
bool accepts_null_record(char const *method) COLD;

#ifdef __cplusplus
}
#endif

#endif
