"""The module of checked calls: each a function that returns its outputs, or raises."""

import re
from typing import Iterable, List, Tuple

import families
from call_model import Argument, Call, Direction, Ownership
from checked_values import NAMES_ALONE, PACKED, PLAIN, value_of
from definitions import Definitions, Type
from stub_text import doc

HANDLES = ("DVSwitchHandle", "DVSPortHandle")

# Calls whose success ends the handles that there are.
_RESETS = {
    "DVSState_ConfigDeserialize",
    "DVSState_ConfigReset",
    "DVSQEX_StateCleanup",
    "DVSQEX_StateInit",
}

# The flat module discards what these write; another call has the same outputs.
_ASKED_ELSEWHERE = {
    "DVSAliasToSwitchId": "DVS_SwitchId({state}DVSState_SwitchFindByAlias({given}))",
    "DVSPortsetNameToAlias": "VSDVS_GetAliasFromPortset({given})[1]",
}

# Texts of handles that may be null although the handle is not.
_MAY_LACK = {"DVS_SwitchName", "DVS_PortAlias", "QEX_ReturnStatusToString"}

# The output and the type of what each walk reaches.
_REACHED = {
    "DVSState_SwitchForEach": "DVSwitchHandle",
    "DVSState_PortForEach": "DVSPortHandle",
}

_HEAD = '''"""The calls of the host as functions that return their outputs alone, or raise.

A status that is not QEX_OK is a HostError. Outputs are results, a named tuple where there are
several; what the host allocates is a frozen value, and released before the call returns or raises.
Arrays are sequences, which have their lengths; walks are iterators. Written by
python/make_checked.py.

    >>> from libvswitch import checked
    >>> checked.VSDVS_GetMTU("lab")
    9000
"""

from __future__ import annotations

import typing
from typing import TYPE_CHECKING, Optional, Tuple, Union

import _libvswitch as _flat
import libvswitch as _vs
from libvswitch import _checking, enums as _enums
from libvswitch._checking import (
    DVSDataHandle as DVSDataHandle,
    DVSDataItem as DVSDataItem,
    DVSPortHandle as DVSPortHandle,
    DVSwitchHandle as DVSwitchHandle,
    failure as _failure,
    read_and_release as _read_and_release,
)
from libvswitch.errors import (
%s)

if TYPE_CHECKING:
    import _libvswitch
%s    from libvswitch.values import (
%s    )
'''

_TAIL = """

# A type checker that saw this would let every name pass.
if not TYPE_CHECKING:

    def __getattr__(name: str) -> object:
        # Values are made when somebody wants them.
        if name in _enums.__all__:
            found: object = getattr(_enums, name)
        elif name in _VALUES:
            from libvswitch import values

            found = getattr(values, name)
        else:
            raise AttributeError(f"module {__name__!r} has no attribute {name!r}")
        globals()[name] = found
        return found
"""

_IMPORT = ["from libvswitch import values as _values", ""]

_PACKED_IMPORT = ["from libvswitch import _packed_values as _packed", ""]

# Of what may be null, where nothing follows it.
_DEFAULTS = {"Optional": " = None", "typing.Iterable": " = ()", "bytes": ' = b""'}

_WIDTH = 100

_ERRORS = (
    "BadParameter Busy Disconnected Exists HostError LimitExceeded NoUplink NotFound NotRestored "
    "NotSupported RolledBack Trapped"
).split()


def module(known: Definitions, calls: List[Call]) -> str:
    values = sorted([*PACKED, *PLAIN])
    enums = sorted([one.name for one in families.FAMILIES] + ["Status"])
    errors = "".join(f"    {one} as {one},\n" for one in _ERRORS)
    taken = "".join(f"        {one} as {one},\n" for one in values)
    taken_enums = "    from libvswitch.enums import (\n"
    taken_enums += "".join(f"        {one} as {one},\n" for one in enums) + "    )\n"
    names = [*_ERRORS, *values, *enums, "DVSDataHandle", "DVSDataItem", *HANDLES]
    writers = [_Writer(known, call) for call in calls]
    results = [one.named_tuple() for one in writers]
    names += [call.name for call in calls]
    names += [one.result_name for one in writers if one.named_tuple()]
    listed = "".join(f'    "{one}",\n' for one in sorted(names))
    lazy = "".join(f'    "{one}",\n' for one in values)
    text = _HEAD % (errors, taken_enums, taken)
    text += f"\n__all__ = [\n{listed}]\n\n_VALUES = (\n{lazy})\n"
    text += "".join(results)
    text += "".join(f"\n\n{one.function()}\n" for one in writers)
    return text + _TAIL


