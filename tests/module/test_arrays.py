"""Plain arrays of records, which a caller makes for calls that take a pointer and a count."""

from dataclasses import dataclass
from typing import Any, Callable

import pytest

import _libvswitch as vs
import methods
import native
import reports


@dataclass(frozen=True)
class Array:
    """The four helpers of an array, and its element."""

    name: str
    element: str
    size: int

    def new(self, count: Any) -> Any:
        return getattr(vs, f"new_{self.name}")(count)

    def delete(self, array: Any) -> Any:
        return getattr(vs, f"delete_{self.name}")(array)

    def get(self, array: Any, index: Any) -> Any:
        return getattr(vs, f"{self.name}_getitem")(array, index)

    def set(self, array: Any, index: Any, value: Any) -> Any:
        return getattr(vs, f"{self.name}_setitem")(array, index, value)

    @property
    def delete_element(self) -> Callable[[Any], Any]:
        delete: Callable[[Any], Any] = getattr(vs, f"delete_{self.element}")
        return delete

    def distinct(self, count: int) -> bytes:
        """As many elements, no two of their bytes alike."""
        return bytes(range(1, count * self.size + 1))


ARRAYS = [
    Array("vidrangeArray", "qex_NEBPortVIDRange", 4),
    Array("pvlanmapentryArray", "VSPvlanMapEntry", 8),
]


@pytest.fixture(params=ARRAYS, ids=[array.name for array in ARRAYS])
def array(request: Any) -> Array:
    found: Array = request.param
    return found


def test_an_array_has_room_for_its_elements_and_is_not_filled(array: Array) -> None:
    count = 500
    size = count * array.size
    with methods.fresh_memory_is_not_zero() as contents:
        expected = contents(size)
        with methods.owned(array.new(count), array.delete) as made:
            assert f"{array.element} *'" in repr(made)
            assert size <= methods.usable_size(made) < size + methods.ROUNDING
            assert native.read(made, size) == expected


def test_an_array_may_be_empty(array: Array) -> None:
    with methods.owned(array.new(0), array.delete):
        pass


def test_an_array_that_memory_cannot_hold_is_none(array: Array) -> None:
    # The last ones have a size in bytes that 64 bits cannot hold.
    for count in (2**60, 2**61 + 1, 2**62 + 1, 2**63, 2**64 - 1):
        assert array.new(count) is None


def test_elements_are_copied_into_the_array(array: Array) -> None:
    block = methods.Block(f"{array.element} *", bytes(6 * array.size))
    value = methods.Block(f"{array.element} *", array.distinct(1))
    expected = block.bytes
    for index in (1, 5, 0):
        assert array.set(block.record, index, value.record) is None
        expected = methods.patched(expected, index * array.size, array.distinct(1))
        assert block.bytes == expected
    assert value.bytes == array.distinct(1)


def test_elements_are_read_as_copies_that_python_owns(array: Array) -> None:
    block = methods.Block(f"{array.element} *", array.distinct(6))
    for index in (0, 1, 5):
        with methods.owned(array.get(block.record, index), array.delete_element) as copy:
            assert f"{array.element} *'" in repr(copy)
            first = index * array.size
            assert native.read(copy, array.size) == array.distinct(6)[first : first + array.size]
            native.write(copy, bytes(array.size))
    assert block.bytes == array.distinct(6)


def test_elements_past_the_end_are_read_without_a_check(capfd: Any, array: Array) -> None:
    two_of_six = methods.Block(f"{array.element} *", array.distinct(6))
    copy, out = methods.said(capfd, array.get, two_of_six.record, 5)
    with methods.owned(copy, array.delete_element):
        assert native.read(copy, array.size) == array.distinct(6)[-array.size :]
    assert out == ""


def test_an_element_may_be_written_over_itself(array: Array) -> None:
    block = methods.Block(f"{array.element} *", array.distinct(2))
    array.set(block.record, 0, block.record)
    assert block.bytes == array.distinct(2)


def test_an_array_is_filled_and_read_through_the_fields_of_its_elements() -> None:
    with methods.owned(vs.new_vidrangeArray(2), vs.delete_vidrangeArray) as ranges:
        with methods.owned(vs.new_qex_NEBPortVIDRange(), vs.delete_qex_NEBPortVIDRange) as value:
            for index, (low, high) in enumerate([(10, 20), (100, 4094)]):
                vs.qex_NEBPortVIDRange_minVID_set(value, low)
                vs.qex_NEBPortVIDRange_maxVID_set(value, high)
                vs.vidrangeArray_setitem(ranges, index, value)
        assert native.read(ranges, 8) == b"\x0a\0\x14\0\x64\0\xfe\x0f"
        copy = vs.vidrangeArray_getitem(ranges, 1)
        with methods.owned(copy, vs.delete_qex_NEBPortVIDRange):
            assert vs.qex_NEBPortVIDRange_maxVID_get(copy) == 4094


def test_a_refused_index_leaves_the_array_alone(array: Array) -> None:
    block = methods.Block(f"{array.element} *", array.distinct(2))
    value = methods.Block(f"{array.element} *", bytes(array.size))
    text = reports.argument(f"{array.name}_setitem", 2, "size_t")
    reports.raises(OverflowError, text, array.set, block.record, -1, value.record)
    reports.raises(TypeError, text, array.set, block.record, 0.0, value.record)
    assert block.bytes == array.distinct(2)
