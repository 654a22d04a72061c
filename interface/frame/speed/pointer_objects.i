// Pointer objects, made and read the short way where the long one would do the same. The runtime's own
// functions do the rest: classes, casts between modules, interpreters without the fast paths.
// Stands before everything that generates a wrapper.

// Pointer objects come and go with every record that a call returns, so a few are kept.
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
%}

%init %{
#if FAST_PATHS
  kept.type = SwigPyObject_type();
#endif
%}
