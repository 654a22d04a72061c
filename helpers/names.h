/** The printed form of a `qex_Name`. */
#ifndef HELPERS_NAMES_H
#define HELPERS_NAMES_H

#include "qexapi/names.h"

#ifdef __cplusplus
extern "C" {
#endif

/** The bare text of `name`, which must hold its NUL; null for a null name. Points into the record.
 */
char const *name_text(qex_Name const *name);

#ifdef __cplusplus
}
#endif

#endif
