"""What an instance costs no Python code for: fields, construction, the end, and what it refuses."""

import gc
import sys
import weakref
from typing import Any, Callable, List

import _libvswitch as flat
import libvswitch as vs
import pytest
from libvswitch import _checks, _pointers


def python_calls(work: Callable[[], Any]) -> List[str]:
    """The functions of Python's that run within one, whatever it raises."""
    seen: List[str] = []

    def note(frame: Any, event: str, _: Any) -> None:
        if event == "call" and frame.f_code is not getattr(work, "__code__", None):
            seen.append(frame.f_code.co_name)

    sys.setprofile(note)
    try:
        work()
    except Exception:
        pass
    finally:
        sys.setprofile(None)
    return seen


# What a type checker would not let through is tried, too.
classes: Any = vs
info, name = classes.VSInfo(), classes.qex_Name()


@pytest.mark.parametrize(
    "work",
    [
        lambda: info.mtu,
        lambda: setattr(info, "mtu", 9000),
        lambda: setattr(info, "mtu", "no number"),
        lambda: name.string,
        lambda: setattr(name, "string", "uplink"),
        lambda: setattr(info, "mut", 9000),
        lambda: setattr(info, "this", None),
        lambda: delattr(info, "mtu"),
        lambda: vs.VSInfo(),
        lambda: classes.VSInfo(1),
    ],
)
def test_no_function_of_pythons_runs(work: Callable[[], Any]) -> None:
    assert python_calls(work) == []


def test_a_function_of_pythons_would_be_noticed() -> None:
    assert "_set" in python_calls(lambda: vs.VSInfo(mtu=1))
    assert "refuse_nul" in python_calls(lambda: setattr(name, "string", "a\0b"))


def test_a_field_is_read_and_written_by_the_flat_functions() -> None:
    member = vars(vs.VSInfo)["mtu"]
    assert isinstance(member, _pointers.Field) and isinstance(member, property)
    assert (member.fget, member.fset) == (flat.VSInfo_mtu_get, flat.VSInfo_mtu_set)
    assert classes.VSInfo.mtu is member
    for value in (2**32, -1, "1", 1.0, None):
        wrong: Any = value
        with pytest.raises((TypeError, OverflowError)) as expected:
            flat.VSInfo_mtu_set(info.this, wrong)
        with pytest.raises(expected.type) as raised:
            info.mtu = wrong
        assert str(raised.value) == str(expected.value)


def test_documentation_of_a_field() -> None:
    assert vs.qex_Name.string.__doc__ == "at most 31 characters and a NUL"
    assert vs.VSInfo.mtu.__doc__ is None


def test_a_field_reads_records_only() -> None:
    for wrong in (vs.qex_Name(), 5, vs.VSInfo.__new__(vs.VSInfo)):
        uses: List[Any] = [
            lambda: classes.VSInfo.mtu.__get__(wrong),
            lambda: classes.VSInfo.mtu.__set__(wrong, 1),
        ]
        for use in uses:
            with pytest.raises(TypeError, match="^in method 'VSInfo_mtu_[gs]et', argument 1 of "):
                use()


def test_a_field_without_a_writer_says_what_a_property_says() -> None:
    class Plain:
        mtu = property(getattr(flat, "VSInfo_mtu_get"))

    field: Any = _pointers.Field(flat.VSInfo_mtu_get, None)
    derived: Any = type("Plain", (vs.VSInfo,), {"mtu": field})()
    with pytest.raises(AttributeError) as expected:
        setattr(Plain(), "mtu", 1)
    with pytest.raises(AttributeError) as raised:
        derived.mtu = 1
    ours, plain = (
        str(one.value).replace(Plain.__qualname__, "Plain") for one in (raised, expected)
    )
    assert ours == plain
    assert derived.mtu == 0


def test_a_field_takes_its_functions_once() -> None:
    field = _pointers.Field(flat.VSInfo_mtu_get, flat.VSInfo_mtu_set, "text", _checks.text, "x.y")
    assert field.__doc__ == "text"
    with pytest.raises(TypeError, match="^this Field has its functions already$"):
        field.__init__(flat.VSInfo_maxPorts_get, None)  # type: ignore[misc]


def test_new_alone_allocates_no_record() -> None:
    bare = vs.VSInfo.__new__(vs.VSInfo)
    assert not hasattr(bare, "this")
    with pytest.raises(TypeError, match="^neither a pointer object nor a record$"):
        bare.mtu = 1
    bare.this = flat.new_VSInfo()
    bare.mtu = 7
    assert bare.mtu == 7 and bare.this.own()


def test_this_is_no_part_of_the_dictionary() -> None:
    record = vs.VSInfo()
    assert vars(record) == {}
    record.__dict__.clear()
    record.mtu = 5
    assert flat.VSInfo_mtu_get(record) == 5


def test_a_class_of_the_callers_own() -> None:
    class Mine(vs.VSInfo):
        def __init__(self, mtu: int) -> None:
            super().__init__()
            self.mtu = mtu

    class Guarded(vs.VSInfo):
        def __setattr__(self, name: str, value: Any) -> None:
            super().__setattr__(name, value + 1)

    mine, guarded = Mine(1500), Guarded()
    guarded.mtu = 1
    assert (mine.mtu, guarded.mtu) == (1500, 2)
    with pytest.raises(AttributeError, match="^Mine has no field 'other'$"):
        setattr(mine, "other", 1)
    with pytest.raises(TypeError, match="^this Mine has its memory already$"):
        mine.__init__(5)  # type: ignore[misc]


def test_weak_references_end_with_the_record() -> None:
    record = vs.VSInfo()
    seen: List[object] = []
    reference = weakref.ref(record, seen.append)
    assert reference() is record
    del record
    assert reference() is None and seen == [reference]


def test_a_cycle_is_collected() -> None:
    record = vs.VSPortInfo()
    record.__dict__["itself"] = record
    reference = weakref.ref(record)
    del record
    gc.collect()
    assert reference() is None


def test_references_are_as_before() -> None:
    class Value(int):
        pass

    value, record = Value(5), vs.VSInfo()
    counted = (value, record, record.this, flat.VSInfo_mtu_get, flat.VSInfo_mtu_set)
    before = [sys.getrefcount(one) for one in counted]
    for _ in range(100):
        record.mtu = value
        record.mtu
        for attribute, wrong in (("mtu", "x"), ("mut", 5), ("this", 5)):
            with pytest.raises((TypeError, AttributeError)):
                setattr(record, attribute, wrong)
        with pytest.raises(TypeError):
            record.__init__()  # type: ignore[misc]
    assert [sys.getrefcount(one) for one in counted] == before


def test_a_pointer_object_that_somebody_has_keeps_the_record() -> None:
    record: Any = vs.VSInfo(mtu=9)
    pointer = record.this
    del record
    assert flat.VSInfo_mtu_get(pointer) == 9 and pointer.own()


def test_an_error_that_waits_is_not_lost_at_the_end_of_a_record() -> None:
    def fails() -> None:
        record = vs.VSInfo()
        record.mtu = 1
        raise LookupError("waits")

    with pytest.raises(LookupError, match="^waits$"):
        fails()
