#!/usr/bin/env python3
"""Writes the whole surface of the module as if by hand: handwritten.py OUTPUT.

Each function comes out as one would write it with the helpers of contract.h, under the same
contract as the measured module: so many functions, so much code, so many constants, and nothing of
a generator's own runtime.
"""

import json
import re
import sys
from dataclasses import dataclass, field
from pathlib import Path
from typing import Dict, Iterator, List, Optional, Tuple

import functions as surface
import headers
import records as record_table

HELPERS = ("mirror", "names", "policies", "runtime_options", "tables", "uplinks")
CONSTRUCTORS = {
    "VSUplinks": "uplinks_new",
    "VSUplinkPorts": "uplink_ports_new",
    "VSUplinkPortIds": "uplink_port_ids_new",
    "VSRuntimeOptions": "runtime_options_new",
}
UNSIGNED = {
    "unsigned char": "UCHAR_MAX",
    "unsigned short": "USHRT_MAX",
    "unsigned int": "UINT_MAX",
    "unsigned long": "ULONG_MAX",
    "unsigned long long": "ULONG_MAX",
}

RECORDS = record_table.read()
PROTOTYPES = headers.prototypes()
METHODS = headers.methods()
INTEGERS = headers.integers()


@dataclass
class Body:
    """A function as it is being put together."""

    locals: List[str] = field(default_factory=list)
    checks: List[str] = field(default_factory=list)
    arguments: List[str] = field(default_factory=list)
    cleanup: List[str] = field(default_factory=list)


class Types:
    """The types that pointer objects can have, by the C name of what they lead to."""

    def __init__(self) -> None:
        self.names: Dict[str, str] = {}

    def of(self, spelled: str) -> str:
        """The identity of what a pointer type leads to, as C has it."""
        name = re.sub(r"\b(const|struct|union)\b", "", spelled).strip()
        name = name[:-1].strip() if name.endswith("*") else name
        name = INTEGERS.get(name, name)
        if name == "char":
            return "&char_record"
        return "&" + self.names.setdefault(name, "type_" + re.sub(r"\W+", "_", name))

    def declared(self) -> Iterator[str]:
        """Their definitions."""
        for name, identity in self.names.items():
            yield f"static RecordType const {identity} = {{{json.dumps(name)}}};"


TYPES = Types()


def add_argument(body: Body, method: str, number: int, spelled: str, *, required: bool) -> None:
    """Convert an argument: its variable, its check, and how the call names it."""
    item = f"PyTuple_GET_ITEM(args, {number - 1})"
    place = f'(Place){{"{method}", {number}, {json.dumps(spelled)}}}'
    name = f"a{number}"
    array = re.fullmatch(r"char (?:const )?\[(\d+)\]", spelled)
    if array:
        body.locals.append(f"char {name}[{array[1]}];")
        body.checks.append(f"char_array_from({item}, {name}, sizeof {name}, {place})")
    elif spelled in ("char const *", "char *"):
        body.locals.append(f"Text {name} = {{NULL, NULL}};")
        body.checks.append(f"text_from({item}, &{name}, {place})")
        if required:
            body.checks.append(f"({name}.text || raise_null_reference({place}))")
        body.cleanup.append(f"free({name}.copy);")
        name += ".text"
    elif spelled == "bytes":
        body.locals.append(f"void *{name};")
        body.checks.append(f"bytes_from({item}, &{name}, {place})")
    elif spelled == "void *" or INTEGERS.get(spelled) is None and "*" not in spelled:
        body.locals.append(f"void *{name};")
        if spelled in RECORDS:
            body.checks.append(f"record_from({item}, {TYPES.of(spelled)}, &{name}, {place})")
            name = f"*({spelled} *){name}"
        else:
            body.checks.append(f"any_pointer_from({item}, &{name}, {place})")
    elif "*" in spelled:
        body.locals.append(f"void *{name};")
        check = "record_from" if required else "pointer_from"
        body.checks.append(f"{check}({item}, {TYPES.of(spelled)}, &{name}, {place})")
    else:
        add_integer(body, spelled, INTEGERS[spelled], item, name, place)
    body.arguments.append(name)


def add_integer(body: Body, spelled: str, base: str, item: str, name: str, place: str) -> None:
    """Convert an argument that is an integer."""
    if base in UNSIGNED:
        body.locals.append(f"unsigned long {name};")
        body.checks.append(f"unsigned_from({item}, {UNSIGNED[base]}, &{name}, {place})")
    elif base == "char":
        body.locals.append(f"char {name};")
        body.checks.append(f"char_from({item}, &{name}, {place})")
    elif base == "int":
        body.locals.append(f"int {name};")
        body.checks.append(f"int_from({item}, &{name}, {place})")
    else:
        raise ValueError(f"no conversion for {spelled}")


