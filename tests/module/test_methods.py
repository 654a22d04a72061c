"""The rules of methods and helpers, each over all of them and all of their arguments."""

import struct
from typing import Any, Callable, Dict, Iterator, List, Tuple

import pytest

import _libvswitch as vs
import functions
import methods
import peer
import reports
from functions import Function

Armed = Callable[[Callable[[], Any]], bool]

MAC = "(unsigned char *mac_str, SIZE)"
TEXTS = ("char *", "char const *")
NUMBERS = ("int", "size_t")

# The name of an option, so that the function that looks for one finds it.
TEXT = "MLDVersion"

FUNCTIONS: List[Function] = [
    function
    for function in functions.read()
    if function.kind in ("method", "helper")
    or (function.kind == "constructor" and function.arguments)
    or (function.kind == "destructor" and function.name.endswith("Array"))
]

ARGUMENTS: List[Tuple[Function, int]] = [
    (function, position)
    for function in FUNCTIONS
    for position in range(1, len(function.arguments) + 1)
]

# What takes a null: there is nothing to free, and no name has no text.
NULL_IS_ACCEPTED = {
    "qex_Name___repr__",
    "free_dvmirror_session_table",
    "delete_vidrangeArray",
    "delete_pvlanmapentryArray",
}

# Arguments that nothing is done with.
IGNORED = {("VSRuntimeOptions_add_int_option", 3), ("VSRuntimeOptions_add_str_option", 3)}

# Functions that free what they are given.
FREEING = NULL_IS_ACCEPTED - {"qex_Name___repr__"}

# How to free what a function returns.
ALLOCATING: Dict[str, Any] = {
    "new_VSUplinks": vs.delete_VSUplinks,
    "new_VSRuntimeOptions": vs.delete_VSRuntimeOptions,
    "new_VSUplinkPorts": vs.delete_VSUplinkPorts,
    "new_VSUplinkPortIds": vs.delete_VSUplinkPortIds,
    "new_vidrangeArray": vs.delete_vidrangeArray,
    "new_pvlanmapentryArray": vs.delete_pvlanmapentryArray,
    "VSMACEntry___getitem__": vs.delete_VSMACEntry,
    "VSPvlanMapEntry___getitem__": vs.delete_VSPvlanMapEntry,
    "VSPortVlanPolicy_get_vid_range": vs.delete_qex_NEBPortVIDRange,
    "vidrangeArray_getitem": vs.delete_qex_NEBPortVIDRange,
    "pvlanmapentryArray_getitem": vs.delete_VSPvlanMapEntry,
    "alloc_dvmirror_session_table": vs.free_dvmirror_session_table,
}


def each(cases: List[Tuple[Function, int]]) -> Callable[[Any], Any]:
    assert cases, "a rule that holds for nothing proves nothing"
    names = [f"{function.name}-{position}" for function, position in cases]
    return pytest.mark.parametrize("function, position", cases, ids=names)


each_function = pytest.mark.parametrize(
    "function", FUNCTIONS, ids=[function.name for function in FUNCTIONS]
)


class Arguments:
    """Arguments that functions accept: records of small numbers, with one entry each."""

    def __init__(self) -> None:
        self._blocks: List[methods.Block] = []

    def of(self, function: Function) -> List[Any]:
        """Those for a call; whatever was made for another one is gone."""
        self._blocks = []
        return [self._make(c_type) for c_type in function.arguments]

    def contents(self) -> List[bytes]:
        """What the records hold now."""
        return [block.bytes for block in self._blocks]

    def _make(self, c_type: str) -> Any:
        if c_type in NUMBERS:
            return 0
        if c_type in TEXTS:
            return TEXT
        if c_type == MAC:
            return b"123456"
        pointer = c_type.replace("struct ", "").replace(" const", "")
        if not pointer.endswith("*"):
            pointer += " *"
        if pointer == "VSRuntimeOptionHeader *" and self._blocks:
            # An option lies in the list that came before it.
            return peer.pointer_object(self._blocks[0].address + 4, pointer)
        room = 4000
        first = room if pointer == "VSRuntimeOptions *" else 1
        self._blocks.append(methods.Block(pointer, struct.pack("=3I", first, 1, 1) + bytes(room)))
        return self._blocks[-1].record


@pytest.fixture
def valid() -> Arguments:
    return Arguments()


def call_with(function: Function, arguments: List[Any], position: int, value: Any) -> Any:
    arguments[position - 1] = value
    return getattr(vs, function.name)(*arguments)


def test_all_methods_are_here() -> None:
    counts: Dict[str, int] = {}
    for function in FUNCTIONS:
        counts[function.kind] = counts.get(function.kind, 0) + 1
    assert counts == {"method": 44, "helper": 3, "constructor": 6, "destructor": 2}


# Conversions