def indented(lines: Iterable[str]) -> List[str]:
    return [f"    {line}" if line else "" for line in lines]


def wrapped(head: str, items: Iterable[str], tail: str = "", inside: int = 8) -> List[str]:
    """A call or a list of parameters, in one line if that is short enough."""
    listed = list(items)
    line = f"{head}({', '.join(listed)}){tail}"
    if len(line) + inside <= _WIDTH:
        return [line]
    return [f"{head}(", *(f"    {one}," for one in listed), f"){tail}"]


def _tuple(items: List[str]) -> List[str]:
    return [f"({items[0]},),"] if len(items) == 1 else wrapped("", items, ",")


class _Writer:
    """One call."""

    def __init__(self, known: Definitions, call: Call) -> None:
        self._known = known
        self._call = call
        self._is_walk = any(one.name == "callback" for one in call.arguments)
        self._lengths = {
            one.length.of: one.name for one in call.arguments if one.length and self._counts(one)
        }
        self._given = [one for one in call.inputs if self._is_given(one)]
        self.result_name = f"{call.name}Result"

    def _counts(self, one: Argument) -> bool:
        """Whether an argument stands for nothing but its length."""
        names = {two.name for two in self._call.arguments}
        return one.length is not None and one.length.of in names and one.length.unit.name != "FORM"

    def _is_given(self, one: Argument) -> bool:
        is_of_a_walk = self._is_walk and one.name in ("callback", "context")
        return one.name not in self._lengths and not is_of_a_walk

    # The signature

    def _type(self, one: Argument) -> str:
        """What the caller gives."""
        plain = self._plain_type(one)
        if one.name in ("alloc", "release") or (one.is_nullable and plain == "str"):
            return f"Optional[{plain}]"
        return plain

    def _plain_type(self, one: Argument) -> str:
        type_, name = self._known.resolve(one.type), one.type.name
        if self._call.releases is not None:
            handle = "DVSDataHandle, " if name == "DVSDataHandle" else ""
            return f"Union[{handle}_libvswitch._Pointer, None]"
        if name in HANDLES or name == "DVSDataHandle":
            return name
        if name == "DVSDataItem":
            return "Union[DVSDataItem, _libvswitch._Pointer]"
        if name == "DVSData_MemAlloc":
            return "_libvswitch._VoidPointerFunction1Pointer"
        if name == "DVSData_MemFree":
            return "_libvswitch._VoidFunction1Pointer"
        if one.name == "group":
            return "Union[str, bytes]"
        if type_.name == "char" and type_.layers:
            return "str"
        if type_.name in self._known.records:
            return self._record_type(type_.name, one)
        if one.length is not None:
            is_bytes = one.length.unit.name == "BYTES"
            return "bytes" if is_bytes else "typing.Iterable[int]"
        if name == "qex_Bool":
            return "bool"
        return families.of_type(one.type) or "int"

    def _record_type(self, name: str, one: Argument) -> str:
        if name in NAMES_ALONE:
            return "typing.Iterable[str]"
        if name == "DVMirrorSessionTable":
            return "typing.Iterable[DVMirrorSession]"
        if name == "VSRuntimeOptions":
            return "typing.Iterable[VSRuntimeOption]"
        record = f"_vs.{name}"
        either = f"Union[{name}, {record}]" if name in PLAIN else record
        return f"typing.Iterable[{either}]" if one.length is not None else either

    def _parameters(self) -> List[str]:
        found: List[str] = []
        may_lack = True
        for one in reversed(self._given):
            type_ = self._type(one)
            may_lack = may_lack and one.is_nullable and self._call.releases is None
            default = _DEFAULTS.get(type_.split("[")[0], "") if may_lack else ""
            found.insert(0, f"{one.name}: {type_}{default}")
        return found

    def _outputs(self) -> List[Argument]:
        return [one for one in self._call.outputs if one.name not in self._lengths]

    def _output_type(self, one: Argument) -> str:
        type_ = self._known.resolve(one.type)
        family = families.of_output(self._call.name, one.name)
        if family:
            return family
        target = type_.target
        if one.type.name == "DVSDataHandle":
            return "DVSDataHandle"
        if one.type.name == "DVSDataItem":
            return "DVSDataItem"
        if target.is_pointer:
            if one.length is not None and target.name in PLAIN:
                return f"Tuple[{target.name}, ...]"
            return "bytes" if target.name == "void" else value_of(target.name)[0]
        if type_.name == "char":
            return "bool" if one.type.name == "qex_Bool" else "str"
        if target.name == "qex_Name":
            return "str"
        return f"_vs.{target.name}" if target.name in self._known.records else "int"

    def result(self) -> str:
        call = self._call
        outputs = self._outputs()
        if self._is_walk:
            return f"typing.Iterator[{_REACHED.get(call.name, 'DVSDataItem')}]"
        if call.has_status or outputs:
            if not outputs:
                return "None"
            return self._output_type(outputs[0]) if len(outputs) == 1 else self.result_name
        type_ = self._known.resolve(call.result.type)
        if call.result.type.name in HANDLES:
            return f"Optional[{call.result.type.name}]"
        if type_.name == "char":
            texts = "Optional[str]" if call.name in _MAY_LACK else "str"
            return texts if type_.layers else "bool"
        return "None" if type_.name == "void" else "int"

    def named_tuple(self) -> str:
        outputs = self._outputs()
        if len(outputs) < 2:
            return ""
        lines = "".join(f"    {one.name}: {self._output_type(one)}\n" for one in outputs)
        head = f"\n\nclass {self.result_name}(typing.NamedTuple):\n"
        return f'{head}    """What {self._call.name} returns."""\n\n{lines}'

    # The body

    def function(self) -> str:
        call = self._call
        head = "\n".join(
            wrapped(f"def {call.name}", self._parameters(), f" -> {self.result()}:", inside=0)
        )
        body = [line for one in self._given for line in self._check(one)]
        if call.releases is not None:
            body = self._deallocator(call.releases)
        elif self._is_walk:
            body += self._walk()
        elif call.name in _ASKED_ELSEWHERE:
            body += self._asked_elsewhere()
        elif call.name == "DVSData_Data" or self._reads_an_item():
            body += self._of_an_item()
        elif not call.has_status:
            body += self._plain()
        elif call.allocates:
            body += self._allocating()
        else:
            body += self._filling()
        return f"{head}\n{doc(self._doc(), '    ')}" + "\n".join(indented(body))

    def _doc(self) -> str:
        """What the header says, of what the checked call takes and returns."""
        if self._is_walk:
            reached = re.search(
                r"with each (.*?)(?:,[^,]*,)? and with", self._call.doc.replace("\n", " ")
            )
            return f"Walks over each {reached[1] if reached else 'of them'}."
        head, *items = re.split(r"^(?=@)", self._call.doc, flags=re.M)
        names = {one.name for one in self._given}
        kept = [one for one in items if one.split()[1] in names]
        outputs = [f"`{one.name}`" for one in self._outputs()]
        if outputs:
            kept.append(f"@return {' and '.join(outputs)}")
        text = head.rstrip() + "\n\n" + "".join(f"{one.rstrip()}\n" for one in kept)
        return text.strip()

    def _reads_an_item(self) -> bool:
        return [one.type.name for one in self._given] == ["DVSDataItem"]

    def _check(self, one: Argument) -> List[str]:
        type_, name = self._plain_type(one), one.name
        if type_ == "str":
            wrong = f'if {name}.__class__ is not str or "\\0" in {name}:'
            if one.is_nullable:
                wrong = (
                    f'if {name} is not None and ({name}.__class__ is not str or "\\0" in {name}):'
                )
            return [wrong, f'    _checking.text("{name}", {name})']
        if type_ == "bool":
            return [
                f"if {name}.__class__ is not bool:",
                f'    {name} = _checking.truth("{name}", {name})',
            ]
        if self._known.resolve(one.type) == Type((), "int"):
            return [f'_checking.integer("{name}", {name})']
        if one.type.name in HANDLES:
            return [f'{name}_held = _checking.live("{name}", {name}, {one.type.name})']
        if one.type.name == "DVSDataHandle":
            return [f'{name}_held = _checking.live_list("{name}", {name})']
        if one.name == "group":
            return ["group_held = _checking.group(mode, group)"]
        if self._is_bytes(one):
            return [f'{name}_held = _checking.Memory("{name}", {name})']
        return self._check_memory(one)

    def _check_memory(self, one: Argument) -> List[str]:
        name, target = one.name, self._known.resolve(one.type).target.name
        if target in NAMES_ALONE:
            return [f'{name}_held = _checking.names("{name}", {name}, _vs.{target})']
        if target == "DVMirrorSessionTable":
            return [*_PACKED_IMPORT, f'{name}_held = _packed.packed_sessions("{name}", {name})']
        if target == "VSRuntimeOptions":
            return [*_PACKED_IMPORT, f'{name}_held = _packed.packed_options("{name}", {name})']
        if target not in self._known.records:
            return [f'{name}_held = _checking.numbers("{name}", {name})'] if one.length else []
        if one.length is not None:
            make = {"qex_NEBPortVIDRange": "vidrange", "VSPvlanMapEntry": "pvlanmapentry"}[target]
            given = f'"{name}", {name}, _vs.new_{make}Array, _vs.{target}'
            return [f"{name}_held = _checking.records({given})"]
        if target in PLAIN:
            return [f'{name}_held = _checking.as_record("{name}", {name}, _vs.{target})']
        return [f'_checking.record("{name}", {name}, "{target}")']

    def _is_bytes(self, one: Argument) -> bool:
        return one.length is not None and one.length.unit.name == "BYTES"

    def _raise(self, problem: str, function: str = "_failure") -> List[str]:
        given = [f"{one.name}={one.name}" for one in self._given]
        problems = [problem] if problem else []
        return wrapped(f"raise {function}", [f'"{self._call.name}"', *problems, *given])

    def _caught(self) -> List[str]:
        return ["except BaseException as raised:", *indented(self._raise("raised"))]

    def _failed(self, condition: str = "status != 0") -> List[str]:
        return [f"if {condition}:", *indented(self._raise("status"))]

    def _arguments(self) -> List[str]:
        """What the flat function is called with."""
        return [
            self._argument(one)
            for one in self._call.arguments
            if not one.is_added and self._is_flat(one)
        ]

    def _is_flat(self, one: Argument) -> bool:
        return not (self._is_walk and one.name in ("callback", "context"))

    def _argument(self, one: Argument) -> str:
        name = one.name
        if name in self._lengths and one.direction is Direction.IN:
            of = self._call.argument(self._lengths[name])
            return f"{of.name}_held.length" if self._is_bytes(of) else f"len({of.name}_held or ())"
        if one.direction is Direction.OUT:
            is_record = self._known.resolve(one.type).target.name in self._known.records
            is_filled = is_record and one.value.ownership is Ownership.CALLER
            return name if is_filled else f"{name}.pointer"
        if one.type.name in (*HANDLES, "DVSDataHandle"):
            return f"{name}_held"
        if self._is_bytes(one):
            return f"{name}_held.or_null" if one.is_nullable else f"{name}_held.pointer"
        target = self._known.resolve(one.type).target.name
        is_held = one.length is not None
        is_packed = target in (*NAMES_ALONE, *PLAIN, "DVMirrorSessionTable", "VSRuntimeOptions")
        if is_held or (is_packed and self._known.resolve(one.type).is_pointer):
            return f"{name}_held"
        return name

    def _room(self) -> List[str]:
        """What the call fills."""
        found = []
        for one in self._call.outputs:
            if one.is_added:
                continue
            type_ = self._known.resolve(one.type)
            target = type_.target
            if target.is_pointer:
                found.append(f'{one.name} = _checking.Place("{target.spelled()}")')
            elif target.name in self._known.records:
                found.append(f"{one.name} = _vs.{target.name}()")
            else:
                found.append(f'{one.name} = _checking.Number("{type_.spelled()}")')
        return found

    def _filling(self) -> List[str]:
        """A call that allocates nothing."""
        call, outputs = self._call, self._outputs()
        added = [one for one in outputs if one.is_added]
        targets = ", ".join(["status", *(one.name for one in added)])
        flat = wrapped(f"{targets} = _flat.{call.name}", self._arguments())
        body = [*self._room(), "try:", *indented(flat), *self._caught()]
        if call.name == "VSDVS_AppendDVMirrorSessions":
            body += ["finally:", "    _vs.free_dvmirror_session_table(table_held)"]
        body += self._failed()
        if call.name in _RESETS:
            body.append("_checking.state_was_reset()")
        if outputs:
            (one,) = outputs
            body.append(f"return {self._filled(one)}")
        return body

    def _filled(self, one: Argument) -> str:
        name, kind = one.name, self._output_type(one)
        if not one.is_added:
            if kind == "DVSDataItem":
                return f"_checking.item_at({name}.pointee)"
            if kind == "str":
                return f"{name}.string"
            return name if kind.startswith("_vs.") else f"{name}.value"
        if kind == "bool":
            return f"bool({name})"
        return f"_enums.{kind}({name})" if families.of_output(self._call.name, name) else name

    def _allocating(self) -> List[str]:
        """A call whose memory is read and released."""
        call, outputs = self._call, self._outputs()
        allocated = [one for one in call.allocates]
        listed = [*(one for one in call.outputs if one.is_added)]
        places = [
            str(1 + listed.index(one)) if one.is_added else f"{one.name}.pointer"
            for one in allocated
        ]
        read, imports = self._reader(outputs)
        deallocator = f"_flat.{allocated[0].value.deallocator}"
        if allocated[0].value.unless:
            deallocator = "list.deallocator"
        keeps = outputs[0].type.name == "DVSDataHandle"
        body = [*imports, *self._room(), "status, result = _read_and_release("]
        body += [
            f"    _flat.{call.name},",
            *indented(_tuple(self._arguments())),
            *indented(read),
            f"    {deallocator},",
            *indented(_tuple(places)),
            f"    {keeps},  # whether the outputs are kept",
            ")",
        ]
        return [*body, *self._failed(), "return result"]

    def _reader(self, outputs: List[Argument]) -> Tuple[List[str], List[str]]:
        """How the outputs are read, as one of several arguments, and what that needs."""
        first, *more = outputs
        if first.type.name == "DVSDataHandle":
            release = ", release" if self._call.name == "DVSData_Alloc" else ""
            return [f"lambda: DVSDataHandle({first.name}.address{release}),"], []
        if self._output_type(first) == "bytes" and first.length is not None:
            return [f"lambda: {first.name}.read({first.length.of}.value),"], []
        if first.length is not None and first.length.unit.name == "ELEMENTS":
            return [f"_values.read_{self._known.resolve(first.type).name}s,"], _IMPORT
        made = [self._read(one) for one in outputs]
        if more:
            given = ", ".join(one.name for one in outputs)
            return [
                *wrapped(f"lambda {given}: {self.result_name}", made, ","),
            ], _IMPORT
        if not first.is_added:
            return [f"lambda: {made[0]},"], _IMPORT
        if made[0].endswith(f"({first.name})"):
            return [f"{made[0].split('(')[0]},"], _IMPORT
        return [f"lambda {first.name}: {made[0]},"], _IMPORT

    def _read(self, one: Argument) -> str:
        record = self._known.resolve(one.type).name
        if record not in self._known.records:
            return one.name
        more = {"VSMcastFilters": ", mode", "VSMcastFilterStats": ", group_held"}.get(record, "")
        given = one.name if one.is_added else f"{one.name}.pointee"
        return f"_values.{value_of(record)[1]}({given}{more})"

    def _deallocator(self, one: Argument) -> List[str]:
        name = self._call.name
        call = f"_checking.deallocate(_vs.{name}, _flat.{name}, {one.name})"
        body = []
        if self._call.name == "DVSData_Free":
            body = [
                f"if isinstance({one.name}, DVSDataHandle):",
                f"    {one.name}.end()",
                "    return",
            ]
        return [
            *body,
            "try:",
            f"    {call}",
            "except (TypeError, ValueError):",
            "    raise",
            "except Exception as raised:",
            *indented(self._raise("raised")),
        ]

    def _walk(self) -> List[str]:
        """A walk: all that it reaches, before the first is given."""
        handles = "".join(f"{one}, " for one in self._arguments())
        take = _REACHED.get(self._call.name, "_checking.item_at")
        given = [f"_flat.{self._call.name}", f"({handles.strip()})" if handles else "()", take]
        body = wrapped("status, found = _checking.walk", given)
        return [*body, *self._failed(), "return iter(found)"]

    def _asked_elsewhere(self) -> List[str]:
        (given,) = [one.name for one in self._given]
        asked = _ASKED_ELSEWHERE[self._call.name].format(state="_flat.", given=given)
        return [
            "try:",
            f'    status = _flat.{self._call.name}({given}, "")',
            "    # The flat module discards what that writes; another call has the same outputs.",
            f"    result = _flat.{asked} if status == 0 else None",
            *self._caught(),
            *self._failed("status != 0 or result is None"),
            "return result",
        ]

    def _of_an_item(self) -> List[str]:
        """What an item holds, be it the host's own or a copy."""
        copied = {
            "DVSData_Name": "name",
            "DVSData_Data": "data",
            "DVSData_PropType": "propertyType",
        }
        return [
            "if isinstance(item, DVSDataItem):",
            f"    return item.{copied[self._call.name]}",
            "try:",
            f"    return _checking.{copied[self._call.name]}_of(item)",
            *self._caught(),
        ]

    def _plain(self) -> List[str]:
        """A call without a status."""
        call, kind = self._call, self.result()
        result = "" if kind == "None" else "result = "
        flat = wrapped(f"{result}_flat.{call.name}", self._arguments())
        body = ["try:", *indented(flat)]
        body += self._caught()
        if kind == "bool":
            body.append('return result != "\\0"')
        elif call.result.type.name in HANDLES:
            body.append(f"return None if result is None else {call.result.type.name}(result)")
        elif kind == "str":
            body += ["if result is None:", *indented(self._raise("", "_checking.nothing"))]
            body.append("return result")
        elif kind != "None":
            body.append("return result")
        return body
