"""The module object: its functions, variables, exported symbols and start-up."""

import ctypes
import subprocess
import sys
from typing import Any, List

import pytest

import _libvswitch as vs
import native
import peer
import reports

FUNCTIONS = [value for value in vars(vs).values() if callable(value)]


def test_name_and_documentation() -> None:
    assert vs.__name__ == "_libvswitch"
    assert vs.__doc__ is None


def test_no_function_has_documentation() -> None:
    assert FUNCTIONS
    assert [function.__name__ for function in FUNCTIONS if function.__doc__ is not None] == []


def test_state_is_global() -> None:
    assert native.module_state_size(vs) == -1


def test_functions_take_a_tuple_but_for_one() -> None:
    flags = {function.__name__: native.method_flags(function) for function in FUNCTIONS}
    assert flags.pop("SWIG_PyInstanceMethod_New") == native.METH_O
    assert set(flags.values()) == {native.METH_VARARGS}


def test_no_keyword_arguments() -> None:
    with pytest.raises(TypeError, match="takes no keyword arguments"):
        vs.VSDVS_SetMTU(switch="a", mtu=1500)


def test_instance_methods_bind_functions() -> None:
    class Shadow:
        method = vs.SWIG_PyInstanceMethod_New(lambda self: self)

    shadow = Shadow()
    assert shadow.method() is shadow


def test_exported_symbols() -> None:
    expected = {
        "PyInit__libvswitch",
        "SWIG_strnlen",
        "exceptionMsg",
        "exceptionType",
        "exception_buffer",
        "exception_status",
        "alloc_dvmirror_session_table",
        "free_dvmirror_session_table",
        "get_runtime_option_type_from_name",
        "qex_ModuleCurrentID",
    }
    assert set(symbols()) == expected


def test_module_id_is_four_bytes_of_read_only_data() -> None:
    _, size, kind = symbols()["qex_ModuleCurrentID"]
    assert (int(size, 16), kind) == (4, "R")


def symbols() -> Any:
    listing = subprocess.run(
        ["nm", "--dynamic", "--defined-only", "--print-size", vs.__file__],
        check=True,
        capture_output=True,
        text=True,
    ).stdout
    rows: List[List[str]] = [line.split() for line in listing.splitlines()]
    return {row[-1]: tuple(row[:-1]) for row in rows}


def test_strnlen_is_exported_and_bounded() -> None:
    strnlen = ctypes.CDLL(vs.__file__).SWIG_strnlen
    strnlen.argtypes = [ctypes.c_char_p, ctypes.c_size_t]
    strnlen.restype = ctypes.c_size_t
    assert strnlen(b"abc", 2) == 2
    assert strnlen(b"abc", 10) == 3
    assert strnlen(None, 0) == 0


def test_cvar_prints_as_what_it_is() -> None:
    assert repr(vs.cvar) == "<Swig global variables>"


def test_module_id_is_read_only() -> None:
    assert vs.cvar.qex_ModuleCurrentID == 0
    assert type(vs.cvar.qex_ModuleCurrentID) is int
    reports.raises(
        AttributeError,
        "Variable qex_ModuleCurrentID is read-only.",
        setattr,
        vs.cvar,
        "qex_ModuleCurrentID",
        1,
    )


def test_unknown_variables() -> None:
    unknown = "Unknown C global variable 'no_such'"
    reports.raises(AttributeError, unknown, getattr, vs.cvar, "no_such")
    reports.raises(AttributeError, unknown, setattr, vs.cvar, "no_such", 1)


def test_cvar_stands_between_its_neighbours() -> None:
    names = list(vars(vs))
    assert names.index("QEX_LAST_ERR") < names.index("cvar") < names.index("QEX_MISC_NAME_MAX")


def test_status_run_is_uninterrupted() -> None:
    names = list(vars(vs))
    first, last = names.index("QEX_OK"), names.index("QEX_LAST_ERR")
    values = [getattr(vs, name) for name in names[first : last + 1]]
    assert values == [0, *range(0x0BAD0001, 0x0BAD0162)]
    assert names[last + 1] == "QEX_GENERIC_LINUX_ERROR"


def test_runtime_is_shared_under_its_generation() -> None:
    assert "swig_runtime_data4" in sys.modules
    assert repr(sys.modules["swig_runtime_data4"].type_pointer_capsule).startswith(
        '<capsule object "swig_runtime_data4.type_pointer_capsule"'
    )


def test_the_runtime_does_not_end_with_records_that_change_hands() -> None:
    capsule = sys.modules["swig_runtime_data4"].type_pointer_capsule
    signature = vs.new_qex_MgmtApiSignature()
    before = sys.getrefcount(capsule)
    for _ in range(10):
        view = vs.qex_MgmtApiSignature_name_get(signature)
        view.acquire()
        del view
    assert sys.getrefcount(capsule) == before
    vs.delete_qex_MgmtApiSignature(signature)


def test_second_initialisation_reuses_types_and_variables() -> None:
    initialise = native.library.PyInit__libvswitch
    initialise.restype = ctypes.py_object
    types = native.type_tables()
    second = initialise()

    assert second is not vs
    assert second.cvar is vs.cvar
    assert native.type_tables() == types
    record = second.new_VSInfo()
    assert vs.VSInfo_mtu_get(record) == 0
    vs.delete_VSInfo(record)


def test_failing_module_creation_is_reported() -> None:
    address = ctypes.cast(native.library.PyInit__libvswitch, ctypes.c_void_p).value
    with pytest.raises(MemoryError):
        peer.initialise_without_memory(address)
