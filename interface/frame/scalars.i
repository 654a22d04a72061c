// Scalars: integers by the converters of helpers/conversions.h, which the file pyfragments.swg beside
// this one puts in place. Stands before every function with a scalar argument.

// An enumeration is an int: any value within 32 signed bits passes, named or not. Stock output would
// store through the enumeration's own type, whose signedness the compiler chooses.
%typemap(in, noblock=1, fragment=SWIG_AsVal_frag(int)) enum SWIGTYPE (int value, int ecode = 0) {
  ecode = SWIG_AsVal(int)($input, &value);
  if (!SWIG_IsOK(ecode)) {
    %argument_fail(ecode, "$type", $symname, $argnum);
  }
  $1 = %static_cast(value, $1_ltype);
}
