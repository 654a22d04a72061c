// The constants that the module's variables read.

#include "helpers/exported.h"
#include "qexapi/types.h"

extern "C" {

EXPORTED extern qex_ModuleID const qex_ModuleCurrentID;
qex_ModuleID const qex_ModuleCurrentID = 0;

}  // extern "C"
