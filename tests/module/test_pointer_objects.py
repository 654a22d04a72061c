"""Pointer objects, and what stands for them, in the hands of a program that makes mistakes."""

import subprocess
import sys
from typing import Any, Callable, Iterator, Tuple
from unittest.mock import Mock

import _libvswitch as vs
import peer
import pytest
import reports


@pytest.fixture(name="view")
def fixture_view() -> Iterator[Callable[[], Any]]:
    """Makes pointer objects of this module, all to one place."""
    signature = vs.new_qex_MgmtApiSignature()
    yield lambda: vs.qex_MgmtApiSignature_name_get(signature)
    vs.delete_qex_MgmtApiSignature(signature)


class Proxy:
    """Stands for what it is given."""

    def __init__(self, this: object) -> None:
        self.this = this


class Itself:
    """Stands for itself."""

    @property
    def this(self) -> "Itself":
        return self


REFUSAL = reports.argument("VSInfo_mtu_get", 1, "struct VSInfo *")


@pytest.mark.parametrize("endless", [Itself(), Mock()], ids=["itself", "mock"])
def test_what_stands_for_another_without_end_is_no_record(endless: object) -> None:
    reports.raises(TypeError, REFUSAL, vs.VSInfo_mtu_get, endless)
    text = reports.argument("VSDVS_DestroyVSwitch", 1, "char const *")
    reports.raises(TypeError, text, vs.VSDVS_DestroyVSwitch, endless)
    text = reports.argument("DVSState_SwitchForEach", 1, "DVSwitchCallback")
    reports.raises(TypeError, text, vs.DVSState_SwitchForEach, endless, None)


def test_a_proxy_of_a_proxy_is_a_record(info: Any) -> None:
    vs.VSInfo_mtu_set(info, 9000)
    assert vs.VSInfo_mtu_get(Proxy(Proxy(info))) == 9000


def test_a_pointer_that_nothing_else_keeps_is_read(info: Any) -> None:
    class Fresh:
        @property
        def this(self) -> Any:
            return peer.pointer_object(int(info), "VSInfo *")

    vs.VSInfo_mtu_set(info, 9000)
    assert [vs.VSInfo_mtu_get(Fresh()) for _ in range(100)] == [9000] * 100


@pytest.mark.parametrize("body", [{}, {"__slots__": ("a", "b", "c")}], ids=["plain", "slots"])
def test_a_class_with_the_name_of_pointer_objects_is_none(
    view: Callable[[], Any], body: Any
) -> None:
    namesake = type("SwigPyObject", (), body)()
    for stranger in (namesake, Proxy(namesake)):
        reports.raises(TypeError, REFUSAL, vs.VSInfo_mtu_get, stranger)
    reports.raises(TypeError, "Attempt to append a non SwigPyObject", view().append, namesake)
    assert not view() == namesake


def test_a_pointer_equals_only_pointers_to_its_place(view: Callable[[], Any]) -> None:
    pointer = view()
    assert pointer == view() and not pointer != view()
    assert pointer == peer.pointer_object(int(pointer), "VSInfo *")
    assert pointer != peer.pointer_object(int(pointer) + 1, "VSInfo *")
    for other in (int(pointer), None, "a", object(), Proxy(pointer)):
        assert pointer != other and not pointer == other


def test_a_chain_does_not_close(view: Callable[[], Any]) -> None:
    first, second, third = view(), view(), view()
    twice = "the pointer object is in this chain already"
    reports.raises(ValueError, twice, first.append, first)
    assert first.append(second) is None
    reports.raises(ValueError, twice, first.append, second)
    assert first.append(third) is None
    assert first.next() is third and third.next() is second and second.next() is None
    # What followed an object is dropped when the object joins another chain.
    assert second.append(first) is None
    assert first.next() is None
    shown = repr(second)
    assert shown.endswith(repr(first)) and shown.count("<Swig Object") == 2


def test_chains_of_any_length_are_shown_and_dropped(view: Callable[[], Any]) -> None:
    length = 300_000
    first = last = view()
    for _ in range(length):
        following = view()
        last.append(following)
        last = following
    assert repr(first).count("<Swig Object of type 'struct qex_Name *' at 0x") == length + 1
    del first
    assert last.next() is None


def test_a_truth_that_cannot_be_told_changes_no_ownership(view: Callable[[], Any]) -> None:
    class Unknown:
        def __bool__(self) -> bool:
            raise ArithmeticError("neither")

    pointer = view()
    for own in (False, True):
        pointer.own(own)
        reports.raises(ArithmeticError, "neither", pointer.own, Unknown())
        assert pointer.own() is own
    assert [pointer.own(False), pointer.own([]), pointer.own(1), pointer.own(0)] == [
        True,
        False,
        False,
        True,
    ]


def test_a_variable_that_is_not_deleted_says_so() -> None:
    reports.raises(
        AttributeError,
        "Variable qex_ModuleCurrentID is read-only.",
        *(delattr, vs.cvar, "qex_ModuleCurrentID"),
    )


def registered_and_used(cls: str) -> str:
    """A program that registers a class, and makes and drops an instance that owns its record."""
    return f"""
import _libvswitch as vs, peer
{cls}
vs.VSInfo_swigregister(Shadow)
raw = vs.new_VSInfo()
del raw
print(type(peer.pointer_object(4096, "VSInfo *")).__name__)
"""


DESTROYERS = {
    "a function": ("lambda this: given.append(this.own())", "[False]"),
    "a bound method": ("given.append", "[<Swig Object of type 'struct VSInfo *' at "),
    "a number": ("1", "[]"),
    "a text": ("'delete'", "[]"),
}


@pytest.mark.parametrize("destroy", DESTROYERS.values(), ids=list(DESTROYERS))
def test_a_class_may_name_any_destructor(destroy: Tuple[str, str]) -> None:
    program = registered_and_used(f"given = []\nclass Shadow:\n    __swig_destroy__ = {destroy[0]}")
    done = subprocess.run(
        [sys.executable, "-c", program + "print(given)"], capture_output=True, text=True
    )
    assert done.returncode == 0, done.stderr
    first, second = done.stdout.splitlines()
    assert first == "Shadow" and second.startswith(destroy[1])


class Hidden:
    """Has nothing that can be asked for."""

    def __getattribute__(self, name: str) -> Any:
        raise AttributeError(name)


class Pretender:
    """Claims to be a class."""

    __class__ = type  # type: ignore[assignment]  # it is what it is for

    def __getattr__(self, name: str) -> Any:
        raise AttributeError(name)


def test_what_has_no_instances_is_not_registered(view: Callable[[], Any]) -> None:
    for stranger in (Hidden(), Pretender(), type(view())):
        text = "what has no instances cannot be registered"
        reports.raises(TypeError, text, vs.VSInfo_swigregister, stranger)
        made = peer.pointer_object(4096, "VSInfo *")
        assert type(made).__name__ == "SwigPyObject"
