"""The rules of record accessors, each over every record and field that it holds for."""

import ctypes
import subprocess
import sys
from typing import Any, Iterator, List, Optional, Tuple

import pytest

import _libvswitch as vs
import fields
import native
import peer
import records
import reports
import scalars
from fields import Case, each, of_kind

DEBUG_INTERPRETER = hasattr(sys, "gettotalrefcount")

RECORDS = list(fields.RECORDS.values())
each_record = pytest.mark.parametrize("record", RECORDS, ids=[record.name for record in RECORDS])


@pytest.fixture
def made(case: Case) -> Iterator[Any]:
    """A zero-filled record of the case's type."""
    record = fields.make(case.record)
    yield record
    fields.delete(case.record, record)


def size_of(case: Case) -> int:
    return case.record.size


def contents(case: Case, made: Any) -> bytes:
    return native.read(made, case.record.size)


def pointer(data: Any, spelling: str) -> Any:
    return peer.pointer_object(ctypes.addressof(data), spelling)


# Constructors and destructors


@each_record
def test_a_fresh_record_is_owned_and_all_zero(record: records.Record) -> None:
    if record.name in fields.SIZED:
        made = getattr(vs, f"new_{record.name}")(record.size)
    else:
        made = getattr(vs, f"new_{record.name}")()
        assert native.read(made, record.size) == bytes(record.size)
    assert made.own()
    assert f"'{record.spelled} *'" in repr(made)
    assert getattr(vs, f"delete_{record.name}")(made) is None
    assert not made.own()


@each_record
def test_deleting_nothing_is_allowed(record: records.Record) -> None:
    assert getattr(vs, f"delete_{record.name}")(None) is None


def test_deleting_frees_what_python_does_not_own() -> None:
    made = vs.new_VSInfo()
    again = peer.pointer_object(int(made), "VSInfo *")
    assert not again.own()
    made.disown()
    assert vs.delete_VSInfo(again) is None


def test_an_owned_record_without_a_registered_class_leaves_a_notice() -> None:
    program = "import _libvswitch as vs; vs.new_VSStats(); vs.new_qex_String()"
    done = subprocess.run([sys.executable, "-c", program], capture_output=True, text=True)
    assert done.stdout == "".join(
        f"swig/python detected a memory leak of type '{name} *', no destructor found.\n"
        for name in ("struct VSStats", "qex_String")
    )


# Readers


@each(fields.ALL)
def test_fresh_fields_read_as_nothing(case: Case, made: Any) -> None:
    field, value = case.field, case.get(made)
    if field.kind in ("plain", "bits"):
        # Sized records keep their size in a field.
        assert value == 0
    elif field.kind == "bool":
        assert value == "\0"
    elif field.kind == "text":
        assert value == ""
    elif field.kind == "mac":
        assert value == "00:00:00:00:00:00"
    elif field.kind == "pointer":
        assert value is None
    else:
        assert int(value) == int(made) + field.offset
        assert not value.own()


@each(fields.ALL)
def test_reading_no_record_is_refused(case: Case) -> None:
    text = reports.null_argument(case.reader, 1, case.pointer)
    reports.raises(ValueError, text, case.get, None)


@each(fields.ALL)
def test_reading_a_record_of_another_type_is_refused(case: Case, info: Any, name: Any) -> None:
    other = name if case.record.name == "VSInfo" else info
    text = reports.argument(case.reader, 1, case.pointer)
    reports.raises(TypeError, text, case.get, other)
    reports.raises(TypeError, text, case.get, 1)


@each(fields.writable())
def test_writing_to_no_record_stores_nothing(case: Case) -> None:
    assert case.set(None, fields.valid_value(case)) is None


@each(fields.writable())
def test_writing_to_a_record_of_another_type_is_refused(case: Case, info: Any, name: Any) -> None:
    other = name if case.record.name == "VSInfo" else info
    text = reports.argument(case.writer, 1, case.pointer)
    reports.raises(TypeError, text, case.set, other, fields.valid_value(case))


@each(fields.ALL)
def test_a_field_has_a_writer_unless_it_is_read_only(case: Case) -> None:
    assert hasattr(vs, case.writer) == case.field.writable


# Plain integers


def overflow(case: Case) -> Any:
    """The error for a value that is just out of range."""
    return TypeError if scalars.BOUNDS[case.field.type] == scalars.UNSIGNED_64 else OverflowError


