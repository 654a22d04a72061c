"""Passes null for each pointer of each call in turn, with sound arguments beside it.

Writes a line for each: the call, the parameter, and the status or other result. Goes past the
module, with the calls as C has them, so whatever the host does not check ends this process.
"""

import ctypes
import sys
from importlib import import_module
from pathlib import Path
from typing import Any, Iterator, List, Tuple

import libvswitch as vs

from witness import FOLDER, ID, LAB, PORT

ROOT = Path(__file__).parents[3]
sys.path.append(str(ROOT / "simhost"))
declared_calls = import_module("make_call_names").declared_calls

HEADERS = {
    "libvswitch.so": ["vswitch/configuration.h", "vswitch/queries.h", "vswitch/status_text.h"],
    "libnebPublic.so": [
        "nebpublic/data.h",
        "nebpublic/kernel_state.h",
        "nebpublic/names.h",
        "nebpublic/state.h",
    ],
}
TEXTS = {"switchName": LAB, "alias": LAB, "switchId": ID, "port": PORT, "portsetName": "lab-ports"}
OPAQUE = ("DVSwitchHandle", "DVSPortHandle", "DVSDataHandle", "DVSDataItem")
FUNCTIONS = ("Callback", "MemAlloc", "MemFree")


def parameters(text: str) -> List[Tuple[str, str]]:
    """The type and the name of each parameter."""
    if text == "void":
        return []
    pairs = []
    for one in text.split(","):
        words = one.replace("*", " * ").replace("[", " [").split()
        while words[-1].startswith("["):
            words.pop()
            words.insert(0, "array *")
        pairs.append((" ".join(words[:-1]), words[-1]))
    return pairs


def is_pointer(kind: str) -> bool:
    return "*" in kind or kind in OPAQUE or kind.endswith(FUNCTIONS)


def sound(kind: str, name: str) -> Any:
    """A value that a call can do with. Handles are left null: there is no other that fits all."""
    if kind == "char const *":
        return TEXTS.get(name, "com.example.text").encode()
    if kind in OPAQUE or kind.endswith(FUNCTIONS):
        return None
    return ctypes.create_string_buffer(65536) if is_pointer(kind) else ctypes.c_uint32(1)


def calls() -> Iterator[Tuple[Any, str, str, List[Tuple[str, str]]]]:
    for library, headers in HEADERS.items():
        functions = ctypes.CDLL(str(FOLDER / library))
        for header in headers:
            text = (ROOT / "include" / header).read_text(encoding="utf-8")
            for call in declared_calls(text):
                function = getattr(functions, call.name)
                yield function, call.name, call.result, parameters(call.parameters)


def main() -> None:
    assert vs.VSDVS_CreateVSwitch(LAB, ID, "lab-ports", 64, 1, 0, 0, 0) == vs.QEX_OK
    assert vs.VSDVS_AddDVPort(LAB, PORT, 0) == vs.QEX_OK
    for function, name, result, given in calls():
        for position, (kind, parameter) in enumerate(given):
            if name == "Panic" or parameter == "..." or not is_pointer(kind):
                continue
            function.restype = ctypes.c_int32 if result == "QEX_ReturnStatus" else ctypes.c_void_p
            values = [sound(*one) for one in given]
            values[position] = None
            answer = function(*values)
            shown = "none" if result == "void" else str(answer)
            print(name, parameter, shown if result == "QEX_ReturnStatus" else f"({shown})")


if __name__ == "__main__":
    main()
