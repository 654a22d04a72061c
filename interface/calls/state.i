// libnebPublic: the state of distributed switches. Every DVSQEX_* call answers a status; what calls
// hand out through a pointer that the caller passes is the library's until DVSQEX_DataFree. Of
// libvswitch, the text of a status and the panic of a caller.

%{
#include "nebpublic/data.h"
#include "nebpublic/kernel_state.h"
#include "nebpublic/names.h"
#include "nebpublic/state.h"
#include "vswitch/status_text.h"
%}

%include "nebpublic/data.h"
%include "nebpublic/state.h"
%include "nebpublic/kernel_state.h"

// One C function under two shapes: with a text behind the status, or with an array of the caller's
// whose contents are discarded.
%text_out(char *portsetBuffer, 128)
%array_argument(char switchId[64])                      // DVSAliasToSwitchId
%array_argument(char alias[128])                        // DVSPortsetNameToAlias
%array_argument(char portsetName[128])                  // DVSAliasToPortsetName
%include "nebpublic/names.h"
QEX_ReturnStatus DVSAliasToPortsetName(char const *alias, char portsetName[128]);

// Panic reports and returns, or ends the process: it never springs the trap. Of its arguments only the
// format is passed on, with a null pointer behind it.
%untrapped(Panic)
%include "vswitch/status_text.h"