def refused(c_type: str, info: Any) -> Iterator[Tuple[Any, Any]]:
    """Values that an argument refuses, each with its error."""
    for value in (1.0, b"1", [], (), object(), info):
        if not (c_type == MAC and isinstance(value, bytes)):
            yield TypeError, value
    if c_type in NUMBERS:
        yield TypeError, "1"
        yield TypeError, None
    else:
        yield TypeError, 1
        yield TypeError, True
        yield TypeError, "\ud800" if c_type in TEXTS else "1"
    if c_type == "int":
        for number in (2**31, -(2**31) - 1, 2**63 - 1, -(2**63)):
            yield OverflowError, number
    if c_type == "size_t":
        yield OverflowError, -1
        yield OverflowError, -(2**63)
        yield TypeError, -(2**63) - 1
        yield TypeError, 2**64
    if c_type == MAC:
        yield TypeError, None
        yield TypeError, "00:11:22:33:44:55"
        yield TypeError, memoryview(b"0.1.2.3.4.5.")[::2]


@each(ARGUMENTS)
def test_an_argument_of_another_type_is_refused(
    function: Function, position: int, valid: Arguments, armed: Armed, info: Any
) -> None:
    c_type = function.arguments[position - 1]
    text = reports.argument(function.name, position, c_type)
    for error, value in refused(c_type, info):
        arguments = valid.of(function)
        assert not armed(
            lambda: reports.raises(error, text, call_with, function, arguments, position, value)
        )


# Functions to which -1 does no harm, and what they print for it.
TAKING_MINUS_ONE = {
    "new_VSUplinks": "",
    "new_VSUplinkPorts": "",
    "new_VSUplinkPortIds": "",
    "new_VSRuntimeOptions": "",
    "VSPromiscSessionActiveDsts___getitem__": methods.NOTICE,
    "DVMirrorSessionTable___getitem__": methods.NOTICE,
}


@pytest.mark.parametrize("number", [2**63, -(2**63) - 1])
@pytest.mark.parametrize("name", TAKING_MINUS_ONE)
def test_beyond_64_bits_the_call_is_made_with_minus_one_and_the_error_follows(
    capfd: Any, name: str, number: int, valid: Arguments
) -> None:
    if methods.DEBUG_INTERPRETER:
        record = f"vs.new_{name.split('___')[0]}(), " if "___" in name else ""
        program = f"import _libvswitch as vs; vs.{name}({record}{number})"
        methods.aborts(program, "returned a result with an exception set")
        return
    (function,) = [function for function in FUNCTIONS if function.name == name]
    position = len(function.arguments)

    def failure() -> Any:
        with pytest.raises(SystemError) as caught:
            call_with(function, valid.of(function), position, number)
        return type(caught.value.__cause__)

    assert methods.said(capfd, failure) == (OverflowError, TAKING_MINUS_ONE[name])


# Nulls


@each(
    [
        (function, position)
        for function, position in ARGUMENTS
        if function.arguments[position - 1] not in (*NUMBERS, MAC)
        and function.name not in NULL_IS_ACCEPTED
        and (function.name, position) not in IGNORED
    ]
)
def test_a_null_is_refused(
    function: Function, position: int, valid: Arguments, armed: Armed
) -> None:
    c_type = function.arguments[position - 1]
    text = reports.null_argument(function.name, position, c_type)
    arguments = valid.of(function)
    assert not armed(
        lambda: reports.raises(ValueError, text, call_with, function, arguments, position, None)
    )


@pytest.mark.parametrize("name", sorted(NULL_IS_ACCEPTED))
def test_a_null_is_accepted_where_there_is_nothing_to_do(name: str) -> None:
    assert getattr(vs, name)(None) is None


@each([case for case in ARGUMENTS if (case[0].name, case[1]) in IGNORED])
def test_an_argument_that_is_ignored_may_be_null(
    function: Function, position: int, valid: Arguments
) -> None:
    outcomes = []
    for given in (TEXT, None):
        arguments = valid.of(function)
        result = call_with(function, arguments, position, given)
        outcomes.append((type(result), valid.contents()))
    assert outcomes[0] == outcomes[1]


# The call trap


@each_function
def test_every_method_arms_the_trap(function: Function, valid: Arguments, armed: Armed) -> None:
    arguments = [None] if function.name in FREEING else valid.of(function)
    results = []
    assert armed(lambda: results.append(getattr(vs, function.name)(*arguments)))
    if function.name in ALLOCATING:
        ALLOCATING[function.name](results[0])


# Text arguments


@each([case for case in ARGUMENTS if case[0].arguments[case[1] - 1] in TEXTS])
def test_a_text_may_come_from_a_char_pointer(
    function: Function, position: int, valid: Arguments
) -> None:
    block = methods.Block("char *", TEXT.encode() + b"\0")
    outcomes = []
    for given in (TEXT, block.record):
        arguments = valid.of(function)
        before = valid.contents()
        result = call_with(function, arguments, position, given)
        assert valid.contents() != before or result == vs.VS_RT_OPT_MLD_VERSION
        outcomes.append(valid.contents())
    assert outcomes[0] == outcomes[1]
    assert block.bytes == TEXT.encode() + b"\0"
