// What a call raises whose arguments fit none of its forms.
//
//   %overloaded(NAME)     a function of several forms; after its declarations
//
// Stands before everything that generates a wrapper.

// Arguments that fit no form of a call are no error of type: that form of the call does not exist.
%{
#define SWIG_Python_RaiseOrModifyTypeError(text) PyErr_SetString(PyExc_NotImplementedError, text)

static char const *overloaded_name = NULL;

/* Nothing fits the arguments of a call without any. */
static bool forms_are_told(PyObject *module) {
  PyObject *result = overloaded_name ? PyObject_CallMethod(module, overloaded_name, NULL) : NULL;
  bool const is_told = !result && PyErr_ExceptionMatches(PyExc_NotImplementedError);
  PyErr_Clear();
  Py_XDECREF(result);
  return is_told;
}
%}

%define %overloaded(NAME)
%called_by_tuple(NAME)
%init %{
  overloaded_name = #NAME;
%}
%enddef