@each(of_kind("plain"))
def test_plain_fields_take_their_whole_range(case: Case, made: Any) -> None:
    field = case.field
    low, high = scalars.BOUNDS[field.type]
    for value in (high, low, 1, True):
        assert case.set(made, value) is None
        assert case.get(made) == int(value)
        assert type(case.get(made)) is int
        expected = bytearray(size_of(case))
        if field.name in ("totalLength", "nUplinkPorts", "numEntries"):
            expected = bytearray(contents(case, made))
        stored = (int(value) & (2 ** (8 * field.width) - 1)).to_bytes(field.width, sys.byteorder)
        expected[field.offset : field.offset + field.width] = stored
        assert contents(case, made) == bytes(expected)


@each(of_kind("plain", "bits"))
def test_values_out_of_range_are_refused(case: Case, made: Any) -> None:
    low, high = scalars.BOUNDS[case.field.type]
    before = contents(case, made)
    text = reports.argument(case.writer, 2, case.field.type)
    reports.raises(overflow(case), text, case.set, made, high + 1)
    reports.raises(overflow(case), text, case.set, made, low - 1)
    assert contents(case, made) == before


@each(of_kind("plain", "bits"))
def test_what_is_no_integer_is_refused(case: Case, made: Any) -> None:
    before = contents(case, made)
    text = reports.argument(case.writer, 2, case.field.type)
    for value in (1.0, "1", b"1", None, [], made):
        reports.raises(TypeError, text, case.set, made, value)
    if scalars.BOUNDS[case.field.type] != scalars.SIGNED_32:
        reports.raises(TypeError, text, case.set, made, 2**64)
        reports.raises(TypeError, text, case.set, made, -(2**63) - 1)
    assert contents(case, made) == before


@each(case for case in of_kind("plain") if scalars.BOUNDS[case.field.type] == scalars.SIGNED_32)
def test_beyond_64_bits_minus_one_is_stored_and_the_error_follows(case: Case, made: Any) -> None:
    if DEBUG_INTERPRETER:
        expect_that_a_child_aborts(case)
        return
    with pytest.raises(SystemError) as caught:
        case.set(made, 2**63)
    assert isinstance(caught.value.__cause__, OverflowError)
    assert case.get(made) == -1


def expect_that_a_child_aborts(case: Case) -> None:
    """To a debug interpreter a result with an error pending is fatal."""
    program = f"import _libvswitch as vs; vs.{case.writer}(vs.new_{case.record.name}(), 2**63)"
    done = subprocess.run([sys.executable, "-c", program], capture_output=True, text=True)
    assert done.returncode == -6
    assert "returned a result with an exception set" in done.stderr


# One-byte booleans


@each(of_kind("bool"))
def test_booleans_take_a_byte_of_text_or_an_integer(case: Case, made: Any) -> None:
    for value, read in (("a", "a"), ("", "\0"), (127, "\x7f"), (0, "\0"), (True, "\1"), ("1", "1")):
        assert case.set(made, value) is None
        assert case.get(made) == read
    case.set(made, -128)
    assert case.get(made) == "\udc80"
    assert native.read(made, 1, case.field.offset) == b"\x80"


@each(of_kind("bool"))
def test_booleans_refuse_everything_else(case: Case, made: Any) -> None:
    text = reports.argument(case.writer, 2, "qex_Bool")
    for value in (128, -129, 200, 2**63, -(2**70)):
        reports.raises(OverflowError, text, case.set, made, value)
    for other in ("ab", "\x80", "\ud800", 1.0, None, b"a", []):
        reports.raises(TypeError, text, case.set, made, other)
    assert contents(case, made) == bytes(size_of(case))


# Bit fields


def bits_of(case: Case) -> Tuple[int, int]:
    """Where the field's bits lie in the record, taken as one little-endian number: shift, mask."""
    assert case.field.first_bit is not None and case.field.bit_count is not None
    shift = 8 * case.field.offset + case.field.first_bit
    return shift, (1 << case.field.bit_count) - 1


@each(of_kind("bits"))
def test_bit_fields_lie_where_they_must_and_leave_their_neighbours(case: Case, made: Any) -> None:
    size = size_of(case)
    shift, mask = bits_of(case)
    _, high = scalars.BOUNDS[case.field.type]
    everything = (1 << (8 * size)) - 1
    for background in (0, everything):
        for value in (0, 1, mask, mask >> 1, high & ~mask, 5):
            native.write(made, background.to_bytes(size, "little"))
            assert case.set(made, value) is None
            expected = background & ~(mask << shift) | (value & mask) << shift
            assert contents(case, made) == expected.to_bytes(size, "little")
            assert case.get(made) == value & mask


# Texts


def capacity(case: Case) -> int:
    (size,) = case.field.dimensions
    assert size is not None
    return size


