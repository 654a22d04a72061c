"""Makes every checked call once over the recording host, and prints what the host saw: FOLDER...

The FOLDERs have the module of the recording host and the generators' model of the calls, which
gives the names of C's parameters. Each argument is another one, so that two which changed places
show.
"""

import enum
import inspect
import json
import sys
from pathlib import Path
from typing import Any, Dict, List

sys.path += sys.argv[2:]

import _libvswitch as flat  # noqa: E402  (it loads the host)
import call_model  # noqa: E402
import definitions  # noqa: E402
import libvswitch as vs  # noqa: E402
from libvswitch import _pointers, checked, enums  # noqa: E402
from recording_host import RecordingHost  # noqa: E402

# Bytes of what is no bytes in Python.
SIZES = {"ids": 4, "ranges": 8, "entries": 16}

ITEM = _pointers.pointer_object(0x1000, "void *")
GIVEN: Dict[str, Any] = {
    "DVSwitchHandle": lambda at: checked.DVSwitchHandle(0x2000 + at),
    "DVSPortHandle": lambda at: checked.DVSPortHandle(0x3000 + at),
    "DVSDataHandle": lambda at: checked.DVSDataHandle(0x4000 + at),
    "Union[DVSDataItem, _libvswitch._Pointer]": lambda at: ITEM,
    "Union[_libvswitch._Pointer, None]": lambda at: ITEM,
    "Union[DVSDataHandle, _libvswitch._Pointer, None]": lambda at: ITEM,
    "str": lambda at: f"argument {at}",
    "Optional[str]": lambda at: f"argument {at}",
    "int": lambda at: at,
    "bool": lambda at: True,
    "bytes": lambda at: f"bytes {at}".encode(),
    "Union[str, bytes]": lambda at: b"\x01\x02\x03\x04",
    "typing.Iterable[str]": lambda at: ["left", "right"],
    "typing.Iterable[int]": lambda at: [0x1234, 0x5678],
    "typing.Iterable[DVMirrorSession]": lambda at: [checked.DVMirrorSession("audit")],
    "typing.Iterable[VSRuntimeOption]": lambda at: [checked.VSRuntimeOption(3, 0x0A0B0C0D)],
}


def given(annotation: str, at: int) -> Any:
    if annotation in GIVEN:
        return GIVEN[annotation](at)
    if annotation == "Multicast":
        return enums.Multicast.IGMP
    if annotation in enums.__all__:
        return [*getattr(enums, annotation)][-1]
    if annotation.startswith("typing.Iterable[Union["):
        name = annotation[len("typing.Iterable[Union[") :].split(",")[0]
        return [getattr(checked, name)(1, 2), getattr(vs, name)()]
    if annotation.startswith("Union["):
        return getattr(checked, annotation[len("Union[") :].split(",")[0])("02:00:00:00:00:07")
    if annotation.startswith("_vs."):
        return getattr(vs, annotation[len("_vs.") :])()
    return None  # an allocator


def shown(value: Any) -> Any:
    if isinstance(value, enum.Enum):
        return value.value
    if isinstance(value, (bytes, bytearray)):
        return {"bytes": value.hex()}
    return value if isinstance(value, (int, str, list)) and _is_plain(value) else None


def _is_plain(value: Any) -> bool:
    return not isinstance(value, list) or all(isinstance(one, (int, str)) for one in value)


def made(host: RecordingHost, call: call_model.Call) -> Dict[str, Any]:
    function = getattr(checked, call.name)
    parameters = inspect.signature(function).parameters.values()
    arguments = {one.name: given(one.annotation, at) for at, one in enumerate(parameters, 1)}
    host.reset()
    for at, one in enumerate(call.arguments, 1):
        if one.length is not None and one.name in arguments:
            host.capture(call.name, at, SIZES.get(one.name) or len(arguments[one.name]))
    if call.has_status:
        host.answer(call.name, result=flat.QEX_FAILURE)
    raised = ""
    try:
        function(**arguments)
    except Exception as error:
        raised = f"{type(error).__name__}: {error.__cause__ or error}"
    names_seen = [one.function for one in host.calls()]
    if call.name not in names_seen:
        raise SystemExit(f"{call.name} was not made, but {names_seen}: {raised}")
    at = names_seen.index(call.name)
    details = host.details()[at]
    names: List[str] = [one.name for one in call.arguments]
    return {
        "given": {name: shown(value) for name, value in arguments.items()},
        "seen": dict(zip(names, map(shown, host.calls()[at].values))),
        "memory": {name: (held or b"").hex() for name, held in zip(names, details.memory)},
        "raised": raised,
    }


def main() -> None:
    host = RecordingHost()
    known = definitions.read(Path(sys.argv[1]))
    print(json.dumps({call.name: made(host, call) for call in call_model.read(known)}))


if __name__ == "__main__":
    main()
