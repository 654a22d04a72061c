// Names and counted texts. The caller fills and frees them; other records hold names by value.

%record(qex_String)
%record(qex_Name)

%{
#include "helpers/names.h"
%}
%include "qexapi/names.h"

%extend qex_Name {
  char const *__repr__() { return name_text($self); }
}
