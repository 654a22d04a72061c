// A second module of the wrapper runtime, for tests: records that it shares with _libvswitch, pointer
// objects of any type that the runtime knows, and functions that C may be given.

%module peer

%{
#include "vswitch/switch_info.h"
%}

%include "qexapi/types.h"
%include "vswitch/switch_info.h"

// A function that the generator itself marks as one that C may be given.
%callback("%s_address");
%inline %{
char visit(void *item, void *context) { return item != context; }
%}
%nocallback;

%{
static PyObject *answer_none(PyObject *self, PyObject *arguments) {
  (void)self, (void)arguments;
  Py_RETURN_NONE;
}

static void free_definition(PyObject *capsule) {
  PyMethodDef *definition = PyCapsule_GetPointer(capsule, NULL);
  free((char *)definition->ml_doc);
  free(definition);
}

/* Fills the stack below the caller's frame. */
__attribute__((noinline, no_sanitize("address"))) static void use_stack(char filling) {
  char used[1 << 16];
  memset(used, filling, sizeof used);
  __asm__ volatile("" : : "r"(used) : "memory");
}

static void *no_malloc(void *context, size_t size) {
  (void)context, (void)size;
  return NULL;
}

static void *no_calloc(void *context, size_t count, size_t size) {
  (void)context, (void)count, (void)size;
  return NULL;
}
%}

%inline %{
/* The MTU as this module reads it from a record, whichever module made that. */
unsigned int mtu_of(VSInfo *info) { return info->mtu; }

/* Whether this module takes what _libvswitch calls an address. */
unsigned int address_at(qex_IPv4Address *address) { return *address; }

/* A pointer object of the runtime type that is spelled so, without ownership; an error if none is. */
PyObject *pointer_object(unsigned long address, char const *spelling) {
  swig_type_info *type = SWIG_TypeQuery(spelling);
  if (!type) return PyErr_Format(PyExc_LookupError, "no type is spelled '%s'", spelling);
  return SWIG_NewPointerObj((void *)address, type, 0);
}

/* A built-in function with any documentation, which is where the runtime looks for marks. */
PyObject *documented_function(char const *documentation) {
  PyMethodDef *definition = calloc(1, sizeof *definition);
  PyObject *owner = definition ? PyCapsule_New(definition, NULL, free_definition) : PyErr_NoMemory();
  PyObject *function;
  if (!owner) return NULL;
  definition->ml_name = "documented";
  definition->ml_meth = answer_none;
  definition->ml_flags = METH_VARARGS;
  definition->ml_doc = documentation ? strdup(documentation) : NULL;
  function = PyCFunction_New(definition, owner);
  Py_DECREF(owner);
  return function;
}

/* What the function returns on a stack where whatever it does not initialise is the filling. */
PyObject *call_on_used_stack(char filling, PyObject *function, PyObject *arguments) {
  use_stack(filling);
  return PyObject_CallObject(function, arguments);
}

/* What an initialisation function returns while the interpreter gets no memory for objects. */
PyObject *initialise_without_memory(unsigned long function) {
  PyMemAllocatorEx plenty, none;
  PyObject *module;
  PyMem_GetAllocator(PYMEM_DOMAIN_OBJ, &plenty);
  none = plenty;
  none.malloc = no_malloc;
  none.calloc = no_calloc;
  PyMem_SetAllocator(PYMEM_DOMAIN_OBJ, &none);
  module = ((PyObject * (*)(void)) function)();
  PyMem_SetAllocator(PYMEM_DOMAIN_OBJ, &plenty);
  return module;
}
%}
