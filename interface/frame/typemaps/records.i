// Records: one line each, then the header that declares them.
//
//   %record(VSInfo)             constructor, destructor, accessors, class registration
//   %union_record(NAME)         likewise for a record that is declared as a union
//   %sized_record(NAME, make)   likewise, the constructor takes the size that `make` takes
//   %inner_record(NAME)         a record that only shows as a view into its parent
//   %view_only(RECORD, field)   a field that has a reader and no writer
//   %required(PARAMETER)        a method's record or text argument that must not be null; const or
//                               not, so its name must be one that no call uses
//
// Stands before the headers; each line before the header of its record.

// Constructors return the raw pointer object, whatever class is registered: the class wraps it.
%define %raw_result_of_constructor(NAME, TYPE)
%typemap(out, noblock=1) TYPE *NAME {
  %set_output(new_record($1, $descriptor));
}
%enddef

// Writers of a nested record copy the whole value, which therefore must be there.
%define %nested_record(NAME)
%typemap(memberin, noblock=1) NAME {
  if (arg1) {
    if (!$input) {
      report_null_argument("$symname", 2, "$type *");
      SWIG_fail;
    }
    $1 = *$input;
  }
}
%enddef

// The class that shadows a record: pointers that calls and readers return become its instances.
%define %class_registration(NAME)
%wrapper %{
SWIGINTERN PyObject *_wrap_##NAME##_swigregister(PyObject *self, PyObject *args) {
  PyObject *cls = NULL;
  if (!PyArg_UnpackTuple(args, "swigregister", 1, 1, &cls)) return NULL;
  return register_class(SWIGTYPE_p_##NAME, cls);
}
%}
%native(NAME##_swigregister) PyObject *_wrap_##NAME##_swigregister(PyObject *, PyObject *);
%enddef

%define %record(NAME)
%raw_result_of_constructor(NAME, NAME)
%raw_result_of_constructor(NAME, struct NAME)
%nested_record(NAME)
%class_registration(NAME)
%enddef

%define %union_record(NAME)
%raw_result_of_constructor(NAME, NAME)
%raw_result_of_constructor(NAME, union NAME)
%nested_record(NAME)
%class_registration(NAME)
%enddef

%define %sized_record(NAME, MAKE)
%record(NAME)
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

// Other arguments that a method needs.
%typemap(check, noblock=1, required="1") SWIGTYPE *REQUIRED, char *REQUIRED {
  if (!$1) {
    report_null_argument("$symname", $argnum, "$type");
    SWIG_fail;
  }
}
%define %required(PARAMETER...)
%typemap(check) PARAMETER = SWIGTYPE *REQUIRED;
%enddef

// Writers of arrays: the declared number of elements is copied, none for an array of size 0. Writers
// of any kind store nothing into a null record.
%typemap(memberin, noblock=1) SWIGTYPE [ANY], SWIGTYPE [ANY][ANY] {
  if (arg1) {
    if (!$input) {
      report_null_variable("$name", "$type");
      SWIG_fail;
    }
    memcpy($1, $input, sizeof($1));
  }
}
