// How the module starts, and for how long its runtime lives.
// Stands before everything that generates a wrapper.

// A module that cannot be created must leave the interpreter's error standing; the stock start-up
// goes on with the null pointer.
%{
#undef PyModule_Create
#define PyModule_Create(definition) \
  PyModule_Create2(definition, PYTHON_API_VERSION); if (!m) return NULL
%}

// A second initialisation finds the object with the variables in place; it must not add them again.
%{
static void add_variable_once(PyObject *variables, char const *name, PyObject *(*get)(void),
                              int (*set)(PyObject *)) {
  swig_globalvar const *variable = ((swig_varlinkobject *)variables)->vars;
  while (variable && strcmp(variable->name, name) != 0) variable = variable->next;
  if (!variable) SWIG_Python_addvarlink(variables, name, get, set);
}
#undef SWIG_addvarlink
#define SWIG_addvarlink add_variable_once
%}

// The helper with which shadow classes turn flat functions into methods. It takes one object and no
// argument tuple, which no directive can express, so it joins the module here.
%{
SWIGINTERN PyObject *instance_method_new(PyObject *SWIGUNUSEDPARM(self), PyObject *function) {
  return PyInstanceMethod_New(function);
}

static PyMethodDef runtime_methods[] = {
  {"SWIG_PyInstanceMethod_New", instance_method_new, METH_O, NULL},
  {NULL, NULL, 0, NULL}
};
%}
%init %{
  if (PyModule_AddFunctions(m, runtime_methods) < 0) return NULL;
%}

// The runtime counts the records that Python owns on its capsule, but not where ownership changes
// hands, so the count drifts both ways and would end the runtime too early or never. One reference
// for good stands for all of them.
%init %{
  Py_XINCREF(Swig_Capsule_global);
  Swig_Capsule_global = NULL;
%}
