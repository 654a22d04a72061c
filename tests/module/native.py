"""Looks at the loaded module from outside: its memory, exported symbols and runtime tables.

Everything here reads through ctypes, so that no test has to trust the wrappers it tests.
"""

import ctypes
import sys
from typing import Any, Dict, List

import _libvswitch as vs

METH_VARARGS = 0x0001
METH_O = 0x0008

library = ctypes.PyDLL(vs.__file__)
exception_status = ctypes.c_int.in_dll(library, "exception_status")

_get_flags = ctypes.pythonapi.PyCFunction_GetFlags
_get_flags.argtypes = [ctypes.py_object]
_get_flags.restype = ctypes.c_int


def method_flags(function: Any) -> int:
    return int(_get_flags(function))


def module_state_size(module: Any) -> int:
    """The m_size of the definition of a module object."""

    class ModuleDef(ctypes.Structure):
        _fields_ = [
            ("base", ctypes.c_byte * (5 * ctypes.sizeof(ctypes.c_void_p))),
            ("name", ctypes.c_char_p),
            ("doc", ctypes.c_char_p),
            ("size", ctypes.c_ssize_t),
        ]

    # A debug interpreter's objects begin with two more pointers.
    extra = sys.getsizeof(object()) - 2 * ctypes.sizeof(ctypes.c_void_p)
    get_def = ctypes.pythonapi.PyModule_GetDef
    get_def.argtypes = [ctypes.py_object]
    get_def.restype = ctypes.c_void_p
    definition = ModuleDef.from_address(get_def(module) + extra)
    assert definition.name == b"_libvswitch", "the definition is not where it was looked for"
    return int(definition.size)


class _TypeInfo(ctypes.Structure):
    _fields_ = [("name", ctypes.c_char_p), ("str", ctypes.c_char_p)]


class _ModuleInfo(ctypes.Structure):
    pass


_ModuleInfo._fields_ = [
    ("types", ctypes.POINTER(ctypes.POINTER(_TypeInfo))),
    ("size", ctypes.c_size_t),
    ("next", ctypes.POINTER(_ModuleInfo)),
]


def type_tables() -> List[Dict[str, List[str]]]:
    """For each module of the runtime ring, its types: the spellings by mangled name."""
    get_pointer = ctypes.pythonapi.PyCapsule_Import
    get_pointer.argtypes = [ctypes.c_char_p, ctypes.c_int]
    get_pointer.restype = ctypes.c_void_p
    first = get_pointer(b"swig_runtime_data4.type_pointer_capsule", 0)
    tables = []
    address = first
    while True:
        info = _ModuleInfo.from_address(address)
        entries = [info.types[index].contents for index in range(info.size)]
        tables.append(
            {e.name.decode(): e.str.decode().split("|") if e.str else [] for e in entries}
        )
        address = ctypes.addressof(info.next.contents)
        if address == first:
            return tables


def address_of(record: Any) -> int:
    return int(getattr(record, "this", record))


def read(record: Any, size: int, offset: int = 0) -> bytes:
    return ctypes.string_at(address_of(record) + offset, size)


def write(record: Any, data: bytes, offset: int = 0) -> None:
    ctypes.memmove(address_of(record) + offset, data, len(data))
