// The wrapper runtime, where the stock one is not what this module promises.
// Stands before everything that generates a wrapper.

%{
#include "helpers/fast_paths.h"
#include "helpers/failures.h"
%}

// Counting arguments is the interpreter's business: on another count than the right one its own
// parser raises its own error. On the right one the items are taken straight from the tuple.
%insert("runtime") %{
#define TAKE_0(args) (void)0
#define TAKE_1(args, a) *(a) = PyTuple_GET_ITEM(args, 0)
#define TAKE_2(args, a, b) TAKE_1(args, a), *(b) = PyTuple_GET_ITEM(args, 1)
#define TAKE_3(args, a, b, c) TAKE_2(args, a, b), *(c) = PyTuple_GET_ITEM(args, 2)
#define TAKE_4(args, a, b, c, d) TAKE_3(args, a, b, c), *(d) = PyTuple_GET_ITEM(args, 3)
#define TAKE_5(args, a, b, c, d, e) TAKE_4(args, a, b, c, d), *(e) = PyTuple_GET_ITEM(args, 4)
#define TAKE_6(args, a, b, c, d, e, f) TAKE_5(args, a, b, c, d, e), *(f) = PyTuple_GET_ITEM(args, 5)
#define TAKE_7(args, a, b, c, d, e, f, g) \
  TAKE_6(args, a, b, c, d, e, f), *(g) = PyTuple_GET_ITEM(args, 6)
#define TAKE_8(args, a, b, c, d, e, f, g, h) \
  TAKE_7(args, a, b, c, d, e, f, g), *(h) = PyTuple_GET_ITEM(args, 7)

/* A wrapper counts before it does anything else, so on another count it is done: a call in its place
   needs no frame, nor does the shortest way through it then. */
#define PyArg_UnpackTuple(args, method, least, most, ...)                                   \
  ({                                                                                        \
    if (PyTuple_GET_SIZE(args) != (most)) return report_argument_count(args, method, most); \
    TAKE_##most(args, ##__VA_ARGS__);                                                       \
    1;                                                                                      \
  })
%}

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

// Arguments that fit no form of a call are no error of type: that form of the call does not exist.
%{
#define SWIG_Python_RaiseOrModifyTypeError(text) PyErr_SetString(PyExc_NotImplementedError, text)
%}

// The runtime counts the records that Python owns on its capsule, but not where ownership changes
// hands, so the count drifts both ways and would end the runtime too early or never. One reference
// for good stands for all of them.
%init %{
  Py_XINCREF(Swig_Capsule_global);
  Swig_Capsule_global = NULL;
%}

// Failures are reported out of line: what a wrapper does not need when all is well is elsewhere. The
// macros stand in typemaps, where the method's name and the argument's position are known.
#define %bad_argument(kind, type) \
  do { report_argument(kind, "$symname", $argnum, type); SWIG_fail; } while (0)
#define %null_argument(position, type) \
  do { report_null_argument("$symname", position, type); SWIG_fail; } while (0)
#define %null_variable(name, type) \
  do { report_null_variable(name, type); SWIG_fail; } while (0)

// The same for what stock definitions report.
%insert("runtime") %{
#undef SWIG_exception_fail
#define SWIG_exception_fail(kind, text) do { report_failure(kind, text); SWIG_fail; } while (0)
%}
