// Pointers: pointer objects as arguments.
// Stands before every function with a pointer.

%wrapper %{
/* What is read of an argument without a pointer, for null is one. */
static char no_pointer;
#define NO_POINTER ((void *)&no_pointer)

/* The pointer in an argument, or NO_POINTER with an error. */
static void *read_pointer(PyObject *object, swig_type_info *type, int flags, char const *method,
                          int position, char const *spelling) {
  void *pointer = NULL;
  if (SWIG_IsOK(convert_pointer(object, &pointer, type, flags))) return pointer;
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
%typemap(in, noblock=1) SWIGTYPE *DISOWN {
  $1 = ($ltype)read_pointer($input, $descriptor, SWIG_POINTER_DISOWN, "$symname", $argnum, "$type");
  if ((void *)$1 == NO_POINTER) SWIG_fail;
}
%typemap(in, noblock=1) void * {
  $1 = read_pointer($input, NULL, $disown, "$symname", $argnum, "$type");
  if ($1 == NO_POINTER) SWIG_fail;
}

// A record by value is a pointer object that leads to one.
%typemap(in, noblock=1) SWIGTYPE (void *record) {
  record = read_pointer($input, $&descriptor, 0, "$symname", $argnum, "$type");
  if (record == NO_POINTER) SWIG_fail;
  if (!record) {
    report_null_argument("$symname", $argnum, "$type");
    SWIG_fail;
  }
  $1 = *($&ltype)record;
}

// A function of C, as an object that the generator made of one or as a pointer to one.
%typemap(in, noblock=1) SWIGTYPE ((*)(ANY)) {
  if (!SWIG_IsOK(convert_function($input, (void **)&$1, $descriptor))) {
    report_argument(kWrongType, "$symname", $argnum, "$type");
    SWIG_fail;
  }
}
