"""Calls every function in each way that Python can call, and prints what comes of it.

    calling.py [--without-vectorcall]

A line for each function and set of arguments: the result or the error, the references that its
arguments and the function itself are left with, what a profiler sees. Ways that disagree get a line
of their own that begins with "differs". Then how deep calls nest. Before all that, which functions
the interpreter calls by tuple. With the option, built-in functions do not say that they
can be called by array while the module is imported.
"""

import ctypes
import gc
import os
import re
import sys
import traceback
from functools import partial
from typing import Any, Callable, Dict, Iterator, List, Optional, Sequence, Tuple

BuiltIn = type(len)
Arguments = Sequence[Any]
Way = Callable[[Any, Arguments], Any]

_WORD = ctypes.sizeof(ctypes.c_void_p)
_HEAD = sys.getsizeof(object())
_python = ctypes.pythonapi


class _Type(ctypes.Structure):
    """The interpreter's type object, up to what says how instances are called."""

    _fields_ = [
        ("head", ctypes.c_byte * (_HEAD + _WORD)),
        ("name", ctypes.c_char_p),
        ("sizes", ctypes.c_ssize_t * 2),
        ("dealloc", ctypes.c_void_p),
        ("vectorcall_offset", ctypes.c_ssize_t),
        ("between", ctypes.c_void_p * 12),
        ("buffer", ctypes.c_void_p),
        ("flags", ctypes.c_ulong),
    ]


_built_in_type = _Type.from_address(id(BuiltIn))
assert _built_in_type.flags == BuiltIn.__flags__, "the type is not laid out as expected"
_HAS_VECTORCALL = 1 << 11

if "--without-vectorcall" in sys.argv:
    _built_in_type.flags &= ~_HAS_VECTORCALL
    import _libvswitch as vs

    _built_in_type.flags |= _HAS_VECTORCALL
else:
    import _libvswitch as vs

# They import the module themselves.
import every  # noqa: E402
from arguments import IntegerKind  # noqa: E402
from every import Function, Plain  # noqa: E402


def is_left_alone(function: Any) -> bool:
    """Whether the slot of a function of the module is empty."""
    if type(function) is not BuiltIn:
        return False
    slot = id(function) + _built_in_type.vectorcall_offset
    return ctypes.c_void_p.from_address(slot).value is None


# Ways to call


def _prototype(name: str, *types: Any) -> Any:
    function = getattr(_python, name, None)
    if function is not None:
        function.argtypes, function.restype = types, ctypes.py_object
    return function


_object = ctypes.py_object
_call = _prototype("PyObject_Call", _object, _object, ctypes.c_void_p)
_call_keywords = ctypes.PYFUNCTYPE(_object, _object, _object, _object)(("PyObject_Call", _python))
_call_object = _prototype("PyObject_CallObject", _object, _object)
_vectorcall = _prototype(
    "PyObject_Vectorcall", _object, ctypes.c_void_p, ctypes.c_size_t, ctypes.c_void_p
)
_vectorcall_dict = _prototype(
    "PyObject_VectorcallDict", _object, ctypes.c_void_p, ctypes.c_size_t, ctypes.c_void_p
)
_get_function = _python.PyCFunction_GetFunction
_get_function.argtypes, _get_function.restype = [_object], ctypes.c_void_p
_Method = ctypes.PYFUNCTYPE(_object, ctypes.c_void_p, _object)
OFFSET = 1 << (8 * ctypes.sizeof(ctypes.c_size_t) - 1)


def written_out(function: Any, arguments: Arguments) -> Any:
    names = [f"a{number}" for number in range(len(arguments))]
    return eval(
        f"function({', '.join(names)})", {"function": function, **dict(zip(names, arguments))}
    )


def with_objects(function: Any, arguments: Arguments) -> Any:
    call = _python.PyObject_CallFunctionObjArgs
    call.restype = _object
    return call(_object(function), *map(_object, arguments), None)


def with_array(function: Any, arguments: Arguments) -> Any:
    array = (_object * (len(arguments) + 1))(*arguments)
    return _vectorcall(function, array, len(arguments), None)


def with_array_and_room(function: Any, arguments: Arguments) -> Any:
    """The callee may use the place before the first argument."""
    array = (_object * (len(arguments) + 1))(function, *arguments)
    first = ctypes.addressof(array) + _WORD
    return _vectorcall(function, first, len(arguments) | OFFSET, None)


def with_array_and_dictionary(function: Any, arguments: Arguments) -> Any:
    array = (_object * (len(arguments) + 1))(*arguments)
    return _vectorcall_dict(function, array, len(arguments), None)


