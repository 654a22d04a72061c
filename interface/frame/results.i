// Results that a call leaves behind pointers: the wrapper owns the variable, passes its address and
// appends its value to the result, whatever the status says.
//
//   %apply RECORD **OUT { VSUplinks **uplinks };    a record of the library, not owned by Python

%typemap(in, numinputs=0, noblock=1) SWIGTYPE **OUT ($*1_ltype record = NULL) {
  $1 = &record;
}
%typemap(argout, noblock=1) SWIGTYPE **OUT {
  %append_output(SWIG_NewPointerObj(%as_voidptr(*$1), $*descriptor, 0));
}
