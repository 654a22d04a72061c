"""Writes the classes of libvswitch: make_classes.py TREE FILE

Each record is a class with a property for each field, over the flat readers and writers. What the
flat functions do as Python wants it, they do; the rest is written out, to be read and stepped
through.
"""

import sys
from pathlib import Path
from typing import List, Tuple

import definitions
from definitions import Definitions, Field, Function, Record, Type
from python_source import documentation, function

_HEAD = '''"""The records of the host as classes. Written by python/make_classes.py."""

import _libvswitch as flat
from libvswitch import _arrays, _by_hand, _checks, _memory, _pointers, _records
'''


def classes(known: Definitions) -> str:
    made = [_class(known, one) for one in known.records.values() if not one.is_inner]
    names = "".join(f'    "{one.name}",\n' for one in known.records.values() if not one.is_inner)
    parts = [_HEAD, f"__all__ = [\n{names}]\n", *("\n".join(["", *one, ""]) for one in made)]
    text = "\n".join(parts)
    return text.rstrip() + "\n"


def _class(known: Definitions, record: Record) -> List[str]:
    lines = [f"class {record.name}({_base(record)}):", *documentation(record.doc, "    "), ""]
    lines += [f"    {line}" for line in _facts(known, record)]
    lines += _constructor(known, record)
    apart: List[str] = []
    for field in record.fields:
        lines += _field(known, record, field)
        if field.name.startswith("__"):  # which is another name inside a class's body
            hidden = f"_{record.name.lstrip('_')}{field.name}"
            apart.append(f"{record.name}.{field.name} = {record.name}.{hidden}")
    for method in record.methods:
        if not method.is_by_hand:
            lines += _method(known, record, method)
    if any(one.name == "__getitem__" for one in record.methods) and not record.count:
        # An access by index alone would let Python iterate without an end.
        lines += ["", "    __iter__ = None"]
    lines += ["", f"    __swig_destroy__ = flat.delete_{record.name}", "", ""]
    return [*lines, *apart, f"_records.register({record.name}, flat.{record.name}_swigregister)"]


def _base(record: Record) -> str:
    if record.base:
        return f"_by_hand.{record.base}"
    return "_records.Table" if record.count else "_records.Record"


def _facts(known: Definitions, record: Record) -> List[str]:
    fields = "".join(f'\n        "{one.name}",' for one in record.fields)
    facts = [
        f'_name = "{record.name}"',
        f"_fields = ({fields}\n    )" if fields else "_fields = ()",
    ]
    alternatives = [one.name for one in record.fields if _is_alternative(record, one)]
    if alternatives:
        facts.append(f"_alternatives = {tuple(alternatives)!r}".replace("'", '"'))
    if record.count:
        facts.append(f'_elements = "{elements_of(known, record).name}"')
    for one in record.fields:
        if one.count and not alternatives:
            place = f"{record.name}_{one.name}"
            count = f"flat.{record.name}_{one.count}_get"
            facts.append(f'_trailing = ("{place}", {count}, {_size(known, one)})')
    return facts


def _is_alternative(record: Record, field: Field) -> bool:
    """Whether other fields show the same entries."""
    return field.count != "" and [one.count for one in record.fields].count(field.count) > 1


def elements_of(known: Definitions, record: Record) -> Field:
    """The array whose elements are those of a sequence."""
    for one in record.fields:
        type_ = known.resolve(one.type)
        if one.count == record.count or (type_.is_array and str(type_.count) == record.count):
            return one
    raise ValueError(f"{record.name} has no array of {record.count} elements")


def _size(known: Definitions, field: Field) -> str:
    """The bytes of an array's element."""
    inner = known.resolve(field.type).target
    return str(inner.count) if inner.is_array else f'_memory.size_of("{inner.name}")'


def _constructor(known: Definitions, record: Record) -> List[str]:
    names = [one.name for one in record.constructor]
    new = f"flat.new_{record.name}"
    if not names and any(one.is_writable for one in record.fields):
        return ["", f"    _new = {new}"]
    if not names:
        body = [f"_pointers.attach(self, {new}())"]
    elif record.count:
        body = _list_constructor(known, record, new)
    else:
        body = [
            "size = _memory.length_to_make(size)",
            f"needed = max(size, _memory.RECORD_SIZES[{record.name!r}])".replace("'", '"'),
            "# A place at the end, where no option fits, can still be looked at.",
            f"_records.attach_bytes(self, {new}(needed + 4), needed + 4)",
            f"flat.{record.name}_{record.fields[0].name}_set(self, size)",
        ]
    return ["", *function("__init__", ["self", *names], "", body, "    ")]


def _list_constructor(known: Definitions, record: Record, new: str) -> List[str]:
    array = elements_of(known, record)
    place = f'_memory.ARRAY_OFFSETS["{record.name}_{array.name}"]'
    return [
        "size = _memory.length_to_make(size)",
        f"needed = {place} + size * {_size(known, array)}",
        "# The flat constructor makes room for 32 bytes an element at the least.",
        f"_records.attach_bytes(self, {new}(max(size, -(-needed // 32))), needed)",
        f"flat.{record.name}_{record.count}_set(self, size)",
    ]


def _field(known: Definitions, record: Record, field: Field) -> List[str]:
    getter, setter = accessors(known, record, field)
    flat = f"flat.{record.name}_{field.name}"
    where = f'"{record.name}.{field.name}"'
    is_checked = setter == [f"{flat}_set(self, _checks.text({where}, value))"]
    is_plain = is_checked or setter in ([], [f"{flat}_set(self, value)"])
    if is_plain and getter == [f"return {flat}_get(self)"]:
        check = f"_checks.text, {where}" if is_checked else ""
        return ["", f"    {field.name} = {_property(flat, field, check)}"]
    lines = ["", "    @property", *function(field.name, ["self"], field.doc, getter, "    ")]
    if setter:
        lines += ["", f"    @{field.name}.setter"]
        lines += function(field.name, ["self", "value"], "", setter, "    ")
    return lines


