// Pointer objects and result lists, made and read the short way where the long one would do the same.
// Stands before everything that generates a wrapper. The runtime's own functions stay behind each of
// these: for classes, for casts between modules, and for interpreters without the fast paths.

// Pointer objects come and go with every record that a call answers, so a few are kept.
%begin %{
#define PY_SSIZE_T_CLEAN
#include <Python.h>
#include "helpers/fast_paths.h"

#if FAST_PATHS
#define KEPT_OBJECTS 32
static struct {
  PyTypeObject *type; /* of the kept objects: the raw pointer objects of this module */
  PyObject **end;
  PyObject *objects[KEPT_OBJECTS];
} kept = {NULL, kept.objects, {NULL}};

/* A kept object still has its type; what it lost is its only reference. */
static inline PyObject *revived(PyObject *object) {
#if defined(Py_REF_DEBUG) || defined(Py_TRACE_REFS) || PY_VERSION_HEX < 0x03090000
  return PyObject_Init(object, Py_TYPE(object));
#else
  Py_SET_REFCNT(object, 1);
  return object;
#endif
}

static inline bool is_any_kept(void) { return kept.end != kept.objects; }

static inline PyObject *kept_or_new(PyTypeObject *type) {
  return type == kept.type && is_any_kept() ? revived(*--kept.end) : _PyObject_New(type);
}

static inline void keep_or_free_pointer(PyObject *pointer) {
  if (kept.end != kept.objects + KEPT_OBJECTS) {
    *kept.end++ = pointer;
  } else {
    PyObject_Free(pointer);
  }
}

static inline void keep_or_free(PyObject *object) {
  if (Py_TYPE(object) == kept.type) {
    keep_or_free_pointer(object);
  } else {
    PyObject_Free(object);
  }
}

#undef PyObject_NEW
#define PyObject_NEW(record, type) ((record *)kept_or_new(type))
#undef PyObject_DEL
#define PyObject_DEL(object) keep_or_free((PyObject *)(object))
#else
#define keep_or_free_pointer PyObject_Free
#endif
%}

%wrapper %{
/* The pointer in a raw pointer object of exactly the type that is wanted; null for all else. */
static inline void *raw_pointer(PyObject *object, swig_type_info *type, int flags) {
#if FAST_PATHS
  SwigPyObject *raw = (SwigPyObject *)object;
  if (Py_TYPE(object) == kept.type && raw->ty == type) {
    if (flags & SWIG_POINTER_DISOWN) raw->own = 0;
    return raw->ptr;
  }
#endif
  (void)object, (void)type, (void)flags;
  return NULL;
}

/* What an argument without a pointer answers, for null is one. */
static char no_pointer;
#define NO_POINTER ((void *)&no_pointer)

/* The pointer in an argument, or NO_POINTER with an error. */
static void *read_pointer(PyObject *object, swig_type_info *type, int flags, char const *method,
                          int position, char const *spelling) {
  void *pointer = NULL;
  if (SWIG_IsOK(SWIG_ConvertPtr(object, &pointer, type, flags))) return pointer;
  report_argument(kWrongType, method, position, spelling);
  return NO_POINTER;
}

/* Likewise of a method's own record, which most need. */
static void *read_record(PyObject *object, swig_type_info *type, int flags, char const *method,
                         int position, char const *spelling) {
  void *record = read_pointer(object, type, flags, method, position, spelling);
  if (record || accepts_null_record(method)) return record;
  report_null_argument(method, position, spelling);
  return NO_POINTER;
}

#if FAST_PATHS
static inline PyObject *kept_pointer(void *pointer, swig_type_info *type, int own) {
  SwigPyObject *raw = (SwigPyObject *)revived(*--kept.end);
  raw->ptr = pointer;
  raw->ty = type;
  raw->own = own;
  raw->next = NULL;
  return (PyObject *)raw;
}

/* A pointer object; the short way is that of types without a class. */
static PyObject *new_pointer(void *pointer, swig_type_info *type, int flags) {
  if (pointer && is_any_kept() && (!type->clientdata || (flags & SWIG_POINTER_NOSHADOW))) {
    return kept_pointer(pointer, type, flags & SWIG_POINTER_OWN);
  }
  return SWIG_Python_NewPointerObj(NULL, pointer, type, flags);
}
#undef SWIG_NewPointerObj
#define SWIG_NewPointerObj(pointer, type, flags) new_pointer(pointer, type, flags)
#endif

/* The raw pointer object of a constructor; it owns the record. */
static inline PyObject *new_record(void *record, swig_type_info *type) {
#if FAST_PATHS
  if (record && is_any_kept()) return kept_pointer(record, type, SWIG_POINTER_OWN);
#endif
  return SWIG_NewPointerObj(record, type, SWIG_POINTER_NEW);
}

/* Zero-filled memory for a record. The allocator keeps small blocks at hand, but not for calloc; the
 * compiler, which would make the two calls that one again, is kept from seeing that they belong
 * together. */
static inline void *allocate_zeroed(size_t size) {
  void *memory = malloc(size);
  __asm__("" : "+r"(memory), "+r"(size));
  return memory ? memset(memory, 0, size) : NULL;
}
#undef calloc
#define calloc(one, size) allocate_zeroed((one) * (size))

/* A status and its first output are a list from the start. */
static PyObject *append_output(PyObject *result, PyObject *output) {
  PyObject *list = NULL;
  if (!output) {
    Py_XDECREF(result);
    return NULL;
  }
  if (result == Py_None || PyList_Check(result)) return SWIG_Python_AppendOutput(result, output);
  list = PyList_New(2);
  if (!list) {
    Py_DECREF(result);
    Py_DECREF(output);
    return NULL;
  }
  PyList_SET_ITEM(list, 0, result);
  PyList_SET_ITEM(list, 1, output);
  return list;
}
#undef SWIG_AppendOutput
#define SWIG_Python_AppendOutput append_output
%}

%init %{
#if FAST_PATHS
  kept.type = SwigPyObject_type();
#endif
%}
