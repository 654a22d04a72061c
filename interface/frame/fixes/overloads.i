// What a call raises whose arguments fit none of its forms.
// Stands before everything that generates a wrapper.

// Arguments that fit no form of a call are no error of type: that form of the call does not exist.
%{
#define SWIG_Python_RaiseOrModifyTypeError(text) PyErr_SetString(PyExc_NotImplementedError, text)
%}
