"""What the tables say of every field, in the form that parametrised tests want."""

from dataclasses import dataclass
from typing import Any, Callable, Iterable, List

import pytest

import _libvswitch as vs
import records

RECORDS = records.read()

# Constructors that take a size: how many bytes a test makes them allocate at least.
SIZED = {"VSUplinks", "VSUplinkPorts", "VSUplinkPortIds", "VSRuntimeOptions"}


@dataclass(frozen=True)
class Case:
    """A field with its record, and the functions that read and write it."""

    record: records.Record
    field: records.Field

    @property
    def reader(self) -> str:
        return f"{self.record.name}_{self.field.name}_get"

    @property
    def writer(self) -> str:
        return f"{self.record.name}_{self.field.name}_set"

    @property
    def pointer(self) -> str:
        """The record's pointer type as messages spell it."""
        return f"{self.record.spelled} *"

    def get(self, record: Any) -> Any:
        return getattr(vs, self.reader)(record)

    def set(self, record: Any, value: Any) -> Any:
        return getattr(vs, self.writer)(record, value)


ALL: List[Case] = [Case(record, field) for record in RECORDS.values() for field in record.fields]


def of_kind(*kinds: str) -> List[Case]:
    return [case for case in ALL if case.field.kind in kinds]


def writable() -> List[Case]:
    return [case for case in ALL if case.field.writable]


def each(cases: Iterable[Case]) -> Callable[[Any], Any]:
    """Parametrises a test with `case`, named after its field."""
    found = list(cases)
    assert found, "a rule that holds for nothing proves nothing"
    return pytest.mark.parametrize(
        "case", found, ids=[f"{case.record.name}.{case.field.name}" for case in found]
    )


def make(record: records.Record) -> Any:
    """A zero-filled record with trailing room for whatever a flexible array's test wants."""
    if record.name not in SIZED:
        return getattr(vs, f"new_{record.name}")()
    import native

    made = getattr(vs, f"new_{record.name}")(record.size)
    native.write(made, bytes(record.size))
    return made


def delete(record: records.Record, made: Any) -> None:
    getattr(vs, f"delete_{record.name}")(made)


def valid_value(case: Case) -> Any:
    """A value that the field's writer accepts, made without memory of its own where possible."""
    import ctypes

    import peer

    kind = case.field.kind
    if kind in ("plain", "bits"):
        return 1
    if kind in ("text", "bool"):
        return "a"
    buffer = ctypes.create_string_buffer(4096)
    pointer = peer.pointer_object(ctypes.addressof(buffer), pointer_type(case))
    _alive.append(buffer)
    return pointer


_alive: List[Any] = []


def pointer_type(case: Case) -> str:
    """The type of pointer that a field of an array, record or pointer kind takes and gives."""
    field = case.field
    if field.kind == "pointer":
        return field.type
    if len(field.dimensions) == 2:
        return f"{field.element_type} (*)[{field.dimensions[1]}]"
    return f"{field.element_type} *"
