// A second module of the wrapper runtime, for tests: records that it shares with _libvswitch, and
// pointer objects of any type that the runtime knows.

%module peer

%{
#include "vswitch/switch_info.h"
%}

%include "qexapi/types.h"
%include "vswitch/switch_info.h"

%{
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

/* What an initialisation function answers while the interpreter gets no memory for objects. */
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
