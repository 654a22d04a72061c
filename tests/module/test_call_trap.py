"""What arms the call trap and what does not, and a call that traps."""

import os
import subprocess
import sys
from typing import Any, Callable

import pytest

import _libvswitch as vs
import native
import reports

Armed = Callable[[Callable[[], Any]], bool]


def test_constructors_and_destructors_arm(armed: Armed) -> None:
    made = []
    assert armed(lambda: made.append(vs.new_VSInfo()))
    assert armed(lambda: vs.delete_VSInfo(made[0]))


def test_library_calls_arm(armed: Armed) -> None:
    assert armed(lambda: vs.VSDVS_SetMTU("no-such-switch", 1500))
    assert armed(lambda: vs.QEX_ReturnStatusToString(0))
    assert armed(lambda: vs.VSQEX_FreeMemory(None))


def test_extension_methods_arm(armed: Armed, name: Any) -> None:
    assert armed(lambda: vs.qex_Name___repr__(name))


def test_readers_and_writers_do_not_arm(armed: Armed, info: Any, name: Any) -> None:
    assert not armed(lambda: vs.VSInfo_mtu_get(info))
    assert not armed(lambda: vs.VSInfo_mtu_set(info, 1))
    assert not armed(lambda: vs.VSInfo_dvsName_get(info))
    assert not armed(lambda: vs.qex_Name_string_set(name, "a"))


def test_the_runtime_helper_does_not_arm(armed: Armed) -> None:
    assert not armed(lambda: vs.SWIG_PyInstanceMethod_New(len))


def test_registration_does_not_arm() -> None:
    """In a process of its own: a registration lasts."""
    program = (
        "import native; from native import vs; native.exception_status.value = 77\n"
        "vs.VSStats_swigregister(type('Shadow', (), {}))\n"
        "print(native.exception_status.value)"
    )
    environment = dict(os.environ, PYTHONPATH=os.pathsep.join(sys.path))
    done = subprocess.run(
        [sys.executable, "-c", program], env=environment, capture_output=True, text=True
    )
    assert done.stdout == "77\n", done.stderr


def test_pointer_objects_do_not_arm(armed: Armed, info: Any) -> None:
    assert not armed(lambda: (int(info), repr(info), info.own()))


def test_panic_does_not_arm(armed: Armed) -> None:
    assert not armed(lambda: vs.Panic("from a test"))


def test_failed_conversions_do_not_arm(armed: Armed) -> None:
    assert not armed(lambda: pytest.raises(TypeError, vs.VSDVS_SetMTU, "a", "b"))
    assert not armed(lambda: pytest.raises(TypeError, vs.VSDVS_SetMTU, "a"))


def test_a_sprung_trap_raises_and_the_next_call_works(info: Any) -> None:
    with pytest.raises(RuntimeError) as caught:
        vs.VSQEX_FreeMemory(info)
    assert "VSQEX_FreeMemory" in str(caught.value)
    assert native.exception_status.value != 0

    assert vs.QEX_ReturnStatusToString(0) == "Success"
    assert native.exception_status.value == 0


def test_panic_takes_the_first_argument_only(capfd: Any) -> None:
    assert vs.Panic("100%s of it", 1, object()) is None
    assert "100%s of it" in capfd.readouterr().err
    reports.raises(TypeError, reports.argument("Panic", 1, "char const *"), vs.Panic, 5)
    reports.raises(TypeError, "Panic() takes exactly 1 argument (0 given)", vs.Panic)
