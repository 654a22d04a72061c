// The vocabulary of the binding definitions in the generator's own terms: nothing is replaced that the
// generator or its library has, and the rest is what its manual tells a user to write.

%include <carrays.i>
%include <cstring.i>
%include <typemaps.i>

// Records.

%define %record(NAME)
%enddef
%define %union_record(NAME)
%enddef
%define %sized_record(NAME, MAKE)
%extend NAME {
  NAME(int size) { return MAKE(size); }
}
%enddef
%define %inner_record(NAME)
%nodefaultctor NAME;
%nodefaultdtor NAME;
%rename("$ignore", %$ismember, fullname=1, regextarget=1) "^" #NAME "::";
%enddef
%define %view_only(RECORD, FIELD)
%immutable RECORD::FIELD;
%enddef
%define %required(PARAMETER...)
%enddef
%define %record_array(TYPE, NAME)
%array_functions(TYPE, NAME)
%enddef

// Arguments.

%define %array_argument(PARAMETER...)
%enddef

// Results.

%define %record_out_as(PARAMETER, RECORD)
%typemap(in, numinputs=0) PARAMETER (void *record = NULL) "$1 = ($1_ltype)&record;"
%typemap(argout) PARAMETER {
  $result = SWIG_Python_AppendOutput($result, SWIG_NewPointerObj(*$1, $descriptor(RECORD *), 0));
}
%enddef
%define %record_out(PARAMETER...)
%typemap(in, numinputs=0) PARAMETER ($*1_ltype record = NULL) "$1 = &record;"
%typemap(argout) PARAMETER {
  $result = SWIG_Python_AppendOutput($result, SWIG_NewPointerObj(*$1, $*descriptor, 0));
}
%enddef
%define %integer_out(PARAMETER...)
%apply int *OUTPUT { PARAMETER };
%enddef
%define %boolean_out(PARAMETER...)
%apply signed char *OUTPUT { PARAMETER };
%enddef
%define %text_out(PARAMETER, LENGTH)
%cstring_bounded_output(PARAMETER, LENGTH)
%enddef
%define %raw_bytes(PARAMETER...)
%typemap(in) PARAMETER {
  $1 = ($1_ltype)PyBytes_AsString($input);
  if (!$1) SWIG_fail;
}
%enddef
%define %untrapped(NAME)
%enddef
%define %overloaded(NAME)
%enddef
%define %called_by_tuple(NAME)
%enddef
