// Calls without a tuple. To the tables of the module all functions are METH_VARARGS, for which the
// interpreter packs a tuple at each call. But its built-in function object has a slot for a function
// of the vectorcall protocol, which takes the caller's own array; for METH_VARARGS it is empty, and
// the module fills it in. Whoever calls by tuple, or through the function's table, is served as ever.
//
//   %called_by_tuple(NAME)      leaves the slot of a function empty
//
// Stands before everything that generates a wrapper.

%wrapper %{
#if VECTOR_CALLS
/* What the interpreter does around a call by tuple is done here: it counts how deep calls are, and
   looks whether a result and an error contradict each other. What both are about is in the state of
   the thread; where it says that something is wrong, the interpreter's own function has the word. */
static inline bool enter_call(PyThreadState *thread) {
#if PY_VERSION_HEX >= 0x030C0000
  int *remaining = &thread->c_recursion_remaining;
#elif PY_VERSION_HEX >= 0x030B0000
  int *remaining = &thread->recursion_remaining;
#else
  int *remaining = NULL;
#endif
  (void)thread;
  if (!remaining || *remaining <= 0) {
    return Py_EnterRecursiveCall(" while calling a Python object") == 0;
  }
  *remaining -= 1;
  return true;
}

static inline void leave_call(PyThreadState *thread) {
#if PY_VERSION_HEX >= 0x030C0000
  thread->c_recursion_remaining += 1;
#elif PY_VERSION_HEX >= 0x030B0000
  thread->recursion_remaining += 1;
#else
  (void)thread;
  Py_LeaveRecursiveCall();
#endif
}

#if PY_VERSION_HEX >= 0x030D0000
PyAPI_FUNC(PyObject *) _Py_CheckFunctionResult(PyThreadState *thread, PyObject *function,
                                               PyObject *result, char const *where);
#endif

static inline PyObject *checked_result(PyThreadState *thread, PyObject *function,
                                       PyObject *result) {
#if PY_VERSION_HEX >= 0x030C0000
  bool const is_fine = result && !thread->current_exception;
#else
  bool const is_fine = result && !thread->curexc_type;
#endif
  if (is_fine) return result;
#if PY_VERSION_HEX >= 0x03090000
  return _Py_CheckFunctionResult(thread, function, result, NULL);
#else
  return _Py_CheckFunctionResult(function, result, NULL);
#endif
}

/* The interpreter of 3.8 counts its own calls of such a function twice. */
static inline bool is_counted_twice(size_t count) {
  return PY_VERSION_HEX < 0x03090000 && (count & PY_VECTORCALL_ARGUMENTS_OFFSET) != 0;
}

static inline PyObject *call_method(PyThreadState *thread, PyObject *function,
                                    PyObject *const *arguments, size_t count) {
  PyCFunction method = ((PyCFunctionObject *)function)->m_ml->ml_meth;
  PyObject *result = NULL;
  if (is_counted_twice(count) && !enter_call(thread)) return NULL;
  result = method(ARRAY_OF(PyVectorcall_NARGS(count)), (PyObject *)arguments);
  if (is_counted_twice(count)) leave_call(thread);
  return checked_result(thread, function, result);
}

static PyObject *call_with_array(PyObject *function, PyObject *const *arguments, size_t count,
                                 PyObject *keywords) {
  PyThreadState *thread = PyThreadState_Get();
  PyObject *result = NULL;
  if (!enter_call(thread)) return NULL;
  if (keywords && PyTuple_GET_SIZE(keywords) != 0) {
    PyErr_Format(PyExc_TypeError, "%.200s() takes no keyword arguments",
                 ((PyCFunctionObject *)function)->m_ml->ml_name);
  } else {
    result = call_method(thread, function, arguments, count);
  }
  leave_call(thread);
  return result;
}

/* The slot of a function of this module where it is as expected: there, and empty. */
static vectorcallfunc *empty_slot(PyObject *function, PyObject *module) {
  PyCFunctionObject *built_in = (PyCFunctionObject *)function;
  PyTypeObject *type = Py_TYPE(function);
  if (type != &PyCFunction_Type || built_in->m_self != module ||
      built_in->m_ml->ml_flags != METH_VARARGS) {
    return NULL;
  }
  if (type->tp_vectorcall_offset != offsetof(PyCFunctionObject, vectorcall) ||
      !PyType_HasFeature(type, HAS_VECTORCALL)) {
    return NULL;
  }
  return built_in->vectorcall ? NULL : &built_in->vectorcall;
}
#endif

static void offer_vector_calls(PyObject *module) {
#if VECTOR_CALLS
  PyObject *name = NULL, *value = NULL;
  Py_ssize_t position = 0;
  while (PyDict_Next(PyModule_GetDict(module), &position, &name, &value)) {
    vectorcallfunc *slot = empty_slot(value, module);
    if (slot) *slot = call_with_array;
  }
#else
  (void)module;
#endif
}

static void call_by_tuple(PyObject *module, char const *name) {
#if VECTOR_CALLS
  PyObject *function = PyDict_GetItemString(PyModule_GetDict(module), name);
  PyCFunctionObject *built_in = (PyCFunctionObject *)function;
  if (function && built_in->vectorcall == call_with_array) built_in->vectorcall = NULL;
#else
  (void)module, (void)name;
#endif
}
%}

%init %{
  offer_vector_calls(m);
%}

%define %called_by_tuple(NAME)
%init %{
  call_by_tuple(m, #NAME);
%}
%enddef
