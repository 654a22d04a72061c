// Results that a call leaves behind pointers: the wrapper owns the variable, passes its address and
// appends its value to the result, whatever the status says. Each line names the parameter as the
// header does.
//
//   %record_out(VSUplinks **uplinks)         a record of the library, not owned by Python
//   %record_out_as(X **entries, Y)           likewise, under the type of another record
//   %integer_out(int *portID)                a signed integer
//   %boolean_out(qex_Bool *enabled)          one byte, as a signed integer
//   %text_out(char *aliasBuffer, 128)        at most so many bytes of text
//   %raw_bytes(void const *group)            an argument: the inside of a bytes object
//
// A line also matches parameters of that name that are const, so the buffers of texts have names that
// no input has. Stands before the calls; each line before the header of its calls.
//
// `python` says beside a typemap what stands for the parameter in Python, for whatever is made of the
// definitions beside the module; so do `record`, the record that a pointer is one of, and `room`, the
// bytes of text at most.

%define %record_out(PARAMETER...)
%typemap(in, numinputs=0, noblock=1, python="record") PARAMETER ($*1_ltype record = NULL) {
  $1 = &record;
}
%typemap(argout, noblock=1) PARAMETER {
  %append_output(SWIG_NewPointerObj(%as_voidptr(*$1), $*descriptor, 0));
}
%enddef

%define %record_out_as(PARAMETER, RECORD)
%record_out(PARAMETER)
%typemap(argout, noblock=1, record="RECORD") PARAMETER {
  %append_output(SWIG_NewPointerObj(%as_voidptr(*$1), $descriptor(RECORD *), 0));
}
%enddef

%define %integer_out(PARAMETER...)
%typemap(in, numinputs=0, noblock=1, python="number") PARAMETER ($*1_ltype value = 0) {
  $1 = &value;
}
%typemap(argout, noblock=1, fragment=SWIG_From_frag(int)) PARAMETER {
  %append_output(SWIG_From(int)(*$1));
}
%enddef

%define %boolean_out(PARAMETER...)
%integer_out(PARAMETER)
%enddef

// A library that writes nothing leaves an empty text, so nothing of the stack shows; more of the buffer
// is not cleared. What comes back is cut whatever the library wrote: after the bytes that it is
// promised there is room for as many again, for a text that is too long.
%define %text_out(PARAMETER, LENGTH)
%typemap(in, numinputs=0, noblock=1, python="text", room="LENGTH") PARAMETER (char text[2 * (LENGTH + 1)]) {
  text[0] = '\0';
  $1 = text;
}
%typemap(argout, noblock=1, fragment="SWIG_FromCharPtr") PARAMETER {
  $1[LENGTH] = '\0';
  %append_output(SWIG_FromCharPtr($1));
}
%enddef

// Anything but bytes makes the call with a null pointer, and its TypeError surfaces afterwards.
%define %raw_bytes(PARAMETER...)
%typemap(in, noblock=1, python="bytes") PARAMETER {
  $1 = ($1_ltype)PyBytes_AsString($input);
}
%typemap(argout, noblock=1) PARAMETER {
  if (!$1) {
    Py_XDECREF($result);
    SWIG_fail;
  }
}
%enddef
