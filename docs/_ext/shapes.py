"""Records as pictures want them: where each field lies, and of what kind it is."""

import re
from typing import List

from definitions import Definitions, Field, Record, Type
from layout import Layout
from segments import Shape


class Shapes:
    def __init__(self, known: Definitions, layout: Layout) -> None:
        self._known = known
        self._layout = layout

    def of(self, record: Record) -> List[Shape]:
        return [self._shape(record, one) for one in record.fields]

    def _shape(self, record: Record, one: Field) -> Shape:
        place = self._layout.places[record.name][one.name]
        type_ = self._known.resolve(one.type)
        count, element = "", 0
        if type_.is_array:
            element = self._size(type_.target)
            if type_.count is None:
                count = one.count or "as many as fit,"
        return Shape(one.name, one.type.spelled(), self._kind(one), place, element, count)

    def _size(self, type_: Type) -> int:
        """Bytes of an array's element."""
        if type_.is_array:
            return (type_.count or 0) * self._size(type_.target)
        if type_.is_pointer:
            return 8
        if type_.name in self._layout.sizes:
            return self._layout.sizes[type_.name]
        sizes = {"char": 1, "short": 2, "int": 4, "long": 8, "long long": 8}
        return sizes[re.sub(r"^(un)?signed ", "", type_.name)]

    def _kind(self, one: Field) -> str:
        type_ = self._known.resolve(one.type)
        if type_.is_pointer:
            return "pointer"
        if one.reads_as_text or (type_.is_array and type_.name == "char"):
            return "text"
        if type_.name in self._known.records:
            return "record"
        if type_.is_array:
            return "array"
        return "bits" if one.is_bit_field else "number"