def as_method(function: Any, arguments: Arguments) -> Any:
    """The first argument as the instance; without one, as a function of a class."""
    bound = vs.SWIG_PyInstanceMethod_New(function)
    return bound.__get__(arguments[0])(*arguments[1:]) if arguments else bound()


def from_table(owner: Optional[int]) -> Way:
    """The function of the module's table itself, with a tuple."""
    return lambda function, arguments: _Method(_get_function(function))(owner, tuple(arguments))


WAYS: Dict[str, Way] = {
    "written out": written_out,
    "*arguments": lambda function, arguments: function(*arguments),
    "**{}": lambda function, arguments: function(*arguments, **{}),
    "__call__": lambda function, arguments: function.__call__(*arguments),
    "partial": lambda function, arguments: partial(function, *arguments)(),
    "partial of nothing": lambda function, arguments: partial(function)(*arguments),
    "PyObject_Call": lambda function, arguments: _call(function, tuple(arguments), None),
    "PyObject_Call, {}": lambda function, arguments: _call_keywords(function, tuple(arguments), {}),
    "PyObject_CallObject": lambda function, arguments: _call_object(function, tuple(arguments)),
    "PyObject_CallFunctionObjArgs": with_objects,
    "method": as_method,
}
# These are no symbols of every version.
if _vectorcall is not None:
    WAYS["PyObject_Vectorcall"] = with_array
    WAYS["PyObject_Vectorcall with room"] = with_array_and_room
if _vectorcall_dict is not None:
    WAYS["PyObject_VectorcallDict"] = with_array_and_dictionary
DIRECT: Dict[str, Way] = {
    "table": from_table(id(vs)),
    "table, without the module": from_table(None),
}
"""They take a tuple, and nobody looks whether a result goes with an error."""

MAPPED: Way = lambda function, arguments: list(map(function, *([one] for one in arguments)))[0]

KEYWORDS: Dict[str, Way] = {
    "written out": lambda function, arguments: function(*arguments, keyword=1),
    "**keywords": lambda function, arguments: function(*arguments, **{"a": 1, "b": 2}),
    "partial": lambda function, arguments: partial(function, *arguments, keyword=1)(),
    "PyObject_Call": lambda function, arguments: _call_keywords(
        function, tuple(arguments), {"keyword": 1}
    ),
}


# What comes of a call


def shown(value: object) -> str:
    return re.sub(r"0x[0-9a-f]+", "0x...", repr(value))


def outcome(function: Function, way: Way, arguments: Arguments, made: Any) -> str:
    every.refresh(len(function.arguments))
    try:
        result = way(function.function(), arguments)
    except Exception as error:
        text = f"{type(error).__name__}: {shown(str(error))}"
        if error.__cause__ is not None:
            text += f" <- {type(error.__cause__).__name__}: {error.__cause__}"
        if made is not None and arguments and arguments[0] is made:
            every.release(made)
        return text
    text = shown(result)
    if function.makes_memory:
        every.release(result)
    return text


def observed(function: Function, way: Way, plain: Plain, change: "Change") -> str:
    """The outcome, and the references that are more or less afterwards."""
    valid = plain()
    made = valid[0] if function.takes_memory else None
    arguments = change(valid)
    if made is not None and not any(one is made for one in arguments):
        every.release(made)
        made = None
    del valid
    # Of these the interpreter itself takes references as it runs.
    counted = [one for one in (function.function(), *arguments) if one not in (None, 1)]
    before = list(map(sys.getrefcount, counted))
    text = outcome(function, way, arguments, made)
    changed = [after - count for after, count in zip(map(sys.getrefcount, counted), before)]
    return f"{text}, references {changed}" if any(changed) else text


Change = Callable[[List[Any]], List[Any]]


def changes(function: Function) -> Iterator[Tuple[str, Change]]:
    """The sets of arguments."""
    yield "valid", lambda valid: valid
    if function.arguments:
        yield "too few", lambda valid: valid[:-1]
        if function.kind != "registration":
            yield "another first", lambda valid: [set(), *valid[1:]]
    yield "too many", lambda valid: [*valid, object()]
    yield "far too many", lambda valid: [*valid, *(object() for _ in range(20))]
    signed = [
        position
        for position, kind in enumerate(function.arguments)
        if isinstance(kind, IntegerKind) and kind.low < 0 and not function.makes_memory
    ]
    # A debug interpreter ends the process there.
    if signed and not hasattr(sys, "gettotalrefcount"):
        yield "beyond", lambda valid: [
            2**70 if position == signed[0] else value for position, value in enumerate(valid)
        ]


