// Constants: each is a call of its own, because the module's entry has nine hundred of them and the
// compiler would weave the making of every object into that one function.
// Stands before every constant.

%{
OUT_OF_LINE void add_number(PyObject *module, char const *name, long long value) {
  SWIG_Python_SetConstant(module, name, PyLong_FromLongLong(value));
}

OUT_OF_LINE void add_text(PyObject *module, char const *name, char const *text) {
  SWIG_Python_SetConstant(module, name, PyUnicode_FromString(text));
}
%}

%typemap(constcode, noblock=1) int, enum SWIGTYPE { add_number(d, "$symname", (int)$value); }
%typemap(constcode, noblock=1) long long { add_number(d, "$symname", $value); }
%typemap(constcode, noblock=1) char const * { add_text(d, "$symname", $value); }
