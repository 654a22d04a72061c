/* The measured functions as an extension module written by hand, under the same contract. */

#include "contract.h"

#include "vswitch/configuration.h"
#include "vswitch/queries.h"

#define EXPORTED __attribute__((visibility("default")))
EXPORTED jmp_buf exception_buffer;
EXPORTED int exception_status;
EXPORTED struct _object *exceptionType;
EXPORTED char *exceptionMsg;

static RecordType const vs_info = {"VSInfo"};
static RecordType const vs_uplinks = {"VSUplinks"};
static RecordType const name_record = {"qex_Name"};

static PyObject *new_VSInfo(PyObject *self, PyObject *args) {
  VSInfo *info;
  (void)self;
  EXPECT_ARGUMENTS(0, ":new_VSInfo");
  ARM_TRAP();
  info = calloc(1, sizeof *info);
  return pointer_object(info, &vs_info, true);
}

static PyObject *delete_VSInfo(PyObject *self, PyObject *args) {
  void *info;
  (void)self;
  EXPECT_ARGUMENTS(1, "O:delete_VSInfo");
  if (!pointer_disowned(PyTuple_GET_ITEM(args, 0), &vs_info, &info,
                        (Place){"delete_VSInfo", 1, "struct VSInfo *"})) {
    return NULL;
  }
  ARM_TRAP();
  free(info);
  Py_RETURN_NONE;
}

static PyObject *VSInfo_mtu_get(PyObject *self, PyObject *args) {
  void *info;
  (void)self;
  EXPECT_ARGUMENTS(1, "O:VSInfo_mtu_get");
  if (!record_from(PyTuple_GET_ITEM(args, 0), &vs_info, &info,
                   (Place){"VSInfo_mtu_get", 1, "struct VSInfo *"})) {
    return NULL;
  }
  return PyLong_FromUnsignedLong(((VSInfo *)info)->mtu);
}

static PyObject *VSInfo_mtu_set(PyObject *self, PyObject *args) {
  void *info;
  unsigned long mtu;
  (void)self;
  EXPECT_ARGUMENTS(2, "OO:VSInfo_mtu_set");
  if (!pointer_from(PyTuple_GET_ITEM(args, 0), &vs_info, &info,
                    (Place){"VSInfo_mtu_set", 1, "struct VSInfo *"}) ||
      !unsigned_from(PyTuple_GET_ITEM(args, 1), UINT_MAX, &mtu,
                     (Place){"VSInfo_mtu_set", 2, "qex_uint32"})) {
    return NULL;
  }
  if (info) ((VSInfo *)info)->mtu = (qex_uint32)mtu;
  Py_RETURN_NONE;
}

static PyObject *new_qex_Name(PyObject *self, PyObject *args) {
  qex_Name *name;
  (void)self;
  EXPECT_ARGUMENTS(0, ":new_qex_Name");
  ARM_TRAP();
  name = calloc(1, sizeof *name);
  return pointer_object(name, &name_record, true);
}

static PyObject *qex_Name_string_get(PyObject *self, PyObject *args) {
  void *name;
  char const *string;
  (void)self;
  EXPECT_ARGUMENTS(1, "O:qex_Name_string_get");
  if (!record_from(PyTuple_GET_ITEM(args, 0), &name_record, &name,
                   (Place){"qex_Name_string_get", 1, "struct qex_Name *"})) {
    return NULL;
  }
  string = ((qex_Name *)name)->string;
  return text_object(string, strnlen(string, sizeof(qex_Name)));
}

static PyObject *qex_Name_string_set(PyObject *self, PyObject *args) {
  void *name;
  char string[32];
  (void)self;
  EXPECT_ARGUMENTS(2, "OO:qex_Name_string_set");
  if (!pointer_from(PyTuple_GET_ITEM(args, 0), &name_record, &name,
                    (Place){"qex_Name_string_set", 1, "struct qex_Name *"}) ||
      !char_array_from(PyTuple_GET_ITEM(args, 1), string, sizeof string,
                       (Place){"qex_Name_string_set", 2, "char [32]"})) {
    return NULL;
  }
  if (name) memcpy(((qex_Name *)name)->string, string, sizeof string);
  Py_RETURN_NONE;
}

static PyObject *wrap_VSDVS_SetMTU(PyObject *self, PyObject *args) {
  Text alias = {NULL, NULL};
  unsigned long mtu;
  QEX_ReturnStatus status;
  (void)self;
  EXPECT_ARGUMENTS(2, "OO:VSDVS_SetMTU");
  if (!text_from(PyTuple_GET_ITEM(args, 0), &alias, (Place){"VSDVS_SetMTU", 1, "char const *"}) ||
      !unsigned_from(PyTuple_GET_ITEM(args, 1), UINT_MAX, &mtu,
                     (Place){"VSDVS_SetMTU", 2, "qex_uint32"})) {
    free(alias.copy);
    return NULL;
  }
  ARM_TRAP();
  status = VSDVS_SetMTU(alias.text, (qex_uint32)mtu);
  free(alias.copy);
  return PyLong_FromLong(status);
}