@each(of_kind("text"))
def test_texts_hold_one_character_less_than_their_array(case: Case, made: Any) -> None:
    size = capacity(case)
    longest = "x" * (size - 1)
    assert case.set(made, longest) is None
    assert case.get(made) == longest
    text = reports.argument(case.writer, 2, case.field.type)
    reports.raises(TypeError, text, case.set, made, "y" * size)
    assert case.get(made) == longest


@each(of_kind("text"))
def test_texts_are_filled_with_zeros(case: Case, made: Any) -> None:
    size = capacity(case)
    native.write(made, b"\xff" * size_of(case))
    case.set(made, "ab"[: size - 1])
    expected = bytearray(b"\xff" * size_of(case))
    expected[case.field.offset : case.field.offset + size] = b"ab"[: size - 1].ljust(size, b"\0")
    assert contents(case, made) == bytes(expected)

    case.set(made, None)
    assert native.read(made, size, case.field.offset) == bytes(size)


@each(of_kind("text"))
def test_texts_without_a_terminator_read_in_full(case: Case, made: Any) -> None:
    size = capacity(case)
    native.write(made, b"\xff" * size_of(case))
    native.write(made, b"x" * size, case.field.offset)
    assert case.get(made) == "x" * size


@each(of_kind("text"))
def test_texts_refuse_everything_else(case: Case, made: Any) -> None:
    text = reports.argument(case.writer, 2, case.field.type)
    for value in (b"a", 1, 1.0, "\ud800", [], made):
        reports.raises(TypeError, text, case.set, made, value)
    assert contents(case, made) == bytes(size_of(case))


@each(case for case in of_kind("text") if capacity(case) > 4)
def test_texts_are_utf8(case: Case, made: Any) -> None:
    case.set(made, "\u00e9\u00df")
    assert native.read(made, 5, case.field.offset) == b"\xc3\xa9\xc3\x9f\0"
    assert case.get(made) == "\u00e9\u00df"
    native.write(made, b"a\xff\0", case.field.offset)
    assert case.get(made) == "a\udcff"


@each(of_kind("text"))
def test_texts_come_from_char_pointers_too(case: Case, made: Any) -> None:
    source = ctypes.create_string_buffer(b"ab"[: capacity(case) - 1])
    case.set(made, pointer(source, "char *"))
    assert case.get(made) == source.value.decode()


# Arrays


def elements(case: Case) -> int:
    """How many bytes the array's writer copies."""
    return case.field.width if case.field.kind != "flexible" else 0


@each(of_kind("array", "array2", "flexible", "mac"))
def test_arrays_are_copied_from_a_pointer(case: Case, made: Any) -> None:
    size, offset = elements(case), case.field.offset
    source = ctypes.create_string_buffer(bytes(1 + i % 255 for i in range(size + 8)))
    given = pointer(source, fields.pointer_type(case))
    assert case.set(made, given) is None
    expected = bytearray(size_of(case))
    expected[offset : offset + size] = source.raw[:size]
    assert contents(case, made) == bytes(expected)


@each(of_kind("array", "array2", "flexible", "mac"))
def test_null_arrays_are_refused(case: Case, made: Any) -> None:
    text = reports.null_variable(case.field.name, case.field.type)
    reports.raises(ValueError, text, case.set, made, None)
    assert case.set(None, None) is None


@each(of_kind("array", "array2", "flexible", "mac"))
def test_arrays_of_another_type_are_refused(case: Case, made: Any) -> None:
    text = reports.argument(case.writer, 2, case.field.type)
    wrong = "qex_String *" if fields.pointer_type(case) != "qex_String *" else "VSInfo *"
    other = peer.pointer_object(int(made), wrong)
    for value in (other, "00:11:22:33:44:55", b"123456", 1):
        reports.raises(TypeError, text, case.set, made, value)


@each(of_kind("array", "array2", "flexible", "flexible-readonly"))
def test_arrays_read_as_views(case: Case, made: Any) -> None:
    view = case.get(made)
    assert int(view) == int(made) + case.field.offset
    again = peer.pointer_object(int(view), fields.pointer_type(case))
    assert again == view


@each(of_kind("mac"))
def test_hardware_addresses_read_as_text(case: Case, made: Any) -> None:
    native.write(made, bytes.fromhex("021122aabbcc"), case.field.offset)
    assert case.get(made) == "02:11:22:aa:bb:cc"


# Nested records


def inner(case: Case) -> Optional[records.Record]:
    return fields.RECORDS.get(case.field.type)


@each(of_kind("nested", "nested-readonly"))
def test_nested_records_read_as_views(case: Case, made: Any) -> None:
    view = case.get(made)
    assert int(view) == int(made) + case.field.offset
    assert not view.own()