def _property(flat: str, field: Field, check: str) -> str:
    write = f"{flat}_set" if field.is_writable else "None"
    text = "\n".join(documentation(field.doc, "        ")).strip()
    given = [f"{flat}_get", write]
    if text or check:
        given.append(text or "None")
    if not check:
        return f"_pointers.Field({', '.join(given)})"
    lines = "".join(f"\n        {one}," for one in [*given, check])
    return f"_pointers.Field({lines}\n    )"


def accessors(known: Definitions, record: Record, field: Field) -> Tuple[List[str], List[str]]:
    """The bodies of a field's reader and writer."""
    flat, where = f"flat.{record.name}_{field.name}", f'"{record.name}.{field.name}"'
    type_ = known.resolve(field.type)
    read, value = f"{flat}_get(self)", "value"
    setter = [f"{flat}_set(self, value)"]
    if field.reads_as_text:
        setter = [f"_arrays.write_address({where}, {flat}_set, self, value)"]
    elif type_.is_array and (type_.name != "char" or type_.target.is_array):
        getter = _array(known, record, field)
        setter = [f"_arrays.fill(self.{field.name}, value, {flat}_set)"]
        return getter, setter if field.is_writable else []
    elif type_.is_array:
        value = f"_checks.text({where}, value)"
    elif field.type == Type((), "qex_Bool"):
        read, value = f'{read} != "\\0"', f"_checks.truth({where}, value)"
    elif not field.type.layers and field.type.name in known.records:
        read = f"_records.place_in(self, {read})"
    if not field.reads_as_text:
        setter = [f"{flat}_set(self, {value})"]
    return [f"return {read}"], setter if field.is_writable else []


def _array(known: Definitions, record: Record, field: Field) -> List[str]:
    type_ = known.resolve(field.type)
    inner = type_.target
    flat = f"flat.{record.name}_{field.name}_get(self)"
    size = f", {inner.count}" if inner.is_array else ""
    if not field.count:
        return [f'return _arrays.in_record(self, {flat}, "{inner.name}", {type_.count}{size})']
    count = f"flat.{record.name}_{field.count}_get(self)"
    place = f'"{record.name}_{field.name}"'
    return [
        f"count = _records.counted(self, {count}, {place}, {_size(known, field)})",
        f'return _arrays.in_record(self, {flat}, "{inner.name}", count{size})',
    ]


def _sequence(known: Definitions, record: Record) -> List[str]:
    """The length and the elements of a sequence, where a flat reader has a text for each."""
    array = elements_of(known, record)
    flat = f"flat.{record.name}"
    body = [f"return {record.count}"]
    if not record.count.isdigit():
        place = f'"{record.name}_{array.name}", {_size(known, array)}'
        body = [f"return _records.counted(self, {flat}_{record.count}_get(self), {place})"]
    lines = ["", *function("__len__", ["self"], "", ["self._require()", *body], "    ")]
    body = ["for index in range(len(self)):", f"    yield {flat}___getitem__(self, index)"]
    lines += ["", *function("__iter__", ["self"], "", body, "    ")]
    body = [f"return {flat}___getitem__(self, _memory.position(index, len(self)))"]
    return [*lines, "", *function("__getitem__", ["self", "index"], "", body, "    ")]


def _is_text(known: Definitions, method: Function) -> bool:
    return known.resolve(method.result) == Type(("p",), "char")


def _method(known: Definitions, record: Record, method: Function) -> List[str]:
    names = [one.name for one in method.inputs]
    if record.count and method.name in ("__len__", "__getitem__"):
        has_texts = method.name == "__getitem__" and _is_text(known, method)
        return _sequence(known, record) if has_texts else []
    is_element_set = record.count and method.name == "__setitem__"
    if is_element_set and known.resolve(method.inputs[1].type) != Type(("p",), "char"):
        body = [f"self.{elements_of(known, record).name}[index] = {names[1]}"]
    else:
        body = _checked_method(known, record, method)
    return ["", *function(method.name, ["self", *names], "", body, "    ")]


def _checked_method(known: Definitions, record: Record, method: Function) -> List[str]:
    body, names = [], []
    for one in method.inputs:
        array = method.says("within", one.name)
        if array:
            body.append(f"{one.name} = _memory.position({one.name}, len(self.{array}))")
        elif one.python == "buffer":
            body.append(f'_checks.address("{one.name}", {one.name})')
        elif known.resolve(one.type) == Type(("p",), "char"):
            body.append(f'_checks.text("{one.name}", {one.name})')
        elif one.name == "index" and record.count and method.name == "__setitem__":
            body.append("index = _memory.position(index, len(self))")
        elif one.name == "index" and not method.result.layers and method.name == "__getitem__":
            # A record alone is an array of one; of more there is an Array.
            body.append("index = _memory.position(index, 1)")
        names.append(one.name)
    call = f"flat.{record.name}_{method.name}({', '.join(['self', *names])})"
    result = known.resolve(method.result)
    if method.name == "__repr__":
        return [f"text = {call}", 'return "<qex_Name that is gone>" if text is None else text']
    if result.is_pointer and result.name in known.records:
        call = f"_records.inner(self, {call})"
    returns = "" if result == Type((), "void") else "return "
    return [*body, f"{returns}{call}"]


def main() -> None:
    tree, written = sys.argv[1:]
    text = classes(definitions.read(Path(tree)))
    Path(written).write_text(text, encoding="ascii")


if __name__ == "__main__":
    main()