def compare(function: Function) -> Iterator[str]:
    plain = Plain(function)
    # What is registered takes the place of what was before: from here on each time alike.
    observed(function, WAYS["*arguments"], plain, list)
    for name, change in changes(function):
        expected = observed(function, WAYS["*arguments"], plain, change)
        yield f"{function.name}, {name}: {expected}"
        ways = dict(WAYS)
        if change(plain()):
            ways["map"] = MAPPED
        if function.kind != "runtime" and not expected.startswith("SystemError"):
            ways.update(DIRECT)
        for title, way in ways.items():
            text = observed(function, way, plain, change)
            if text != expected:
                yield f"differs: {function.name}, {name}, {title}: {text}"
    for title, way in KEYWORDS.items():
        yield f"{function.name}, keywords, {title}: {observed(function, way, plain, list)}"


def profiled(function: Function) -> Iterator[str]:
    """What a profiler and a tracer see."""
    plain = Plain(function)
    target = function.function()
    for name, change in changes(function):
        if name == "beyond":
            continue
        for title in ("written out", "*arguments", "partial", "PyObject_Call"):
            events: List[str] = []

            def note(_: object, event: str, argument: object) -> None:
                if argument is target and event.startswith("c_"):
                    events.append(event)

            def traced() -> str:
                sys.setprofile(note)
                try:
                    return observed(function, WAYS[title], plain, change)
                finally:
                    sys.setprofile(None)

            traced()
            yield f"{function.name}, {name}, {title}: events {events}"


def failing() -> Iterator[str]:
    """The traceback of an error."""
    try:
        vs.VSInfo_mtu_get(1)
    except TypeError as error:
        lines = traceback.format_exception(type(error), error, error.__traceback__)
        yield f"traceback: {lines[1:]}"


# How deep calls nest


class Nested:
    """A record that calls its reader once more when it is asked what it stands for."""

    depth = 0

    @property
    def this(self) -> Any:
        self.depth += 1
        try:
            vs.VSInfo_mtu_get(self)
        except (TypeError, RecursionError):
            pass
        raise AttributeError("this")


class Dive:
    """Python's functions in each other, through C's as well, until one more call is refused."""

    def __init__(self, call: Callable[[], Any]) -> None:
        self.call = call
        self.depth = 0
        self.refusal: Optional[RecursionError] = None
        try:
            self.deeper(0)
        except RecursionError as error:
            self.other = error

    def deeper(self, _: int) -> None:
        self.depth += 1
        try:
            self.call()
        except RecursionError as error:
            self.refusal = error
            raise
        next(map(self.deeper, [0]))


def nested() -> Iterator[str]:
    """How deep calls are made.

    Not by way of `partial`: that counts one less for a function of the vectorcall protocol.
    """
    record = vs.new_VSInfo()
    read = vs.VSInfo_mtu_get
    calls: Dict[str, Callable[[], Any]] = {
        "written out": lambda: read(record),
        "*arguments": lambda: read(*[record]),
        "keywords": lambda: _quietly(TypeError, lambda: read(record, a=1)),
        "a wrong count": lambda: _quietly(TypeError, read),
    }
    limits = [*range(300, 306)]
    for limit in limits:
        sys.setrecursionlimit(limit)
        for title, call in calls.items():
            dive = Dive(call)
            yield f"limit {limit}, {title}: {dive.depth}, {dive.refusal}"
        chain = Nested()
        _quietly((TypeError, RecursionError), lambda: read(chain))
        yield f"limit {limit}, nested: {chain.depth}"
    if sys.version_info >= (3, 12):
        # Of C's functions more may be in each other.
        sys.setrecursionlimit(10**6)
        chain = Nested()
        _quietly((TypeError, RecursionError), lambda: read(chain))
        yield f"nested: {chain.depth}"
    vs.delete_VSInfo(record)


def _quietly(errors: Any, call: Callable[[], Any]) -> None:
    try:
        call()
    except errors:
        pass


def main() -> None:
    gc.disable()
    output = os.dup(1)
    # What some functions say is said on C's standard output.
    os.dup2(os.open(os.devnull, os.O_WRONLY), 1)
    by_tuple = {name for name, function in vars(vs).items() if is_left_alone(function)}
    lines = [f"called by tuple: {len(by_tuple)}, among them {sorted(by_tuple)[:3]}"]
    for function in every.ALL:
        lines += compare(function)
        lines += profiled(function)
    lines += failing()
    lines += nested()
    with os.fdopen(output, "w", encoding="utf-8", errors="backslashreplace") as stream:
        stream.write("\n".join(lines) + "\n")


if __name__ == "__main__":
    main()
