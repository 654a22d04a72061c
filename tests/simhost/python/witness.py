"""What a call of the host was seen to do: whether it changed the host, and its different results.

Works on the host of its own process, whose clock stands, so that nothing changes by itself.
"""

import ctypes
import json
import os
import re
import tempfile
from collections import defaultdict
from pathlib import Path
from typing import Any, Callable, DefaultDict, List, Optional, Set

import libvswitch as vs

FOLDER = Path(os.environ["BUILD_DIR"]) / "simhost"
SIMHOST = ctypes.CDLL(str(FOLDER / "libsimhost.so"))
NEBPUBLIC = ctypes.CDLL(str(FOLDER / "libnebPublic.so"))

# The numbers that these return are no statuses, or a status is all that they have to show.
RETURN_NUMBERS = {"DVS_GetMaxPorts", "DVS_Version", "DVSData_PropType", "DVSQEX_PortFind"}
# What these do shows in the ledger only: in what is out and how large it is.
IN_LEDGER = {
    "DVSData_Alloc",
    "DVSData_Free",
    "DVSData_Update",
    "VSDVS_FreeMemory",
    "VSQEX_FreeMemory",
    "DVSQEX_DataFree",
}


def _text(call: Any) -> bytes:
    """What a function writes that takes room and its size, and returns how much it wants."""
    room = ctypes.create_string_buffer(call(None, ctypes.c_size_t(0)) + 1)
    call(room, ctypes.c_size_t(len(room)))
    return room.value


def _image() -> bytes:
    data, length = ctypes.c_void_p(), ctypes.c_int()
    assert NEBPUBLIC.DVSQEX_StateGet(ctypes.byref(data), ctypes.byref(length)) == 0
    image = ctypes.string_at(data, length.value)
    NEBPUBLIC.DVSQEX_DataFree(data)
    return image


def _shown(value: Any, following: Any = None) -> Optional[str]:
    """What can be seen of an output, without the addresses, which tell nothing of the host."""
    if isinstance(value, vs.Cell):
        if isinstance(following, vs.Cell) and value.value is not None:
            return value.read(following.value).hex()
        value = value.value
    if value is None or isinstance(value, (int, str, bytes)):
        return repr(value)
    return re.sub(r"0x[0-9a-f]+", "*", repr(value))


class Witness:
    """Makes calls, and notes what they did."""

    def __init__(self) -> None:
        assert SIMHOST.simhost_clock_stop() == 0
        self.changed: Set[str] = set()
        self.results: DefaultDict[str, Set[str]] = defaultdict(set)

    def __call__(self, name: str, *given: Any, outputs: Any = ()) -> Any:
        """Calls a function. `outputs` are the cells and records that it fills."""
        before = self._state(name)
        result = getattr(vs, name)(*(getattr(one, "pointer", one) for one in given))
        if self._state(name) != before:
            self.changed.add(name)
        self.note(name, result, outputs)
        return result

    def note(self, name: str, result: Any, outputs: Any = ()) -> None:
        """Notes an answer; one that is no success says nothing of what the call does."""
        status, *shown = result if isinstance(result, (list, tuple)) else [result]
        if name not in RETURN_NUMBERS and type(status) is int and status != vs.QEX_OK:
            return
        following = [*outputs[1:], None]
        seen = [_shown(one) for one in [status, *shown]]
        seen += [_shown(one, after) for one, after in zip(outputs, following)]
        self.results[name].add(repr(seen))

    def succeeded(self) -> Set[str]:
        """The calls that were made with success."""
        return set(self.results)

    def panic(self, text: str) -> None:
        """Panic, whose answer goes to standard error."""
        with tempfile.TemporaryFile() as written:
            kept = os.dup(2)
            os.dup2(written.fileno(), 2)
            vs.Panic(text)
            os.dup2(kept, 2)
            os.close(kept)
            written.seek(0)
            self.results["Panic"].add(written.read().decode())

    def modelled(self) -> Set[str]:
        """The calls that were seen to do something."""
        return self.changed | {name for name, seen in self.results.items() if len(seen) > 1}

    @staticmethod
    def _state(name: str) -> bytes:
        if name in IN_LEDGER:
            return _text(SIMHOST.simhost_ledger_summary)
        host = json.loads(_text(SIMHOST.simhost_describe))
        # Faults count the calls that they wait for.
        del host["faults"]
        return repr(host).encode() + _image()


#: The one of this process, and what it makes its calls with.
call = Witness()
LAB, ID, PORT = "lab", "lab-id", "desk"


def filled(record: Any, **fields: Any) -> Any:
    for name, value in fields.items():
        setattr(record, name, value)
    return record


def cell(kind: Any) -> Any:
    return vs.Cell(kind)


def allocated(name: str, *given: Any, deallocator: str = "DVSQEX_DataFree") -> bytes:
    """A call that allocates bytes; they are released."""
    data, length = cell("void *"), cell("int")
    assert call(name, *given, data, length, outputs=(data, length)) == vs.QEX_OK, name
    image: bytes = data.read(length.value)
    call(deallocator, data.value)
    return image


def listing(name: str, *given: Any) -> None:
    """A call that makes a list of properties; its bytes are its answer."""
    handle = cell("DVSDataHandle")
    assert getattr(vs, name)(*given, handle.pointer, vs.ALL_PROP_TYPE) == vs.QEX_OK
    data, length = cell("void *"), cell("qex_uint32")
    assert call("DVSData_Serialize", handle.value, data, length, 200, outputs=(data, length)) == 0
    call.note(name, [vs.QEX_OK, data.read(length.value)])
    vs.DVSQEX_DataFree(data.value)
    vs.DVSData_Free(handle.value)


def walk(name: str, *handle: Any, text_of: Callable[[Any], Any]) -> None:
    seen: List[Any] = []
    callback = vs.Callback(lambda item, context: seen.append(text_of(item)))
    getattr(vs, name)(*handle, callback, None)
    callback.reraise()
    call.note(name, [vs.QEX_OK, repr(seen)])
