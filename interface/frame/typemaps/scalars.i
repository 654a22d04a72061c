// Scalars: integers and bytes by the converters of helpers/conversions.h.
// Stands before every function with a scalar argument.

%{
#include "helpers/fast_paths.h"
%}

%define %scalar(TYPE, READ)
%typemap(in, noblock=1) TYPE (TYPE value) {
  if (!READ($input, &value, "$symname", $argnum, "$ltype")) SWIG_fail;
  $1 = ($ltype)value;
}
%enddef

%scalar(int, read_int)
%scalar(unsigned char, read_unsigned_char)
%scalar(unsigned short, read_unsigned_short)
%scalar(unsigned int, read_unsigned_int)
%scalar(unsigned long, read_unsigned_long)
%scalar(size_t, read_unsigned_long)
%scalar(unsigned long long, read_unsigned_long_long)

%typemap(in, noblock=1) char (char value, int kind) {
  kind = char_from_object($input, &value);
  if (kind != kConverted) {
    report_argument(kind, "$symname", $argnum, "$ltype");
    SWIG_fail;
  }
  $1 = ($ltype)value;
}

// An enumeration is an int: any value within 32 signed bits passes, named or not.
%typemap(in, noblock=1) enum SWIGTYPE = int;
