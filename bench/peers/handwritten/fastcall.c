/*
 * The measured functions as an extension module written by hand for nothing but speed: vector
 * calls, texts read in place, no call trap, records inside their objects. It is memory-safe and
 * raises on wrong types and counts, and promises nothing else. No binding of these calls can do
 * much less.
 */

#define PY_SSIZE_T_CLEAN
#include <Python.h>
#include <limits.h>
#include <string.h>

#include "vswitch/configuration.h"
#include "vswitch/queries.h"

/* An object that holds a record, or leads to one that lives elsewhere. */
#define RECORD_OBJECT(Record)                                       \
  typedef struct {                                                  \
    PyObject_HEAD Record *record;                                   \
    Record own;                                                     \
  } Record##Object;                                                 \
  static PyTypeObject Record##_type = {                             \
      PyVarObject_HEAD_INIT(NULL, 0).tp_name = "fastcall." #Record, \
      .tp_basicsize = sizeof(Record##Object),                       \
      .tp_flags = Py_TPFLAGS_DEFAULT,                               \
  };

RECORD_OBJECT(VSInfo)
RECORD_OBJECT(qex_Name)

typedef struct {
  PyObject_HEAD VSUplinks *record;
} VSUplinksObject;

static PyTypeObject VSUplinks_type = {
    PyVarObject_HEAD_INIT(NULL, 0).tp_name = "fastcall.VSUplinks",
    .tp_basicsize = sizeof(VSUplinksObject),
    .tp_flags = Py_TPFLAGS_DEFAULT,
};

static PyObject *raise_wrong_type(PyTypeObject const *type) {
  return PyErr_Format(PyExc_TypeError, "%s expected", type->tp_name);
}

