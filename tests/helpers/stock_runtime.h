/**
 * What the wrapper runtime does by itself where a helper of the module takes its place.
 */
#ifndef TESTS_HELPERS_STOCK_RUNTIME_H
#define TESTS_HELPERS_STOCK_RUNTIME_H

#include <Python.h>

#ifdef __cplusplus
extern "C" {
#endif

/** The exception that the runtime raises for an argument with this kind of error. */
PyObject *stock_exception_of_kind(int kind);

#ifdef __cplusplus
}
#endif

#endif
