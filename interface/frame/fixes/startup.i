// How the module starts, and for how long its runtime lives.
// Stands before everything that generates a wrapper.

// The generated start-up goes on with the null pointer of a module that cannot be created. So it does
// not create it: the module's entry does, and leaves it with the interpreter's error if it cannot. The
// entry also looks whether the fixes of this folder took hold.
%wrapper %{
static PyMethodDef SwigMethods[];
static PyObject *created_module = NULL;
static PyObject *set_up = NULL;
PyObject *set_up_module(void);
static bool fixes_hold(PyObject *module);

SWIGEXPORT PyObject *SWIG_init(void) {
  static struct PyModuleDef definition = {
    PyModuleDef_HEAD_INIT, .m_name = SWIG_name, .m_size = -1, .m_methods = SwigMethods};
  PyObject *module = PyModule_Create(&definition);
  if (!module) return NULL;
  created_module = module;
  set_up = set_up_module();
  if (!set_up || !fixes_hold(module)) {
    Py_DECREF(module);
    return NULL;
  }
  return module;
}

#undef SWIG_init
#define SWIG_init set_up_module
#undef PyModule_Create
#define PyModule_Create(definition) ((void)(definition), created_module)

/* What the generated start-up sets up is the module that the entry created. */
static bool sets_up_created_module(PyObject *module) { return module == set_up; }
%}

// A second initialisation finds the object with the variables in place; it must not add them again.
%{
static bool is_variable_added = false;

static void add_variable_once(PyObject *variables, char const *name, PyObject *(*get)(void),
                              int (*set)(PyObject *)) {
  swig_globalvar const *variable = ((swig_varlinkobject *)variables)->vars;
  while (variable && strcmp(variable->name, name) != 0) variable = variable->next;
  if (!variable) SWIG_Python_addvarlink(variables, name, get, set);
  is_variable_added = true;
}
#undef SWIG_addvarlink
#define SWIG_addvarlink add_variable_once

static bool adds_variables_once(PyObject *SWIGUNUSEDPARM(module)) { return is_variable_added; }
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
%{
static bool keeps_runtime(PyObject *SWIGUNUSEDPARM(module)) { return !Swig_Capsule_global; }
%}
%init %{
  Py_XINCREF(Swig_Capsule_global);
  Swig_Capsule_global = NULL;
%}
