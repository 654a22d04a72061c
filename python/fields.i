// What an instance of a class costs no Python code for: its pointer object at a fixed place, fields
// that are read and written through the flat functions, construction and the end. The classes of
// libvswitch derive from `Pointing`, their fields are `Field`s.
//
// Modules with the runtime find the pointer object as the attribute `this`. A class is looked up by
// name for two attributes of its own: `_new`, the flat constructor that `__init__` calls, and `_fields`,
// the names that can be set.

%{
#include <stddef.h>
#include <structmember.h>

#if PY_VERSION_HEX < 0x03090000
#define PyObject_Vectorcall _PyObject_Vectorcall
#define PyVectorcall_Function _PyVectorcall_Function
#endif

typedef struct Pointing {
  PyObject_HEAD
  PyObject *this; /* set once; the memory that it points to may end before */
  PyObject *dict;
  PyObject *weak_references;
} Pointing;

static PyTypeObject pointing_type;

/* What is looked up by name. */
static struct {
  PyObject *make, *fields, *set;
} names;

static int is_pointing(PyObject *object) { return PyObject_TypeCheck(object, &pointing_type); }

/* What a class wraps, or the object itself; a TypeError for anything else. */
static SwigPyObject *raw_pointer(PyObject *object) {
  PyObject *const held = is_pointing(object) ? ((Pointing *)object)->this : object;
  SwigPyObject *raw = held ? SWIG_Python_GetSwigThis(held) : NULL;
  if (!raw) PyErr_SetString(PyExc_TypeError, "neither a pointer object nor a record");
  return raw;
}

static char const *type_name(PyObject *object) { return Py_TYPE(object)->tp_name; }

static char const *article(PyObject *object) {
  return strchr("AEIOU", type_name(object)[0]) ? "an" : "a";
}

/* A call of a flat function, whose slot of the vectorcall protocol is looked at once. */
typedef struct FlatCall {
  PyObject *function;
  vectorcallfunc direct; /* null where the interpreter has to pack a tuple */
} FlatCall;

static FlatCall flat_call(PyObject *function) {
  FlatCall const call = {function, PyVectorcall_Function(function)};
  Py_INCREF(function);
  return call;
}

static PyObject *call_flat(FlatCall const *call, PyObject *const *arguments, size_t count) {
  return call->direct ? call->direct(call->function, arguments, count, NULL)
                      : PyObject_Vectorcall(call->function, arguments, count, NULL);
}

/* A property of two flat functions. It starts as the interpreter's own, of whatever
   size, and goes on as: */
typedef struct Field {
  FlatCall read;
  FlatCall write;  /* its function is null where the field cannot be written */
  PyObject *where; /* of a text, what `check` is told of a value in which a NUL is; or null */
  PyObject *check;
  PyObject *doc;
} Field;

static PyTypeObject field_type;

static Field *field_of(PyObject *property) {
  return (Field *)((char *)property + PyProperty_Type.tp_basicsize);
}

/* The flat functions take an instance, too, and say what is wrong with one without memory. */
static PyObject *flat_argument(PyObject *instance) {
  PyObject *const held = is_pointing(instance) ? ((Pointing *)instance)->this : NULL;
  PyObject *const argument = held ? held : instance;
  Py_INCREF(argument);
  return argument;
}

static PyObject *read_field(PyObject *property, PyObject *instance, PyObject *type) {
  if (!instance || instance == Py_None) {
    return PyProperty_Type.tp_descr_get(property, instance, type);
  }
  PyObject *const argument = flat_argument(instance);
  PyObject *const value = call_flat(&field_of(property)->read, &argument, 1);
  Py_DECREF(argument);
  return value;
}

static int check_text(Field const *field, PyObject *value) {
  if (!field->where || !PyUnicode_Check(value)) return 0;
  Py_ssize_t const at = PyUnicode_FindChar(value, 0, 0, PyUnicode_GET_LENGTH(value), 1);
  if (at == -1) return 0;
  if (at < 0) return -1;
  PyObject *const checked = PyObject_CallFunctionObjArgs(field->check, field->where, value, NULL);
  Py_XDECREF(checked);
  return checked ? 0 : -1;
}

static int write_field(PyObject *property, PyObject *instance, PyObject *value) {
  Field *const field = field_of(property);
  if (!value || !field->write.function) {
    return PyProperty_Type.tp_descr_set(property, instance, value);
  }
  if (check_text(field, value) < 0) return -1;
  PyObject *const arguments[] = {flat_argument(instance), value};
  PyObject *const nothing = call_flat(&field->write, arguments, 2);
  Py_DECREF(arguments[0]);
  Py_XDECREF(nothing);
  return nothing ? 0 : -1;
}

/* Field(read, write, doc, check, where) */
static int init_field(PyObject *property, PyObject *arguments, PyObject *keywords) {
  PyObject *read = NULL, *write = NULL, *doc = Py_None, *check = NULL, *where = NULL;
  Field *const field = field_of(property);
  if (!PyArg_ParseTuple(arguments, "OO|OOU", &read, &write, &doc, &check, &where)) return -1;
  if (keywords || field->read.function) {
    PyErr_SetString(PyExc_TypeError, keywords ? "a Field takes no keyword arguments"
                                              : "this Field has its functions already");
    return -1;
  }
  PyObject *const own = PyTuple_Pack(4, read, write, Py_None, doc);
  int const made = own ? PyProperty_Type.tp_init(property, own, NULL) : -1;
  Py_XDECREF(own);
  if (made < 0) return -1;
  Py_INCREF(doc);
  Py_XSETREF(field->doc, doc);
  field->read = flat_call(read);
  if (write != Py_None) field->write = flat_call(write);
  if (where) {
    Py_INCREF(check);
    Py_INCREF(where);
    field->check = check;
    field->where = where;
  }
  return 0;
}

static void drop_field(PyObject *property) {
  Field *const field = field_of(property);
  Py_CLEAR(field->read.function);
  Py_CLEAR(field->write.function);
  Py_CLEAR(field->check);
  Py_CLEAR(field->where);
  Py_CLEAR(field->doc);
  PyProperty_Type.tp_dealloc(property);
}

/* The interpreter's own keeps the documentation of a derived one in an attribute of that. */
static PyMemberDef field_members[] = {{"__doc__", T_OBJECT, 0, 0, NULL}, {NULL, 0, 0, 0, NULL}};

static PyTypeObject field_type = {
    PyVarObject_HEAD_INIT(NULL, 0).tp_name = "libvswitch._pointers.Field",
    .tp_flags = Py_TPFLAGS_DEFAULT,
    .tp_members = field_members,
    .tp_dealloc = drop_field,
    .tp_init = init_field,
    .tp_descr_get = read_field,
    .tp_descr_set = write_field,
};

/* Instances */

static int traverse_pointing(PyObject *self, visitproc visit, void *arg) {
  Py_VISIT(((Pointing *)self)->this);
  Py_VISIT(((Pointing *)self)->dict);
  return 0;
}

/* What it points with stays: whoever finds the object until its end finds its memory, too. A pointer
   object leads to no other object. */
static int clear_pointing(PyObject *self) {
  Py_CLEAR(((Pointing *)self)->dict);
  return 0;
}

/* Ends the record of a pointer object that nobody else has, without the one in between that the
   runtime would make for the destructor. */
static void destroy_record(PyObject *held) {
  SwigPyObject *const raw = (SwigPyObject *)held;
  if (Py_REFCNT(held) != 1 || !SwigPyObject_Check(held) || raw->own != SWIG_POINTER_OWN) return;
  SwigPyClientData *const shadow = raw->ty ? raw->ty->clientdata : NULL;
  if (!shadow || !shadow->destroy) return;
  PyObject *type = NULL, *value = NULL, *traceback = NULL;
  PyErr_Fetch(&type, &value, &traceback);
  PyObject *const nothing = PyObject_Vectorcall(shadow->destroy, &held, 1, NULL);
  if (!nothing) PyErr_WriteUnraisable(shadow->destroy);
  Py_XDECREF(nothing);
  raw->own = 0;
  PyErr_Restore(type, value, traceback);
}

static void drop_pointing(PyObject *self) {
  Pointing *const pointing = (Pointing *)self;
  PyObject_GC_UnTrack(self);
  if (pointing->weak_references) PyObject_ClearWeakRefs(self);
  Py_CLEAR(pointing->dict);
  if (pointing->this) destroy_record(pointing->this);
  Py_CLEAR(pointing->this);
  Py_TYPE(self)->tp_free(self);
}

static int refuse_attribute(PyObject *self, PyObject *name, char const *what) {
  PyErr_Format(PyExc_AttributeError, "the attribute %R of %s %s cannot be %s", name, article(self),
               type_name(self), what);
  return -1;
}

static int set_this(PyObject *self, PyObject *name, PyObject *pointer) {
  Pointing *const pointing = (Pointing *)self;
  if (pointing->this) return refuse_attribute(self, name, "set");
  Py_INCREF(pointer);
  pointing->this = pointer;
  return 0;
}

static int is_name(PyObject *name, char const *text) {
  return PyUnicode_Check(name) && PyUnicode_CompareWithASCIIString(name, text) == 0;
}

static int require_memory(PyObject *self) {
  SwigPyObject *const raw = raw_pointer(self);
  if (raw && raw->ptr) return 0;
  if (raw) {
    PyErr_Format(PyExc_ValueError, "this %s is gone: its memory was released", type_name(self));
  }
  return -1;
}

/* Fields that are no Field, and what is none. */
static int set_other(PyObject *self, PyObject *name, PyObject *value) {
  PyObject *const fields = _PyType_Lookup(Py_TYPE(self), names.fields);
  if (is_name(name, "this")) return set_this(self, name, value);
  if (!fields) return refuse_attribute(self, name, "set");
  int const is_field = PySequence_Contains(fields, name);
  if (is_field < 0) return -1;
  if (is_field) {
    if (require_memory(self) < 0) return -1;
  } else if (!is_name(name, "thisown")) {
    PyErr_Format(PyExc_AttributeError, "%s has no field %R", type_name(self), name);
    return -1;
  }
  return PyObject_GenericSetAttr(self, name, value);
}

/* The runtime sets `this` of a new record here, too; there is no frame of Python's, in which a signal
   could raise: it would lose what the library allocated. */
static int set_attribute(PyObject *self, PyObject *name, PyObject *value) {
  if (!value) return refuse_attribute(self, name, "deleted");
  PyObject *const found = _PyType_Lookup(Py_TYPE(self), name);
  if (!found || Py_TYPE(found) != &field_type) return set_other(self, name, value);
  if (require_memory(self) < 0) return -1;
  Py_INCREF(found);
  int const written = write_field(found, self, value);
  Py_DECREF(found);
  return written;
}

/* Gives an instance the pointer object that a flat constructor made. */
static int attach_pointer(PyObject *self, PyObject *pointer) {
  if (pointer == Py_None) {
    PyErr_Format(PyExc_MemoryError, "no memory for %s %s", article(self), type_name(self));
    return -1;
  }
  if (((Pointing *)self)->this) {
    PyErr_Format(PyExc_TypeError, "this %s has its memory already", type_name(self));
    return -1;
  }
  return set_this(self, SWIG_This(), pointer);
}

static int refuse_arguments(PyObject *self, Py_ssize_t count) {
#if PY_VERSION_HEX >= 0x030A0000
  PyObject *const name = PyObject_GetAttrString((PyObject *)Py_TYPE(self), "__qualname__");
  if (!name) return -1;
  PyErr_Format(PyExc_TypeError, "%U.__init__() takes 1 positional argument but %zd were given",
               name, count + 1);
  Py_DECREF(name);
#else
  PyErr_Format(PyExc_TypeError, "__init__() takes 1 positional argument but %zd were given",
               count + 1);
#endif
  return -1;
}

/* The record of an instance, and its first fields. */
static int init_pointing(PyObject *self, PyObject *arguments, PyObject *keywords) {
  PyObject *const make = _PyType_Lookup(Py_TYPE(self), names.make);
  if (!make) {
    PyErr_Format(PyExc_TypeError, "%s objects are made by records and calls", type_name(self));
    return -1;
  }
  if (PyTuple_GET_SIZE(arguments) != 0) {
    return refuse_arguments(self, PyTuple_GET_SIZE(arguments));
  }
  PyObject *const pointer = PyObject_Vectorcall(make, NULL, 0, NULL);
  int const attached = pointer ? attach_pointer(self, pointer) : -1;
  Py_XDECREF(pointer);
  if (attached < 0 || !keywords || PyDict_GET_SIZE(keywords) == 0) return attached;
  PyObject *const nothing = PyObject_CallMethodObjArgs(self, names.set, keywords, NULL);
  Py_XDECREF(nothing);
  return nothing ? 0 : -1;
}

static PyMemberDef pointing_members[] = {
    {"this", T_OBJECT_EX, offsetof(Pointing, this), READONLY, NULL}, {NULL, 0, 0, 0, NULL}};

static PyGetSetDef pointing_attributes[] = {
    {"__dict__", PyObject_GenericGetDict, NULL, NULL, NULL}, {NULL, NULL, NULL, NULL, NULL}};

static PyTypeObject pointing_type = {
    PyVarObject_HEAD_INIT(NULL, 0).tp_name = "libvswitch._pointers.Pointing",
    .tp_basicsize = sizeof(Pointing),
    .tp_flags = Py_TPFLAGS_DEFAULT | Py_TPFLAGS_BASETYPE | Py_TPFLAGS_HAVE_GC,
    .tp_dictoffset = offsetof(Pointing, dict),
    .tp_weaklistoffset = offsetof(Pointing, weak_references),
    .tp_members = pointing_members,
    .tp_getset = pointing_attributes,
    .tp_traverse = traverse_pointing,
    .tp_clear = clear_pointing,
    .tp_dealloc = drop_pointing,
    .tp_setattro = set_attribute,
    .tp_init = init_pointing,
};

/* Adds both types to the module. */
static int add_types(PyObject *module) {
  names.make = PyUnicode_InternFromString("_new");
  names.fields = PyUnicode_InternFromString("_fields");
  names.set = PyUnicode_InternFromString("_set");
  if (!names.make || !names.fields || !names.set) return -1;
  field_members[0].offset = PyProperty_Type.tp_basicsize + (Py_ssize_t)offsetof(Field, doc);
  field_type.tp_base = &PyProperty_Type;
  field_type.tp_basicsize = PyProperty_Type.tp_basicsize + (Py_ssize_t)sizeof(Field);
  pointing_type.tp_new = PyBaseObject_Type.tp_new;
  if (PyType_Ready(&field_type) < 0 || PyType_Ready(&pointing_type) < 0) return -1;
  Py_INCREF(&field_type);
  Py_INCREF(&pointing_type);
  if (PyModule_AddObject(module, "Field", (PyObject *)&field_type) < 0) return -1;
  return PyModule_AddObject(module, "Pointing", (PyObject *)&pointing_type);
}
%}

%init %{
  if (add_types(m) < 0) return NULL;
%}

%inline %{
/* What the constructor of a class does with the pointer object that the flat one made: a TypeError if
   the object has one. */
PyObject *attach(PyObject *object, PyObject *pointer) {
  if (!is_pointing(object)) {
    return PyErr_Format(PyExc_TypeError, "%s has no place for it", type_name(object));
  }
  return attach_pointer(object, pointer) < 0 ? NULL : SWIG_Py_Void();
}
%}
