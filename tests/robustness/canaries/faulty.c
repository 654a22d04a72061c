/* Functions with every fault that the robustness tests look for, to see that they find it. */

#define PY_SSIZE_T_CLEAN
#include <Python.h>
#include <stdlib.h>

static PyObject *nothing(PyObject *self, PyObject *none) {
  (void)self, (void)none;
  Py_RETURN_NONE;
}

static PyObject *fail(PyObject *self, PyObject *none) {
  (void)self, (void)none;
  return PyErr_Format(PyExc_ValueError, "an error as it should be");
}

static PyObject *leave_an_error(PyObject *self, PyObject *none) {
  (void)self, (void)none;
  PyErr_SetString(PyExc_ValueError, "left behind");
  Py_RETURN_NONE;
}

static PyObject *crash(PyObject *self, PyObject *none) {
  int *volatile nowhere = NULL;
  (void)self, (void)none;
  // NOLINTNEXTLINE(clang-analyzer-core.NullDereference): planted
  return PyLong_FromLong(*nowhere);
}

static PyObject *end_by_abort(PyObject *self, PyObject *none) {
  (void)self, (void)none;
  abort();
}

static PyObject *hang(PyObject *self, PyObject *none) {
  int volatile forever = 1;
  (void)self, (void)none;
  while (forever) {
  }
  Py_RETURN_NONE;
}

static PyObject *leak_a_reference(PyObject *self, PyObject *object) {
  (void)self;
  Py_INCREF(object);
  Py_RETURN_NONE;
}

static PyObject *leak_an_object(PyObject *self, PyObject *none) {
  (void)self, (void)none;
  if (!PyTuple_Pack(1, Py_None)) return NULL;
  Py_RETURN_NONE;
}

// NOLINTBEGIN(clang-analyzer-unix.Malloc): planted
static PyObject *leak_memory(PyObject *self, PyObject *none) {
  void *volatile lost = malloc(24);
  (void)self, (void)none, (void)lost;
  Py_RETURN_NONE;
}
// NOLINTEND(clang-analyzer-unix.Malloc)

/* The byte after 20 is the allocator's own rounding: it harms nobody, and is not ours. */
static PyObject *write_past_a_block(PyObject *self, PyObject *none) {
  char volatile *volatile block = malloc(20);
  int volatile size = 20;
  (void)self, (void)none;
  block[size] = 1;
  free((void *)block);
  Py_RETURN_NONE;
}

static PyObject *overflow_an_integer(PyObject *self, PyObject *none) {
  int volatile most = 0x7fffffff;
  int volatile sum = most + 1;
  (void)self, (void)none, (void)sum;
  Py_RETURN_NONE;
}

static PyMethodDef methods[] = {
    {"nothing", nothing, METH_NOARGS, NULL},
    {"fail", fail, METH_NOARGS, NULL},
    {"leave_an_error", leave_an_error, METH_NOARGS, NULL},
    {"crash", crash, METH_NOARGS, NULL},
    {"end_by_abort", end_by_abort, METH_NOARGS, NULL},
    {"hang", hang, METH_NOARGS, NULL},
    {"leak_a_reference", leak_a_reference, METH_O, NULL},
    {"leak_an_object", leak_an_object, METH_NOARGS, NULL},
    {"leak_memory", leak_memory, METH_NOARGS, NULL},
    {"write_past_a_block", write_past_a_block, METH_NOARGS, NULL},
    {"overflow_an_integer", overflow_an_integer, METH_NOARGS, NULL},
    {NULL, NULL, 0, NULL},
};

static struct PyModuleDef module = {
    .m_base = PyModuleDef_HEAD_INIT, .m_name = "faulty", .m_size = -1, .m_methods = methods};

/* Not every version exports it without being asked. */
__attribute__((visibility("default"))) PyMODINIT_FUNC PyInit_faulty(void) {
  return PyModule_Create(&module);
}
