/**
 * The runtime options list: building one, walking one, and the names of the options.
 *
 * A list is its total length, then options back to back, each a header of 4 bytes and its value.
 * Options may start at any byte. All positions that a function returns lie in the list.
 */
#ifndef HELPERS_RUNTIME_OPTIONS_H
#define HELPERS_RUNTIME_OPTIONS_H

#include <Python.h>

#include "vswitch/runtime_options.h"

#ifdef __cplusplus
extern "C" {
#endif

/** The names of the options by type, VS_NUM_RT_OPT of them. */
extern char const *runtimeOptionNames[];

/** The type of the option with this name, in exactly these letters; VS_NUM_RT_OPT if none has it.
 */
int get_runtime_option_type_from_name(char *name);

/**
 * A list with a capacity of `size` bytes, which is all that is set: `totalLength` holds it until
 * `runtime_options_set_length`. The caller frees it. Null if there is no memory, which a negative
 * size always gets.
 */
VSRuntimeOptions *runtime_options_new(int size);

/**
 * Writes an option at `at` and returns where the next one goes.
 *
 * Null, with nothing written, if the option does not end before the last byte of the list: one byte
 * must stay free. An integer takes 8 bytes, a text its length and 5; a text of more than 127 bytes
 * is refused. The low 16 bits of `type` count; `name` is ignored.
 */
VSRuntimeOptionHeader *runtime_options_add_int(VSRuntimeOptions *list, VSRuntimeOptionHeader *at,
                                               char const *name, int type, int value);
VSRuntimeOptionHeader *runtime_options_add_text(VSRuntimeOptions *list, VSRuntimeOptionHeader *at,
                                                char const *name, int type, char const *value);

/** Ends the building: `used` bytes of options have been written. */
void runtime_options_set_length(VSRuntimeOptions *list, int used);

/** Where the first option is, even in an empty list: look at `totalLength` first. */
VSRuntimeOptionHeader *runtime_options_first(VSRuntimeOptions *list);

/** The next option, or null. The next one of an option of length 0 is that option itself, for ever.
 */
VSRuntimeOptionHeader *runtime_options_next(VSRuntimeOptions *list, VSRuntimeOptionHeader *option);

/** The name of an option. Warning: its type is not checked; only types below VS_NUM_RT_OPT have
 * one. */
char const *runtime_option_name(VSRuntimeOptionHeader *option);

/** The value of an option, a new reference: `bytes` up to the first NUL above type 12, else an
 * unsigned `int` of 32 bits. */
PyObject *runtime_option_value(VSRuntimeOptionHeader *option);

#ifdef __cplusplus
}
#endif

#endif
