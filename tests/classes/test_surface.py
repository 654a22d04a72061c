"""Every record is a class with its properties and methods, every call a function."""

import inspect
from typing import Any, List, Set, Tuple

import _libvswitch
import functions
import libvswitch as vs
import pytest
import records

RECORDS = records.read()
FUNCTIONS = functions.read()
FIELDS = [(record.name, field) for record in RECORDS.values() for field in record.fields]
# Constructors that take a size.
SIZED = {"VSUplinks", "VSUplinkPorts", "VSUplinkPortIds", "VSRuntimeOptions"}


def make(name: str) -> Any:
    return getattr(vs, name)(64) if name in SIZED else getattr(vs, name)()


def methods() -> List[Tuple[str, str]]:
    """Records and their methods; the functions of arrays are none."""
    found = []
    for function in FUNCTIONS:
        owners = [name for name in RECORDS if function.name.startswith(f"{name}_")]
        if function.kind == "method" and owners:
            owner = max(owners, key=len)
            found.append((owner, function.name[len(owner) + 1 :]))
    assert len(found) == 38
    return found


def test_every_record_is_a_class() -> None:
    assert len(RECORDS) == 89
    classes = {name for name in vs.__all__ if isinstance(getattr(vs, name), type)}
    assert set(RECORDS) <= classes
    beyond = {"Array", "Callback", "Cell", "Pointer", "Record", "Table", "owned"}
    assert classes - set(RECORDS) == beyond


@pytest.mark.parametrize("name", RECORDS)
def test_a_record_can_be_made_and_printed(name: str) -> None:
    record = make(name)
    assert record.thisown
    assert isinstance(record, vs.Record)
    if name != "qex_Name":
        assert repr(record).startswith(f"{name}(")


@pytest.mark.parametrize("name, field", FIELDS, ids=[f"{n}.{f.name}" for n, f in FIELDS])
def test_every_field_is_a_property(name: str, field: Any) -> None:
    record = make(name)
    member = inspect.getattr_static(type(record), field.name)
    assert isinstance(member, property)
    assert (member.fset is not None) == field.writable
    getattr(record, field.name)


def simple() -> List[Tuple[str, Any]]:
    return [(name, field) for name, field in FIELDS if field.writable and field.kind == "plain"]


@pytest.mark.parametrize("name, field", simple(), ids=[f"{n}.{f.name}" for n, f in simple()])
def test_a_number_reads_as_it_was_written(name: str, field: Any) -> None:
    record = make(name)
    setattr(record, field.name, 42)
    assert getattr(record, field.name) == 42
    # And it is the same memory that the flat reader sees.
    assert getattr(_libvswitch, f"{name}_{field.name}_get")(record) == 42


@pytest.mark.parametrize("owner, method", methods())
def test_every_method_is_there(owner: str, method: str) -> None:
    assert callable(getattr(getattr(vs, owner), method))


@pytest.mark.parametrize(
    "name", sorted({one.name for one in FUNCTIONS if one.kind in ("call", "helper")})
)
def test_every_call_is_a_function(name: str) -> None:
    assert inspect.isfunction(getattr(vs, name))


def test_array_functions_are_functions() -> None:
    ranges = vs.new_vidrangeArray(2)
    one = vs.qex_NEBPortVIDRange()
    one.minVID, one.maxVID = 10, 20
    vs.vidrangeArray_setitem(ranges, 1, one)
    assert vs.vidrangeArray_getitem(ranges, 1).maxVID == ranges[1].maxVID == 20
    with pytest.raises(IndexError):
        vs.vidrangeArray_getitem(ranges, 2)
    with pytest.raises(IndexError):
        vs.vidrangeArray_setitem(ranges, 2, one)
    vs.delete_vidrangeArray(ranges)
    with pytest.raises(ValueError):
        ranges[0]


def test_constants_are_those_of_the_flat_module() -> None:
    text = (records.TABLE.parent / "constants.txt").read_text(encoding="ascii")
    names = [line.split(" = ")[0] for line in text.splitlines() if " = " in line[:80]]
    names = [name for name in names if name.isidentifier()]
    assert len(names) == 919
    assert [name for name in names if getattr(vs, name) != getattr(_libvswitch, name)] == []


def test_nothing_else_is_public() -> None:
    named: Set[str] = {one.name for one in FUNCTIONS} | set(RECORDS) | set(dir(_libvswitch))
    beyond = {"Array", "Callback", "Cell", "Pointer", "Record", "Table", "owned"}
    assert set(vs.__all__) - named == beyond


def test_records_and_calls_are_documented() -> None:
    undocumented = [name for name in RECORDS if not getattr(vs, name).__doc__]
    calls = [one.name for one in FUNCTIONS if one.kind == "call"]
    undocumented += [name for name in calls if not getattr(vs, name).__doc__]
    assert undocumented == []
    assert "1,280 to 9,190 bytes" in (vs.VSDVS_SetMTU.__doc__ or "")
    assert not _libvswitch.VSDVS_SetMTU.__doc__
