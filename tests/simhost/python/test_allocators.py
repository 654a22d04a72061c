"""Allocators in Python, for lists that the host makes through the module."""

from typing import Callable

PRELUDE = """
import libvswitch as classes
from libvswitch import _pointers

malloc, free = ctypes.CDLL(None).malloc, ctypes.CDLL(None).free
malloc.restype, malloc.argtypes = ctypes.c_void_p, [ctypes.c_size_t]
free.restype, free.argtypes = None, [ctypes.c_void_p]
misuses = []


def misuse():
    try:
        vs.VSQEX_FreeMemory(classes.Cell("int").pointer)
    except RuntimeError as error:
        misuses.append(str(error).partition(" at ")[0])


@ctypes.CFUNCTYPE(ctypes.c_void_p, ctypes.c_size_t)
def allocate(size):
    misuse()
    return malloc(size)


@ctypes.CFUNCTYPE(None, ctypes.c_void_p)
def release(block):
    misuse()
    free(block)


def pointer(function, spelling):
    return _pointers.pointer_object(ctypes.cast(function, ctypes.c_void_p).value, spelling)


def new_list():
    made = classes.Cell("DVSDataHandle")
    functions = pointer(allocate, "DVSData_MemAlloc"), pointer(release, "DVSData_MemFree")
    assert vs.DVSData_Alloc(made.pointer.this, *functions) == vs.QEX_OK
    return made.value.this
"""


def test_an_allocator_calls_the_module(run: Callable[[str], str]) -> None:
    """Its calls arm the trap, and trap themselves; those that it works for go on, and trap too."""
    written = run(
        PRELUDE
        + """
made = new_list()
assert vs.DVSData_Update(made, "name", None, 0, vs.CONFIG_PROP_TYPE) == vs.QEX_OK
vs.DVSData_Free(made)
print(len(misuses), set(misuses))
try:
    vs.DVSData_Update(made, "name", None, 0, vs.CONFIG_PROP_TYPE)
except RuntimeError as error:
    print(str(error).rpartition(" is ")[2])
"""
    )
    assert written.splitlines() == [
        "4 {'VSQEX_FreeMemory: the host never gave out the memory'}",
        "freed already",
    ]