def add_array(body: Body, method: str, number: int, array: record_table.Field) -> None:
    """Convert an argument that leads to the elements of an array."""
    place = f'(Place){{"{method}", {number}, {json.dumps(array.type)}}}'
    body.locals.append(f"void *a{number};")
    body.checks.append(
        f"record_from(PyTuple_GET_ITEM(args, {number - 1}), {TYPES.of(array.element_type)},"
        f" &a{number}, {place})"
    )
    body.arguments.append(f"a{number}")


def object_of(value: str, spelled: str, *, owned: bool = False) -> str:
    """The expression that makes a Python object of a C value."""
    if spelled == "PyObject *":
        return value
    if spelled in ("char const *", "char *"):
        return f"text_or_none({value})"
    if "*" in spelled or spelled in ("DVSwitchHandle", "DVSPortHandle"):
        kind = TYPES.of(spelled if "*" in spelled else "void *")
        return f"pointer_object((void *){value}, {kind}, {'true' if owned else 'false'})"
    base = INTEGERS[spelled]
    if base == "char":
        return f"text_object(&(char){{{value}}}, 1)"
    if base.startswith("unsigned long"):
        return f"PyLong_FromUnsignedLong({value})"
    return f"PyLong_From{'Unsigned' if base.startswith('unsigned') else ''}Long({value})"


def emit(name: str, body: Body, tail: List[str], *, trapped: bool) -> Iterator[str]:
    """A function: count, convert, arm, and what is left to do."""
    count = len(body.checks) and len([c for c in body.checks if "raise_null_reference" not in c])
    yield f"static PyObject *wrap_{name}(PyObject *self, PyObject *args) {{"
    yield from (f"  {line}" for line in body.locals)
    yield "  (void)self;"
    colon = "O" * count + ":" + name
    yield f'  EXPECT_ARGUMENTS({count}, "{colon}");'
    if body.checks:
        yield f"  if (!({' && '.join(body.checks)})) {{"
        yield from (f"    {line}" for line in body.cleanup)
        yield "    return NULL;"
        yield "  }"
    if trapped:
        yield "  ARM_TRAP();"
    yield from (f"  {line}" for line in tail)
    yield "}"


def reader(record: record_table.Record, field_: record_table.Field) -> Iterator[str]:
    """The reader of a field."""
    name, kind = f"{record.name}_{field_.name}_get", field_.kind
    body = Body()
    add_argument(body, name, 1, f"{record.spelled} *", required=True)
    value = f"(({record.name} *)a1)->{field_.name}"
    if kind == "text":
        made = f"text_object({value}, strnlen({value}, sizeof {value}))"
    elif kind == "mac":
        made = f"mac_text({value})"
    elif kind.startswith(("array", "flexible")):
        made = f"pointer_object({value}, {TYPES.of(field_.element_type)}, false)"
    elif kind.startswith("nested"):
        made = f"pointer_object(&{value}, {TYPES.of(field_.type)}, false)"
    else:
        made = object_of(value, field_.type)
    return emit(name, body, [f"return {made};"], trapped=False)


def writer(record: record_table.Record, field_: record_table.Field) -> Iterator[str]:
    """The writer of a field."""
    name, kind = f"{record.name}_{field_.name}_set", field_.kind
    body = Body()
    add_argument(body, name, 1, f"{record.spelled} *", required=False)
    target = f"(({record.name} *)a1)->{field_.name}"
    if kind == "text":
        add_argument(body, name, 2, field_.type, required=False)
        store = f"memcpy({target}, a2, sizeof {target});"
    elif kind.startswith(("array", "mac", "flexible")):
        add_array(body, name, 2, field_)
        store = f"memcpy({target}, a2, {0 if kind == 'flexible' else field_.width});"
    elif kind.startswith("nested"):
        add_argument(body, name, 2, f"{field_.type} *", required=True)
        store = f"{target} = *({field_.type} *)a2;"
    else:
        add_argument(body, name, 2, field_.type, required=False)
        store = f"{target} = {body.arguments[1]};"
    return emit(name, body, [f"if (a1) {store}", "Py_RETURN_NONE;"], trapped=False)


def registration(name: str) -> Iterator[str]:
    """The function that takes a record's class."""
    yield f"static PyObject *wrap_{name}(PyObject *self, PyObject *args) {{"
    yield f'  return class_registered(self, args, "O:{name}");'
    yield "}"


