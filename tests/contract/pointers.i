// pointer(type, address): a pointer object of any type that the modules of this runtime know, such as
// "unsigned int *", for the arguments that the module under test offers no constructor for.
%module _pointers

%inline %{
PyObject *pointer(char const *type, unsigned long long address) {
  swig_type_info *known = SWIG_TypeQuery(type);
  if (!known) {
    PyErr_Format(PyExc_LookupError, "no module of this runtime knows the type '%s'", type);
    return NULL;
  }
  return SWIG_NewPointerObj((void *)(size_t)address, known, 0);
}
%}
