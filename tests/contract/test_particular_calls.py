"""The calls that have rules of their own."""

from typing import Tuple

import _libvswitch as vs
import calls
import pytest
import reports
from arguments import contents_of
from recording_host import RecordingHost


def test_panic_passes_its_first_text_and_a_null_pointer(host: RecordingHost) -> None:
    assert vs.Panic("x") is None
    assert vs.Panic("x %s %n", 1, object()) is None
    assert vs.Panic(None, "y", "z", None) is None
    assert host.calls() == [
        ("Panic", (b"x", None)),
        ("Panic", (b"x %s %n", None)),
        ("Panic", (None, None)),
    ]


def test_panic_takes_a_text_whatever_follows_it(host: RecordingHost) -> None:
    text = reports.argument("Panic", 1, "char const *")
    reports.raises(TypeError, text, vs.Panic, 5)
    reports.raises(TypeError, text, vs.Panic, 5, "x", "y")
    assert host.calls() == []


@pytest.mark.parametrize(
    "given",
    [
        (),
        (1,),
        (b"a",),
        ("\ud800",),
        (1, "b"),
        ("a", 1),
        ("a", b"b"),
        ("a", "\ud800"),
        ("a", "b" * 128),
        ("a", "b" * 129),
        ("a", "é" * 64),
        ("a", "b", "c"),
        ("a", None, None, None),
    ],
    ids=repr,
)
def test_arguments_that_fit_no_form_are_not_implemented(
    host: RecordingHost, given: Tuple[object, ...]
) -> None:
    reports.raises(NotImplementedError, calls.NO_SUCH_FORM, vs.DVSAliasToPortsetName, *given)
    assert host.calls() == []


def test_the_number_of_texts_chooses_the_form(host: RecordingHost) -> None:
    host.answer("DVSAliasToPortsetName", 3, outputs={2: b"portset\0"})
    assert vs.DVSAliasToPortsetName("alias") == [3, "portset"]
    assert vs.DVSAliasToPortsetName(None) == [3, "portset"]
    for second in ("", "b" * 127, None):
        result = vs.DVSAliasToPortsetName("alias", second)
        assert (type(result), result) == (int, 3)


GROUP = bytes([239, 255, 0, 1])


@pytest.mark.parametrize("value", [None, "text", 1, bytearray(GROUP), memoryview(GROUP), []])
@pytest.mark.parametrize("status", [0, 0x0BAD0001])
def test_a_group_that_is_no_bytes_is_null_and_refused_after_the_call(
    host: RecordingHost, value: object, status: int
) -> None:
    host.answer("VSQEX_GetMcastFilterStats", status, outputs={5: 0x1000})
    text = f"expected bytes, {type(value).__name__} found"
    reports.raises(TypeError, text, vs.VSQEX_GetMcastFilterStats, "a", 1, 2, value)
    (call,) = host.calls()
    assert call.values[:4] == (b"a", 1, 2, None)


def test_a_sprung_trap_says_more_than_a_group_that_is_no_bytes(host: RecordingHost) -> None:
    host.spring("VSQEX_GetMcastFilterStats", ValueError, "trapped")
    reports.raises(ValueError, "trapped", vs.VSQEX_GetMcastFilterStats, "a", 1, 2, None)


def test_a_group_is_passed_where_it_lies(host: RecordingHost) -> None:
    vs.VSQEX_GetMcastFilterStats("a", 1, 2, GROUP)
    (call,) = host.calls()
    assert call.values[3] == contents_of(GROUP)


def test_what_a_call_returns_can_be_passed_on(host: RecordingHost) -> None:
    host.answer("DVSState_SwitchFindByAlias", 0x1000)
    host.answer("VSQEX_GetMcastFilters", outputs={4: 0x2000})
    vs.DVS_SwitchName(vs.DVSState_SwitchFindByAlias("alias"))
    vs.VSQEX_FreeMemory(vs.VSQEX_GetMcastFilters("a", 1, 2)[1])
    seen = [call.values for call in host.calls()]
    assert (seen[1], seen[3]) == ((0x1000,), (0x2000,))