def lifetime(function: surface.Function) -> Iterator[str]:
    """A constructor or a destructor."""
    body = Body()
    kind, _, record = function.name.partition("_")
    record = {"vidrangeArray": "qex_NEBPortVIDRange", "pvlanmapentryArray": "VSPvlanMapEntry"}.get(
        record, record
    )
    for number, spelled in enumerate(function.arguments, start=1):
        add_argument(body, function.name, number, spelled, required=False)
    if kind == "delete":
        body.checks[0] = body.checks[0].replace("pointer_from", "pointer_disowned")
        return emit(function.name, body, ["free(a1);", "Py_RETURN_NONE;"], trapped=True)
    make = f"calloc(1, sizeof({record}))"
    if function.arguments == ("size_t",):
        make = f"reallocarray(NULL, a1, sizeof({record}))"
    elif function.arguments:
        make = f"{CONSTRUCTORS[record]}(a1)"
    made = f"return pointer_object({make}, {TYPES.of(record)}, true);"
    return emit(function.name, body, [made], trapped=True)


def array_function(function: surface.Function) -> Iterator[str]:
    """An access to a plain array of records."""
    body = Body()
    for number, spelled in enumerate(function.arguments, start=1):
        add_argument(body, function.name, number, spelled, required=True)
    record = function.arguments[0].rstrip(" *")
    if function.name.endswith("_setitem"):
        tail = [f"(({record} *)a1)[a2] = {body.arguments[2]};", "Py_RETURN_NONE;"]
    else:
        tail = [f"return {copied(f'(({record} *)a1)[a2]', record)};"]
    return emit(function.name, body, tail, trapped=True)


def copied(value: str, record: str) -> str:
    """The expression that makes an owning object of a record's value."""
    return f"copy_object(&({record}[]){{{value}}}, sizeof({record}), {TYPES.of(record)})"


def call(
    function: surface.Function, prototype: headers.Prototype, name: str, *, required: bool
) -> Iterator[str]:
    """A call of C: the host's, a helper's, or a method's body."""
    body = Body()
    passed: List[str] = []
    outputs: List[str] = []
    left = list(function.arguments)
    number = 0
    for spelled, parameter in prototype.parameters:
        if spelled == "...":
            passed.append("NULL")
            continue
        if (spelled, parameter) == ("SIZE", "length"):
            passed.append("0")
            continue
        taken = left[0] if left else None
        if taken == "(unsigned char *mac_str, SIZE)" or taken == "bytes" and "unsigned" in spelled:
            taken, here = "bytes", spelled
        else:
            here = spelled
        if taken == "bytes" or taken is not None and same_type(taken, here):
            left.pop(0)
            number += 1
            add_argument(body, function.name, number, taken, required=required)
            passed.append(body.arguments[-1])
        else:
            output(body, spelled, len(outputs), passed, outputs, function)
    left = [spelled for spelled in left if spelled != "..."]
    if left:
        raise ValueError(f"{function.name}: {left} have no parameter")
    invoke = f"{prototype.name}({', '.join(passed)})"
    trapped = function.name != "Panic"
    return emit(
        name, body, list(result(function, prototype, invoke, outputs, body)), trapped=trapped
    )


def same_type(spelled: str, declared: str) -> bool:
    """Whether an argument's spelling and a parameter's type are one type."""
    spelled, declared = (re.sub(r"\b(struct|union) ", "", text) for text in (spelled, declared))
    return spelled == declared or (spelled, declared) == ("char [128]", "char *")


def output(
    body: Body,
    spelled: str,
    number: int,
    passed: List[str],
    outputs: List[str],
    function: surface.Function,
) -> None:
    """A parameter through which the call returns a value."""
    name = f"out{number}"
    if spelled == "char *" and "text" in function.result:
        body.locals.append(f"char {name}[130];")
        passed.append(name)
        outputs.append(f"text_or_none({name})")
    elif spelled.endswith("**"):
        kind = re.findall(r"(\w+) \*", function.result)[sum("pointer" in o for o in outputs)]
        body.locals.append(f"{spelled[:-1].strip()}{name} = NULL;")
        passed.append(f"&{name}")
        outputs.append(f"pointer_object({name}, {TYPES.of(kind)}, false)")
    else:
        body.locals.append(f"{spelled[:-1].strip()} {name} = 0;")
        passed.append(f"&{name}")
        outputs.append(f"PyLong_FromLong({name})")