static PyObject *wrap_VSDVS_DvPortIDToPortID(PyObject *self, PyObject *args) {
  Text alias = {NULL, NULL};
  Text port = {NULL, NULL};
  int number = 0;
  QEX_ReturnStatus status;
  (void)self;
  EXPECT_ARGUMENTS(2, "OO:VSDVS_DvPortIDToPortID");
  if (!text_from(PyTuple_GET_ITEM(args, 0), &alias,
                 (Place){"VSDVS_DvPortIDToPortID", 1, "char const *"}) ||
      !text_from(PyTuple_GET_ITEM(args, 1), &port,
                 (Place){"VSDVS_DvPortIDToPortID", 2, "char const *"})) {
    free(alias.copy);
    free(port.copy);
    return NULL;
  }
  ARM_TRAP();
  status = VSDVS_DvPortIDToPortID(alias.text, port.text, &number);
  free(alias.copy);
  free(port.copy);
  return list_of_two(PyLong_FromLong(status), PyLong_FromLong(number));
}

static PyObject *wrap_VSQEX_GetVSInfo(PyObject *self, PyObject *args) {
  Text alias = {NULL, NULL};
  void *info;
  QEX_ReturnStatus status;
  (void)self;
  EXPECT_ARGUMENTS(2, "OO:VSQEX_GetVSInfo");
  if (!text_from(PyTuple_GET_ITEM(args, 0), &alias,
                 (Place){"VSQEX_GetVSInfo", 1, "char const *"}) ||
      !pointer_from(PyTuple_GET_ITEM(args, 1), &vs_info, &info,
                    (Place){"VSQEX_GetVSInfo", 2, "VSInfo *"})) {
    free(alias.copy);
    return NULL;
  }
  ARM_TRAP();
  status = VSQEX_GetVSInfo(alias.text, info);
  free(alias.copy);
  return PyLong_FromLong(status);
}

static PyObject *wrap_VSQEX_GetUplinks(PyObject *self, PyObject *args) {
  Text alias = {NULL, NULL};
  VSUplinks *uplinks = NULL;
  QEX_ReturnStatus status;
  (void)self;
  EXPECT_ARGUMENTS(1, "O:VSQEX_GetUplinks");
  if (!text_from(PyTuple_GET_ITEM(args, 0), &alias,
                 (Place){"VSQEX_GetUplinks", 1, "char const *"})) {
    return NULL;
  }
  ARM_TRAP();
  status = VSQEX_GetUplinks(alias.text, &uplinks);
  free(alias.copy);
  return list_of_two(PyLong_FromLong(status), pointer_object(uplinks, &vs_uplinks, false));
}

static PyObject *VSUplinks_len(PyObject *self, PyObject *args) {
  void *uplinks;
  (void)self;
  EXPECT_ARGUMENTS(1, "O:VSUplinks___len__");
  if (!record_from(PyTuple_GET_ITEM(args, 0), &vs_uplinks, &uplinks,
                   (Place){"VSUplinks___len__", 1, "struct VSUplinks *"})) {
    return NULL;
  }
  ARM_TRAP();
  return PyLong_FromUnsignedLong(((VSUplinks *)uplinks)->numEntries);
}

static PyObject *uplink_name(VSUplinks const *uplinks, int index) {
  if ((qex_uint32)index >= uplinks->numEntries) {
    fputs("Invalid array index.", stdout);
    Py_RETURN_NONE;
  }
  return text_or_none(uplinks->entries[index].name.string);
}

static PyObject *VSUplinks_getitem(PyObject *self, PyObject *args) {
  void *uplinks;
  int index;
  (void)self;
  EXPECT_ARGUMENTS(2, "OO:VSUplinks___getitem__");
  if (!record_from(PyTuple_GET_ITEM(args, 0), &vs_uplinks, &uplinks,
                   (Place){"VSUplinks___getitem__", 1, "struct VSUplinks *"}) ||
      !int_from(PyTuple_GET_ITEM(args, 1), &index, (Place){"VSUplinks___getitem__", 2, "int"})) {
    return NULL;
  }
  ARM_TRAP();
  return uplink_name(uplinks, index);
}

static PyMethodDef methods[] = {
    {"new_VSInfo", new_VSInfo, METH_VARARGS, NULL},
    {"delete_VSInfo", delete_VSInfo, METH_VARARGS, NULL},
    {"VSInfo_mtu_get", VSInfo_mtu_get, METH_VARARGS, NULL},
    {"VSInfo_mtu_set", VSInfo_mtu_set, METH_VARARGS, NULL},
    {"new_qex_Name", new_qex_Name, METH_VARARGS, NULL},
    {"qex_Name_string_get", qex_Name_string_get, METH_VARARGS, NULL},
    {"qex_Name_string_set", qex_Name_string_set, METH_VARARGS, NULL},
    {"VSDVS_SetMTU", wrap_VSDVS_SetMTU, METH_VARARGS, NULL},
    {"VSDVS_DvPortIDToPortID", wrap_VSDVS_DvPortIDToPortID, METH_VARARGS, NULL},
    {"VSQEX_GetVSInfo", wrap_VSQEX_GetVSInfo, METH_VARARGS, NULL},
    {"VSQEX_GetUplinks", wrap_VSQEX_GetUplinks, METH_VARARGS, NULL},
    {"VSUplinks___len__", VSUplinks_len, METH_VARARGS, NULL},
    {"VSUplinks___getitem__", VSUplinks_getitem, METH_VARARGS, NULL},
    {NULL, NULL, 0, NULL},
};

static struct PyModuleDef definition = {PyModuleDef_HEAD_INIT, .m_name = "handwritten",
                                        .m_size = -1, .m_methods = methods};

PyMODINIT_FUNC PyInit_handwritten(void);
PyMODINIT_FUNC PyInit_handwritten(void) {
  if (PyType_Ready(&pointer_type) < 0) return NULL;
  return PyModule_Create(&definition);
}
