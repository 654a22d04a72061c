"""The recording host from Python: what the module called, and what the host returns.

The host's two libraries note each call and return zeros and nulls unless told otherwise:

    host.answer("VSDVS_GetMTU", result=0, outputs={2: 9000})
    assert _libvswitch.VSDVS_GetMTU("dvs0", mtu) == 0
    assert host.calls() == [("VSDVS_GetMTU", (b"dvs0", address))]

Calls are counted from 1 since the last reset, arguments from 1.
"""

import ctypes
import json
import struct
from pathlib import Path
from typing import Any, Dict, Iterator, List, Mapping, NamedTuple, Optional, Tuple, Type, Union

Value = Union[int, bytes, None]
"""An integer, the bytes of a text without its NUL, an address, or a null pointer."""

# What an output parameter of each type holds, in the terms of struct.
_POINTEES = {
    "char*": "b",
    "short unsigned int*": "H",
    "int*": "i",
    "unsigned int*": "I",
}


class Call(NamedTuple):
    """A call as the host saw it. It equals the pair of its function and values."""

    function: str
    values: Tuple[Value, ...]


class Details(NamedTuple):
    """What else is known of a call."""

    types: Tuple[str, ...]
    """The C type of each argument, typedefs resolved."""
    memory: Tuple[Optional[bytes], ...]
    """What each pointer to a record, or with capture() any pointer, led to when the call began."""
    addresses: Tuple[int, ...]
    """Where each pointer led, that of a text too; whatever an integer's bits are."""
    exception_status: int
    """The module's trap when the call began: 0 if it was armed for it."""


class Signature(NamedTuple):
    """The C types of a call, typedefs resolved."""

    result: str
    parameters: Tuple[str, ...]


class WrongHost(Exception):
    """The module runs on another host, so that nothing here would prove anything."""


_FORWARDING = "librecordings.so"


def _loaded() -> Iterator[Path]:
    with open("/proc/self/maps", encoding="utf-8") as maps:
        yield from {Path(line.rstrip("\n").split(maxsplit=5)[5]) for line in maps if "/" in line}


def loaded_files(*names: str) -> List[Path]:
    """Return the files with one of these names that this process has loaded.

    Libraries that forward to them, when a recording of this process is made, are not among them.
    """
    paths = list(_loaded())
    forwarding = {path.parent for path in paths if path.name == _FORWARDING}
    return sorted(path for path in paths if path.name in names and path.parent not in forwarding)


