// Names, counted texts and list links. The caller fills and frees them; other records hold names by
// value.

%record(qex_String)
%record(qex_Name)
%record(qex_ListLinks)

%{
#include "helpers/names.h"
#include "qexapi/lists.h"
%}
%include "qexapi/names.h"
%include "qexapi/lists.h"

%extend qex_Name {
  char const *__repr__() { return name_text($self); }
}