def result(
    function: surface.Function,
    prototype: headers.Prototype,
    invoke: str,
    outputs: List[str],
    body: Body,
) -> Iterator[str]:
    """The lines that call and make a Python object of what comes back."""
    returned = prototype.result
    if returned == "void":
        yield f"{invoke};"
        yield from body.cleanup
        yield "Py_RETURN_NONE;"
        return
    if returned in RECORDS:
        made = copied("result", returned)
    elif outputs:
        parts = ["PyLong_FromLong(result)", *outputs]
        made = f"list_of_{'two' if len(parts) == 2 else 'three'}({', '.join(parts)})"
    elif function.result in ("status", "int"):
        made = "PyLong_FromLong(result)"
    else:
        made = object_of("result", returned)
    yield f"{returned} const result = {invoke};".replace("PyObject * const", "PyObject *")
    yield from body.cleanup
    yield f"return {made};"


def bodies() -> Iterator[str]:
    """The C functions of methods, from the binding definitions."""
    for method in METHODS.values():
        parameters = ", ".join(f"{spelled} {name}" for spelled, name in method.parameters)
        body = method.body.replace("SWIG_FromCharPtr", "text_or_none")
        yield f"static {method.result} {method.name}({parameters}) {body}"


def wrappers() -> Iterator[Tuple[str, Iterator[str]]]:
    """Every function of the surface with its source."""
    by_accessor = {
        f"{record.name}_{field_.name}_{access}": (record, field_)
        for record in RECORDS.values()
        for field_ in record.fields
        for access in ("get", "set")
    }
    forms: Dict[str, int] = {}
    for function in surface.read():
        name = function.name
        forms[name] = forms.get(name, 0) + 1
        if function.kind == "reader":
            yield name, reader(*by_accessor[name])
        elif function.kind == "writer":
            yield name, writer(*by_accessor[name])
        elif function.kind == "registration":
            yield name, registration(name)
        elif function.kind in ("constructor", "destructor"):
            yield name, lifetime(function)
        elif function.kind == "runtime":
            yield name, iter(())
        elif name in METHODS:
            yield name, call(function, METHODS[name], name, required=True)
        elif name.endswith(("_getitem", "_setitem")):
            yield name, array_function(function)
        else:
            form = name if forms[name] == 1 else f"{name}_{forms[name]}"
            yield form, call(function, PROTOTYPES[name], form, required=False)


def constants() -> Iterator[str]:
    """The table of constants."""
    for line in (headers.ROOT / "tests/surface/constants.txt").read_text().splitlines():
        match = re.fullmatch(r"(\w+) = (.+)", line)
        if match and match[2].startswith('"'):
            yield f'    {{"{match[1]}", 0, {match[2]}}},'
        elif match:
            yield f'    {{"{match[1]}", {match[2]}LL, NULL}},'


def source() -> Iterator[str]:
    """The whole extension."""
    yield '#include "contract.h"\n#include "surface.h"'
    for header in headers.includes("include"):
        yield f'#include "{header}"'
    for helper in HELPERS:
        yield f'#include "helpers/{helper}.h"'
    yield "typedef size_t SIZE;"
    emitted: List[str] = []
    names: List[str] = []
    for name, lines in wrappers():
        names.append(name)
        emitted += lines
    yield from TYPES.declared()
    yield from bodies()
    yield from emitted
    yield from overload("DVSAliasToPortsetName", names)
    yield "static PyMethodDef methods[] = {"
    yield '    {"SWIG_PyInstanceMethod_New", instance_method, METH_O, NULL},'
    for name in names:
        if name != "SWIG_PyInstanceMethod_New":
            wrapper = "wrap_DVSAliasToPortsetName_any" if name == "DVSAliasToPortsetName" else None
            yield f'    {{"{name}", {wrapper or "wrap_" + name}, METH_VARARGS, NULL}},'
    yield "    {NULL, NULL, 0, NULL},\n};"
    yield "static Constant const constants[] = {"
    yield from constants()
    yield "    {NULL, 0, NULL},\n};"
    yield "DEFINE_MODULE(handwritten_surface, methods, constants)"


def overload(name: str, names: List[str]) -> Iterator[str]:
    """The function that chooses between two forms by their number of arguments."""
    other: Optional[str] = next(form for form in names if form == f"{name}_2")
    names.remove(f"{name}_2")
    yield f"static PyObject *wrap_{name}_any(PyObject *self, PyObject *args) {{"
    yield f"  if (PyTuple_GET_SIZE(args) == 1) return wrap_{name}(self, args);"
    yield f"  if (PyTuple_GET_SIZE(args) == 2) return wrap_{other}(self, args);"
    yield f'  return no_such_form("{name}");'
    yield "}"


def main() -> None:
    """Write the source."""
    Path(sys.argv[1]).write_text("\n".join(source()) + "\n", encoding="utf-8")


if __name__ == "__main__":
    main()