class RecordingHost:
    """The recording host under the module that this process has already imported."""

    def __init__(self) -> None:
        libraries = loaded_files("libvswitch.so", "libnebPublic.so")
        recorders = loaded_files("librecorder.so")
        if not recorders or {path.parent for path in libraries} != {recorders[0].parent}:
            raise WrongHost(
                f"the module runs on {list(map(str, libraries))}, which is not the recording"
                " host; LD_LIBRARY_PATH must name its folder before Python starts"
            )
        self._recorder = ctypes.CDLL(str(recorders[0]))
        if not self._recorder.recorder_has_trap():
            raise WrongHost("the recording host was loaded by something other than the module")
        for function in ("recorder_functions", "recorder_calls"):
            getattr(self._recorder, function).restype = ctypes.c_char_p
        self.functions: Mapping[str, Signature] = {
            name: Signature(types["result"], tuple(types["parameters"]))
            for name, types in json.loads(self._recorder.recorder_functions()).items()
        }
        self._alive: List[object] = []
        self._given_for = next(
            (
                ctypes.CDLL(str(one)).recorder_given_for
                for one in _loaded()
                if one.name == _FORWARDING
            ),
            None,
        )
        if self._given_for is not None:
            self._given_for.argtypes = [ctypes.c_void_p]
            self._given_for.restype = ctypes.c_void_p

    def reset(self) -> None:
        """Forget all calls and what they return, and lower the trap's status."""
        self._recorder.recorder_reset()
        self._alive.clear()
        self.exception_status = 0

    def take_no_notes(self) -> None:
        """Keep nothing of the calls until the next reset, for there are going to be millions."""
        self._recorder.recorder_take_no_notes()

    def calls(self) -> List[Call]:
        """Return the calls since the last reset, in order."""
        return [
            Call(call["function"], tuple(map(self._value, call["arguments"])))
            for call in self._calls()
        ]

    def details(self) -> List[Details]:
        """Return, for each of calls(), what else is known of it."""
        return [
            Details(
                tuple(argument["type"] for argument in call["arguments"]),
                tuple(_bytes(argument["memory"]) for argument in call["arguments"]),
                tuple(argument["address"] for argument in call["arguments"]),
                call["exception_status"],
            )
            for call in self._calls()
        ]

    def answer(
        self,
        function: str,
        result: Value = None,
        outputs: Optional[Mapping[int, Value]] = None,
        nth: int = 0,
    ) -> None:
        """Set what a call returns: the nth one, or all of which nothing else is said.

        The result is an integer, a text or an address, as the call declares it. An output is an
        integer or an address, as wide as the parameter has it, or just bytes: those of a record,
        or of a text with or without its NUL; None leaves it alone.
        """
        signature = self._signature(function)
        if result is not None:
            self._check(function, "answer", nth, ctypes.c_uint64(self._bits(result)))
        for argument, value in (outputs or {}).items():
            if isinstance(value, int):
                value = _packed(signature.parameters[argument - 1], value)
            if value is not None:
                self._check(function, "output", nth, argument, value, ctypes.c_size_t(len(value)))

    def spring(
        self,
        function: str,
        exception: Type[BaseException],
        text: Union[str, bytes],
        *,
        nth: int = 0,
        value: int = 1,
        after_outputs: bool = False,
    ) -> None:
        """Spring the call trap in the nth call, or in every one, with the jump's value."""
        if function == "Panic":
            raise ValueError("Panic is called with no trap armed; a jump would lead nowhere")
        if value == 0:
            raise ValueError("a jump's value is not 0")
        message = text.encode() if isinstance(text, str) else text
        self._alive.append(exception)
        address = ctypes.c_void_p(id(exception))
        self._check(function, "spring", nth, address, message, value, int(after_outputs))

    def capture(self, function: str, argument: int, size: int) -> None:
        """Record that many bytes of what a pointer argument leads to, for details()."""
        self._check(function, "capture", argument, ctypes.c_size_t(size))

    def delay(self, function: str, milliseconds: int, nth: int = 0) -> None:
        """Let the nth call, or every one, take its time."""
        self._check(function, "delay", nth, milliseconds)

    @property
    def exception_status(self) -> int:
        """The status of the module's call trap, as a library of the host sees it."""
        return int(self._recorder.recorder_exception_status())

    @exception_status.setter
    def exception_status(self, value: int) -> None:
        self._recorder.recorder_set_exception_status(value)

    def _value(self, argument: Dict[str, Any]) -> Value:
        value: Union[int, str, None] = argument["value"]
        if isinstance(value, int) and "(*)" in argument["type"] and self._given_for is not None:
            # A recording puts a function of its own before the one that was given.
            return int(self._given_for(value))
        return bytes.fromhex(value) if isinstance(value, str) else value

    def _calls(self) -> List[Dict[str, Any]]:
        calls: List[Dict[str, Any]] = json.loads(self._recorder.recorder_calls())
        return calls

    def _signature(self, function: str) -> Signature:
        if function not in self.functions:
            raise ValueError(f"the recording host has no call '{function}'")
        return self.functions[function]

    def _check(self, function: str, rule: str, *arguments: object) -> None:
        self._signature(function)
        if getattr(self._recorder, f"recorder_{rule}")(function.encode(), *arguments) != 0:
            raise ValueError(f"{function}: no such argument: {rule}{arguments}")

    def _bits(self, result: Value) -> int:
        if isinstance(result, bytes):
            text = ctypes.create_string_buffer(result)
            self._alive.append(text)
            return ctypes.addressof(text)
        return (result or 0) & 0xFFFFFFFFFFFFFFFF


def _packed(pointer: str, value: int) -> bytes:
    """Return the value as the bytes of what such a pointer leads to."""
    return struct.pack("P" if pointer.endswith("**") else _POINTEES[pointer], value)


def _bytes(text: Optional[str]) -> Optional[bytes]:
    return None if text is None else bytes.fromhex(text)
