// Pointers: pointer objects as arguments.
// Stands before every function with a pointer.

%wrapper %{
/* What an argument without a pointer answers, for null is one. */
static char no_pointer;
#define NO_POINTER ((void *)&no_pointer)

/* The pointer in an argument, or NO_POINTER with an error. */
static void *read_pointer(PyObject *object, swig_type_info *type, int flags, char const *method,
                          int position, char const *spelling) {
  void *pointer = NULL;
  if (SWIG_IsOK(SWIG_ConvertPtr(object, &pointer, type, flags))) return pointer;
  report_argument(kWrongType, method, position, spelling);
  return NO_POINTER;
}

/* Likewise of a method's own record, which most need. */
static void *read_record(PyObject *object, swig_type_info *type, int flags, char const *method,
                         int position, char const *spelling) {
  void *record = read_pointer(object, type, flags, method, position, spelling);
  if (record || accepts_null_record(method)) return record;
  report_null_argument(method, position, spelling);
  return NO_POINTER;
}
%}

// A pointer object of the right type, or None. A writer of a pointer takes over what the object owns.
%define %pointer_argument(PARAMETER, READ)
%typemap(in, noblock=1) PARAMETER {
  $1 = ($ltype)raw_pointer($input, $descriptor, $disown);
  if (!$1) {
    $1 = ($ltype)READ($input, $descriptor, $disown, "$symname", $argnum, "$type");
    if ((void *)$1 == NO_POINTER) SWIG_fail;
  }
}
%enddef
%pointer_argument(SWIGTYPE *, read_pointer)
%pointer_argument(SWIGTYPE *self, read_record)
%typemap(in) SWIGTYPE [] = SWIGTYPE *;
%typemap(in, noblock=1) void * {
  if (!SWIG_IsOK(SWIG_ConvertPtr($input, &$1, 0, $disown))) %bad_argument(kWrongType, "$type");
}