#define RECORD(Record, variable, object)                                              \
  do {                                                                                \
    if (!Py_IS_TYPE(object, &Record##_type)) return raise_wrong_type(&Record##_type); \
    (variable) = ((Record##Object *)(object))->record;                                \
  } while (0)

#define EXPECT(expected)                                                                       \
  do {                                                                                         \
    if (count != (expected)) {                                                                 \
      return PyErr_Format(PyExc_TypeError, "%d arguments expected, got %zd", expected, count); \
    }                                                                                          \
  } while (0)

static int unsigned_from(PyObject *object, qex_uint32 *value) {
  unsigned long const wide = PyLong_AsUnsignedLong(object);
  if (wide > UINT_MAX) {
    if (!PyErr_Occurred()) PyErr_SetString(PyExc_OverflowError, "at most 32 bits expected");
    return -1;
  }
  *value = (qex_uint32)wide;
  return 0;
}

static PyObject *new_VSInfo(PyObject *self, PyObject *unused) {
  VSInfoObject *const object = PyObject_New(VSInfoObject, &VSInfo_type);
  (void)self, (void)unused;
  if (!object) return NULL;
  object->record = memset(&object->own, 0, sizeof object->own);
  return (PyObject *)object;
}

static PyObject *new_qex_Name(PyObject *self, PyObject *unused) {
  qex_NameObject *const object = PyObject_New(qex_NameObject, &qex_Name_type);
  (void)self, (void)unused;
  if (!object) return NULL;
  object->record = memset(&object->own, 0, sizeof object->own);
  return (PyObject *)object;
}

static PyObject *VSInfo_mtu_get(PyObject *self, PyObject *object) {
  VSInfo const *info;
  (void)self;
  RECORD(VSInfo, info, object);
  return PyLong_FromUnsignedLong(info->mtu);
}

static PyObject *VSInfo_mtu_set(PyObject *self, PyObject *const *args, Py_ssize_t count) {
  VSInfo *info;
  (void)self;
  EXPECT(2);
  RECORD(VSInfo, info, args[0]);
  if (unsigned_from(args[1], &info->mtu) < 0) return NULL;
  Py_RETURN_NONE;
}

static PyObject *qex_Name_string_get(PyObject *self, PyObject *object) {
  qex_Name const *name;
  (void)self;
  RECORD(qex_Name, name, object);
  return PyUnicode_DecodeUTF8(name->string, (Py_ssize_t)strnlen(name->string, sizeof name->string),
                              NULL);
}

static PyObject *qex_Name_string_set(PyObject *self, PyObject *const *args, Py_ssize_t count) {
  qex_Name *name;
  char const *text;
  Py_ssize_t length;
  (void)self;
  EXPECT(2);
  RECORD(qex_Name, name, args[0]);
  text = PyUnicode_AsUTF8AndSize(args[1], &length);
  if (!text) return NULL;
  if ((size_t)length >= sizeof name->string) {
    return PyErr_Format(PyExc_ValueError, "at most 31 bytes expected");
  }
  memcpy(name->string, text, (size_t)length + 1);
  Py_RETURN_NONE;
}

static PyObject *wrap_VSDVS_SetMTU(PyObject *self, PyObject *const *args, Py_ssize_t count) {
  char const *alias;
  qex_uint32 mtu;
  (void)self;
  EXPECT(2);
  alias = PyUnicode_AsUTF8(args[0]);
  if (!alias || unsigned_from(args[1], &mtu) < 0) return NULL;
  return PyLong_FromLong(VSDVS_SetMTU(alias, mtu));
}

static PyObject *list_of_two(PyObject *first, PyObject *second) {
  PyObject *const list = first && second ? PyList_New(2) : NULL;
  if (!list) {
    Py_XDECREF(first);
    Py_XDECREF(second);
    return NULL;
  }
  PyList_SET_ITEM(list, 0, first);
  PyList_SET_ITEM(list, 1, second);
  return list;
}

static PyObject *wrap_VSDVS_DvPortIDToPortID(PyObject *self, PyObject *const *args,
                                             Py_ssize_t count) {
  char const *alias;
  char const *port;
  int number = 0;
  QEX_ReturnStatus status;
  (void)self;
  EXPECT(2);
  alias = PyUnicode_AsUTF8(args[0]);
  port = alias ? PyUnicode_AsUTF8(args[1]) : NULL;
  if (!port) return NULL;
  status = VSDVS_DvPortIDToPortID(alias, port, &number);
  return list_of_two(PyLong_FromLong(status), PyLong_FromLong(number));
}

static PyObject *wrap_VSQEX_GetVSInfo(PyObject *self, PyObject *const *args, Py_ssize_t count) {
  char const *alias;
  VSInfo *info;
  (void)self;
  EXPECT(2);
  alias = PyUnicode_AsUTF8(args[0]);
  if (!alias) return NULL;
  RECORD(VSInfo, info, args[1]);
  return PyLong_FromLong(VSQEX_GetVSInfo(alias, info));
}

static PyObject *wrap_VSQEX_GetUplinks(PyObject *self, PyObject *object) {
  char const *const alias = PyUnicode_AsUTF8(object);
  VSUplinksObject *uplinks;
  QEX_ReturnStatus status;
  (void)self;
  if (!alias) return NULL;
  uplinks = PyObject_New(VSUplinksObject, &VSUplinks_type);
  if (!uplinks) return NULL;
  status = VSQEX_GetUplinks(alias, &uplinks->record);
  return list_of_two(PyLong_FromLong(status), (PyObject *)uplinks);
}

static PyObject *VSUplinks_len(PyObject *self, PyObject *object) {
  VSUplinks const *uplinks;
  (void)self;
  RECORD(VSUplinks, uplinks, object);
  return PyLong_FromUnsignedLong(uplinks->numEntries);
}

static PyObject *VSUplinks_getitem(PyObject *self, PyObject *const *args, Py_ssize_t count) {
  VSUplinks const *uplinks;
  Py_ssize_t index;
  char const *name;
  (void)self;
  EXPECT(2);
  RECORD(VSUplinks, uplinks, args[0]);
  index = PyLong_AsSsize_t(args[1]);
  if (index == -1 && PyErr_Occurred()) return NULL;
  if ((size_t)index >= uplinks->numEntries) {
    return PyErr_Format(PyExc_IndexError, "no entry %zd", index);
  }
  name = uplinks->entries[index].name.string;
  return PyUnicode_DecodeUTF8(name, (Py_ssize_t)strlen(name), NULL);
}

/* The interpreter's table has one type for all conventions. */
#define VECTOR(function) ((PyCFunction)(void (*)(void))(function))

static PyMethodDef methods[] = {
    {"new_VSInfo", new_VSInfo, METH_NOARGS, NULL},
    {"VSInfo_mtu_get", VSInfo_mtu_get, METH_O, NULL},
    {"VSInfo_mtu_set", VECTOR(VSInfo_mtu_set), METH_FASTCALL, NULL},
    {"new_qex_Name", new_qex_Name, METH_NOARGS, NULL},
    {"qex_Name_string_get", qex_Name_string_get, METH_O, NULL},
    {"qex_Name_string_set", VECTOR(qex_Name_string_set), METH_FASTCALL, NULL},
    {"VSDVS_SetMTU", VECTOR(wrap_VSDVS_SetMTU), METH_FASTCALL, NULL},
    {"VSDVS_DvPortIDToPortID", VECTOR(wrap_VSDVS_DvPortIDToPortID), METH_FASTCALL, NULL},
    {"VSQEX_GetVSInfo", VECTOR(wrap_VSQEX_GetVSInfo), METH_FASTCALL, NULL},
    {"VSQEX_GetUplinks", wrap_VSQEX_GetUplinks, METH_O, NULL},
    {"VSUplinks___len__", VSUplinks_len, METH_O, NULL},
    {"VSUplinks___getitem__", VECTOR(VSUplinks_getitem), METH_FASTCALL, NULL},
    {NULL, NULL, 0, NULL},
};

static struct PyModuleDef definition = {PyModuleDef_HEAD_INIT, .m_name = "fastcall", .m_size = -1,
                                        .m_methods = methods};

PyMODINIT_FUNC PyInit_fastcall(void);
PyMODINIT_FUNC PyInit_fastcall(void) {
  if (PyType_Ready(&VSInfo_type) < 0 || PyType_Ready(&qex_Name_type) < 0 ||
      PyType_Ready(&VSUplinks_type) < 0) {
    return NULL;
  }
  return PyModule_Create(&definition);
}
