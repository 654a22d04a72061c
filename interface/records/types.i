// Scalar types of the host kernel interface: names of one width and signedness are one type, so a
// pointer to one passes where another is expected.

%{
#include <stdarg.h>
#include "qexapi/types.h"
%}
%include "qexapi/types.h"

// Types that neither a call nor a record uses, for other modules of the runtime that do.
typedef __builtin_va_list __gnuc_va_list;
typedef __gnuc_va_list va_list;
%types(signed char *, short *, long long *, unsigned long long *, va_list *);