@each(of_kind("nested"))
def test_writing_through_a_view_changes_the_parent(case: Case, made: Any) -> None:
    record = inner(case)
    assert record is not None
    first = next((c for c in fields.ALL if c.record is record and c.field.kind == "plain"), None)
    if first is not None:
        first.set(case.get(made), 1)
        expected = bytearray(size_of(case))
        expected[case.field.offset + first.field.offset] = 1
        assert contents(case, made) == bytes(expected)
    else:
        native.write(case.get(made), b"\1")
        assert native.read(made, 1, case.field.offset) == b"\1"


@each(of_kind("nested"))
def test_nested_records_are_copied_whole(case: Case, made: Any) -> None:
    record = inner(case)
    assert record is not None
    value = fields.make(record)
    native.write(value, b"\xa5" * record.size)
    assert case.set(made, value) is None
    assert value.own(), "the argument keeps its own copy"
    expected = bytearray(size_of(case))
    expected[case.field.offset : case.field.offset + record.size] = b"\xa5" * record.size
    assert contents(case, made) == bytes(expected)
    fields.delete(record, value)


@each(of_kind("nested"))
def test_nested_records_are_required(case: Case, made: Any) -> None:
    before = contents(case, made)
    c_type = f"{case.field.type} *"
    reports.raises(ValueError, reports.null_argument(case.writer, 2, c_type), case.set, made, None)
    text = reports.argument(case.writer, 2, c_type)
    other = peer.pointer_object(int(made), "VSVLAN *")
    for value in (other, 1, "a"):
        reports.raises(TypeError, text, case.set, made, value)
    assert contents(case, made) == before


# Pointers


@each(of_kind("pointer"))
def test_pointers_are_stored_as_they_are(case: Case, made: Any) -> None:
    target = ctypes.create_string_buffer(64)
    given = pointer(target, case.field.type)
    assert case.set(made, given) is None
    address = int.from_bytes(native.read(made, 8, case.field.offset), sys.byteorder)
    assert address == ctypes.addressof(target)
    read = case.get(made)
    assert int(read) == address
    assert not read.own()
    assert case.set(made, None) is None
    assert case.get(made) is None


@each(of_kind("pointer"))
def test_a_stored_pointer_disowns_its_memory(case: Case, made: Any) -> None:
    target = ctypes.create_string_buffer(64)
    given = pointer(target, case.field.type)
    given.acquire()
    case.set(made, given)
    assert not given.own()


@each(of_kind("pointer"))
def test_pointers_of_another_type_are_refused(case: Case, made: Any) -> None:
    text = reports.argument(case.writer, 2, case.field.type)
    values: List[Any] = [1, "a"]
    if case.field.type != "void *":
        values.append(peer.pointer_object(int(made), "VSInfo *"))
    for value in values:
        reports.raises(TypeError, text, case.set, made, value)


# Classes


@each_record
def test_registered_classes_wrap_what_readers_return(record: records.Record) -> None:
    """In a process of its own for each record: a registration lasts."""
    program = f"""
import sys
import _libvswitch as vs, peer

class Shadow:
    __swig_destroy__ = vs.delete_{record.name}

assert vs.{record.name}_swigregister(Shadow) is None
raw = vs.new_{record.name}({record.size if record.name in fields.SIZED else ""})
assert type(raw).__name__ == "SwigPyObject" and raw.own()
shadow = Shadow.__new__(Shadow)
shadow.this = raw
assert vs.delete_{record.name}(shadow) is None
assert not raw.own()
"""
    done = subprocess.run([sys.executable, "-c", program], capture_output=True, text=True)
    assert (done.stdout, done.stderr, done.returncode) == ("", "", 0)


def test_views_become_instances_of_the_registered_class() -> None:
    program = """
import _libvswitch as vs

class Name:
    __swig_destroy__ = vs.delete_qex_Name

vs.qex_Name_swigregister(Name)
signature = vs.new_qex_MgmtApiSignature()
name = vs.qex_MgmtApiSignature_name_get(signature)
assert type(name) is Name and not name.this.own()
vs.qex_Name_string_set(name, "view")
assert vs.qex_Name___repr__(vs.qex_MgmtApiSignature_name_get(signature)) == "view"
vs.delete_qex_MgmtApiSignature(signature)
raw = vs.new_qex_Name()
del raw
"""
    done = subprocess.run([sys.executable, "-c", program], capture_output=True, text=True)
    assert (done.stdout, done.stderr, done.returncode) == ("", "", 0)
