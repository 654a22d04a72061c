// Pointer objects and the classes that shadow them, where the runtime trusts what a program may hand
// it: it follows every `this` without end, and takes any object for a pointer object, any
// attribute for a destructor, any chain of pointers for a short one.
// Stands before the typemaps, which convert through this.

// Before the runtime, which calls these; they are defined after it.
%begin %{
#define PY_SSIZE_T_CLEAN
#include <Python.h>

static int ready_type(PyTypeObject *type);
#define PyType_Ready(type) ready_type(type)

/* How a class's destructor is called: with a tuple, as all of this module are, whatever it is. */
#undef PyCFunction_GET_FLAGS
#define PyCFunction_GET_FLAGS(function) METH_VARARGS
%}

%{
#undef PyType_Ready

/* Modules of the runtime know each other's pointer objects by the name of their type. A class may
   have that name too; it can be derived from, which pointer types cannot. */
static int is_pointer_object(PyObject *object) {
  return SwigPyObject_Check(object) && !PyType_HasFeature(Py_TYPE(object), Py_TPFLAGS_BASETYPE);
}

/* How many `this` may follow each other; instances of shadow classes have one. */
enum { kMostSteps = 16 };

/* The pointer object that an object is or stands for, a new reference; null, with no error, if there
   is none. Nothing else may be keeping what `this` returns. */
static PyObject *pointer_object_of(PyObject *object) {
  int steps = 0;
  Py_INCREF(object);
  while (!is_pointer_object(object)) {
    PyObject *inner = steps++ < kMostSteps ? PyObject_GetAttr(object, SWIG_This()) : NULL;
    Py_DECREF(object);
    if (!inner) {
      PyErr_Clear();
      return NULL;
    }
    object = inner;
  }
  return object;
}

/* What the typemaps convert with. */
static int convert_pointer(PyObject *object, void **pointer, swig_type_info *type, int flags) {
  PyObject *found = NULL;
  int kind = SWIG_ERROR;
  if (object == Py_None) return SWIG_Python_ConvertPtr(object, pointer, type, flags);
  found = pointer_object_of(object);
  if (found) kind = SWIG_Python_ConvertPtr(found, pointer, type, flags);
  Py_XDECREF(found);
  return kind;
}

static int convert_function(PyObject *object, void **pointer, swig_type_info *type) {
  return PyCFunction_Check(object) ? SWIG_Python_ConvertFunctionPtr(object, pointer, type)
                                   : convert_pointer(object, pointer, type, 0);
}

static PyObject *compare_pointers(PyObject *left, PyObject *right, int operation) {
  if (!is_pointer_object(right)) Py_RETURN_NOTIMPLEMENTED;
  return SwigPyObject_richcompare((SwigPyObject *)left, (SwigPyObject *)right, operation);
}

/* A truth that cannot be told must not leave its error beside a result. */
static PyObject *own_pointer(PyObject *self, PyObject *args) {
  SwigPyObject *pointer = (SwigPyObject *)self;
  PyObject *owned = NULL;
  int own = 0;
  if (PyTuple_GET_SIZE(args) != 1) return SwigPyObject_own(self, args);
  own = PyObject_IsTrue(PyTuple_GET_ITEM(args, 0));
  if (own < 0) return NULL;
  owned = PyBool_FromLong(pointer->own);
  pointer->own = own ? SWIG_POINTER_OWN : 0;
  return owned;
}

/* A chain that closed would be searched for ever. */
static PyObject *append_pointer(PyObject *self, PyObject *added) {
  SwigPyObject *first = (SwigPyObject *)self;
  SwigPyObject *next = (SwigPyObject *)added;
  PyObject *rest = NULL;
  PyObject *link = self;
  if (!is_pointer_object(added)) {
    return PyErr_Format(PyExc_TypeError, "Attempt to append a non SwigPyObject");
  }
  for (; link; link = ((SwigPyObject *)link)->next) {
    if (link == added) {
      return PyErr_Format(PyExc_ValueError, "the pointer object is in this chain already");
    }
  }
  rest = next->next;
  next->next = first->next;
  first->next = added;
  Py_INCREF(added);
  Py_XDECREF(rest);
  Py_RETURN_NONE;
}

/* Chains of any length are shown and dropped without a frame for each link. */
static PyObject *show_pointer(PyObject *self) {
  PyObject *parts = NULL, *nothing = NULL, *shown = NULL;
  if (!((SwigPyObject *)self)->next) return SwigPyObject_repr((SwigPyObject *)self);
  parts = PyList_New(0);
  nothing = PyUnicode_FromString("");
  while (parts && self) {
    SwigPyObject *link = (SwigPyObject *)self;
    PyObject *part = NULL;
    self = link->next;
    link->next = NULL;
    part = SwigPyObject_repr(link);
    link->next = self;
    if (!part || PyList_Append(parts, part) < 0) Py_CLEAR(parts);
    Py_XDECREF(part);
  }
  if (parts && nothing) shown = PyUnicode_Join(nothing, parts);
  Py_XDECREF(parts);
  Py_XDECREF(nothing);
  return shown;
}

static PyObject *show_pointer_by_name(PyObject *self, PyObject *SWIGUNUSEDPARM(none)) {
  return show_pointer(self);
}

OUT_OF_LINE void drop_owner_or_chain(PyObject *self) {
  PyObject *link = ((SwigPyObject *)self)->next;
  ((SwigPyObject *)self)->next = NULL;
  SwigPyObject_dealloc(self);
  while (link && Py_REFCNT(link) == 1) {
    PyObject *rest = ((SwigPyObject *)link)->next;
    ((SwigPyObject *)link)->next = NULL;
    Py_DECREF(link);
    link = rest;
  }
  Py_XDECREF(link);
}

static void drop_pointer(PyObject *self) {
  SwigPyObject *pointer = (SwigPyObject *)self;
  if (pointer->next || pointer->own == SWIG_POINTER_OWN) {
    drop_owner_or_chain(self);
  } else {
    keep_or_free_pointer(self);
  }
}

/* The object with the variables reports failures by 1, which not every caller takes for one. */
static setattrfunc set_variable;
static int set_variable_or_fail(PyObject *variables, char *name, PyObject *value) {
  return set_variable(variables, name, value) ? -1 : 0;
}

static int ready_type(PyTypeObject *type) {
  PyMethodDef *method = swigobject_methods;
  if (type->tp_setattr) {
    set_variable = type->tp_setattr;
    type->tp_setattr = set_variable_or_fail;
  }
  if (type->tp_methods != swigobject_methods) return PyType_Ready(type);
  type->tp_richcompare = compare_pointers;
  type->tp_repr = show_pointer;
  type->tp_dealloc = drop_pointer;
  for (; method->ml_name; method++) {
    if (strcmp(method->ml_name, "own") == 0) method->ml_meth = own_pointer;
    if (strcmp(method->ml_name, "append") == 0) method->ml_meth = append_pointer;
    if (strcmp(method->ml_name, "__repr__") == 0) method->ml_meth = show_pointer_by_name;
  }
  return PyType_Ready(type);
}

static bool is_replaced(char const *name, PyCFunction function) {
  PyMethodDef const *method = swigobject_methods;
  while (method->ml_name && strcmp(method->ml_name, name) != 0) method++;
  return method->ml_name && method->ml_meth == function;
}

static bool compares_pointers(PyObject *SWIGUNUSEDPARM(module)) {
  return SwigPyObject_type()->tp_richcompare == compare_pointers;
}

static bool shows_chains(PyObject *SWIGUNUSEDPARM(module)) {
  return SwigPyObject_type()->tp_repr == show_pointer && is_replaced("__repr__", show_pointer_by_name);
}

static bool drops_chains(PyObject *SWIGUNUSEDPARM(module)) {
  return SwigPyObject_type()->tp_dealloc == drop_pointer;
}

static bool appends_once(PyObject *SWIGUNUSEDPARM(module)) {
  return is_replaced("append", append_pointer);
}

static bool asks_for_truth(PyObject *SWIGUNUSEDPARM(module)) {
  return is_replaced("own", own_pointer);
}

static bool fails_by_minus_one(PyObject *SWIGUNUSEDPARM(module)) {
  return Py_TYPE(SWIG_globals())->tp_setattr == set_variable_or_fail;
}

/* Asked with a class whose destructor takes one object and no tuple. */
static bool calls_any_destructor(PyObject *module) {
  PyObject *cls = PyObject_CallObject(PyExc_Exception, NULL);
  PyObject *destructor = PyObject_GetAttrString(module, "SWIG_PyInstanceMethod_New");
  SwigPyClientData *shadow = NULL;
  bool is_called = false;
  if (cls && destructor && PyObject_SetAttrString(cls, "__swig_destroy__", destructor) == 0) {
    shadow = SwigPyClientData_New(cls);
  }
  if (shadow) {
    is_called = shadow->delargs != 0;
    SwigPyClientData_Del(shadow);
  }
  PyErr_Clear();
  Py_XDECREF(destructor);
  Py_XDECREF(cls);
  return is_called;
}

/* Whether the runtime can make instances: by what a type has for it, or by the `__new__` of what is
   no type and does not claim to be one. It asks again, but must not with an error pending. */
static int has_instances(PyObject *cls) {
  PyObject *make = NULL;
  if (PyType_Check(cls)) return ((PyTypeObject *)cls)->tp_new != NULL;
  if (PyObject_IsInstance(cls, (PyObject *)&PyType_Type) == 0) {
    make = PyObject_GetAttrString(cls, "__new__");
  }
  PyErr_Clear();
  Py_XDECREF(make);
  return make != NULL;
}

#define PyType_Ready(type) ready_type(type)

/* Makes a class the shadow of a type; pointers of that type become its instances. */
static PyObject *register_class(swig_type_info *type, PyObject *cls) {
  SwigPyClientData *shadow = type->clientdata;
  if (shadow && shadow->klass == cls) Py_RETURN_NONE;
  if (!has_instances(cls)) {
    return PyErr_Format(PyExc_TypeError, "what has no instances cannot be registered");
  }
  SWIG_TypeNewClientData(type, SwigPyClientData_New(cls));
  Py_RETURN_NONE;
}
%}
