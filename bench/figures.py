"""The figures, and how the user of each peer writes them.

A figure is an expression that is timed, with everything that it names bound beforehand. There are
two forms of it. In the form of functions each peer is a module that could take the measured one's
place: the same names, arguments and results, compiled where the peer compiles. In its own form a
peer is used as its documentation has it: attributes and methods of classes, compiled functions
called directly, texts encoded and decoded where it takes bytes. The classes of libvswitch stand
beside those of a peer in a third table, in a process without the flat module's figures: once they
are loaded, the flat functions return instances of them.
"""

import importlib
from dataclasses import dataclass
from typing import Any, Callable, Dict, List, Optional

MTU = 9000


class Varied:
    """Values of which each evaluation of an expression takes another.

    Texts have several lengths. With the same one over and over, whether the processor guesses the
    ends of the loops over its bytes is a matter of luck.
    """

    def __init__(self, *values: Any) -> None:
        self.values = values


SWITCHES = ("dvs0", "prod-switch", "dvSwitch-lab-17", "DSwitch 42 (storage traffic)", "dvs-1")
PORTS = ("17", "dvport-1027", "c-3f9a", "b1e6d0aa-77", "dvport-20041-uplink-port-group")
NAMES = ("nic0", "uplink-nic-0", "lag-east-7", "teaming.uplink.port.of.rack-12", "nic12")
SWITCH, PORT, NAME = SWITCHES[0], PORTS[0], NAMES[0]

FIGURES: Dict[str, str] = {
    "read": "32-bit read",
    "write": "32-bit write",
    "text_read": "text read",
    "text_write": "text write",
    "status": "text, integer to status",
    "pair": "two texts to [status, value]",
    "filled": "caller-filled record",
    "lifetime": "constructor plus destructor",
    "item": "extension method: an item's text",
    "length": "extension method: the length",
}
"""The keys of all figures, with what reports call them."""

EXPECTED: Dict[str, Any] = {
    "read": MTU,
    "write": MTU + 1,
    "text_read": NAME,
    "text_write": PORT,
    "status": 0,
    "pair": [0, 50331650],
    "filled": [0, 1500],
    "lifetime": 0,
    "item": "nic1",
    "length": 2,
}
"""What every peer must return: the value of the expression, or what it left behind."""


@dataclass
class Figure:
    """An expression with the values of its names, and a way to see its result."""

    expression: str
    names: Dict[str, Any]
    observe: Callable[[], Any]


def _figure(expression: str, **names: Any) -> Figure:
    """A figure that is its own observation."""
    return _observed(expression, lambda value: value, **names)


def _observed(expression: str, observe: Callable[[Any], Any], **names: Any) -> Figure:
    """A figure of which something else is observed, given the value of the expression."""
    return Figure(expression, names, lambda: observe(eval(expression, {}, _first(names))))


def _first(names: Dict[str, Any]) -> Dict[str, Any]:
    """The names as they are bound for one evaluation."""
    return {
        name: value.values[0] if isinstance(value, Varied) else value
        for name, value in names.items()
    }


def flat(module: Any) -> Dict[str, Figure]:
    """Flat functions over pointer objects."""
    read, text_read, delete = (
        module.VSInfo_mtu_get,
        module.qex_Name_string_get,
        module.delete_VSInfo,
    )
    info, scratch, filled = module.new_VSInfo(), module.new_VSInfo(), module.new_VSInfo()
    module.VSInfo_mtu_set(info, MTU)
    scratch_name, names = module.new_qex_Name(), [module.new_qex_Name() for _ in NAMES]
    for name, text in zip(names, NAMES):
        module.qex_Name_string_set(name, text)
    status, uplinks = module.VSQEX_GetUplinks(SWITCH)
    assert status == 0

    def fresh_mtu(_: object) -> object:
        record = module.new_VSInfo()
        value = read(record)
        delete(record)
        return value

    return {
        "read": _figure("get(record)", get=read, record=info),
        "write": _observed(
            "set(record, value)",
            lambda _: read(scratch),
            set=module.VSInfo_mtu_set,
            record=scratch,
            value=MTU + 1,
        ),
        "text_read": _figure("get(record)", get=text_read, record=Varied(*names)),
        "text_write": _observed(
            "set(record, text)",
            lambda _: text_read(scratch_name),
            set=module.qex_Name_string_set,
            record=scratch_name,
            text=Varied(*PORTS),
        ),
        "status": _figure(
            "call(switch, mtu)", call=module.VSDVS_SetMTU, switch=Varied(*SWITCHES), mtu=MTU
        ),
        "pair": _figure(
            "call(switch, port)",
            call=module.VSDVS_DvPortIDToPortID,
            switch=Varied(*SWITCHES),
            port=Varied(*PORTS),
        ),
        "filled": _observed(
            "call(switch, record)",
            lambda answer: [answer, read(filled)],
            call=module.VSQEX_GetVSInfo,
            switch=Varied(*SWITCHES),
            record=filled,
        ),
        "lifetime": _observed("delete(new())", fresh_mtu, delete=delete, new=module.new_VSInfo),
        "item": _figure("item(record, 1)", item=module.VSUplinks___getitem__, record=uplinks),
        "length": _figure("length(record)", length=module.VSUplinks___len__, record=uplinks),
    }


def vector(module: Any) -> Dict[str, Figure]:
    """Flat functions over objects that end with their last reference."""

    class Released:
        """The module with a destructor that does nothing, for the common form."""

        def __getattr__(self, name: str) -> Any:
            return getattr(module, name)

        def delete_VSInfo(self, record: object) -> None:  # noqa: N802 (the module's name)
            """Leave the record to its last reference."""

    figures = flat(Released())
    figures["lifetime"] = _observed(
        "new()", lambda record: module.VSInfo_mtu_get(record), new=module.new_VSInfo
    )
    return figures


def classes(module: Any) -> Dict[str, Figure]:
    """Classes with attributes and methods, and functions that take their instances."""
    info, scratch, filled = module.VSInfo(), module.VSInfo(), module.VSInfo()
    info.mtu = MTU
    scratch_name, names = module.qex_Name(), [module.qex_Name() for _ in NAMES]
    for name, text in zip(names, NAMES):
        name.string = text
    status, uplinks = module.VSQEX_GetUplinks(SWITCH)
    assert status == 0
    return {
        "read": _figure("record.mtu", record=info),
        "write": _assignment("record.mtu", lambda: scratch.mtu, record=scratch, value=MTU + 1),
        "text_read": _figure("record.string", record=Varied(*names)),
        "text_write": _assignment(
            "record.string", lambda: scratch_name.string, record=scratch_name, value=Varied(*PORTS)
        ),
        "status": _figure(
            "call(switch, mtu)", call=module.VSDVS_SetMTU, switch=Varied(*SWITCHES), mtu=MTU
        ),
        "pair": _figure(
            "call(switch, port)",
            call=module.VSDVS_DvPortIDToPortID,
            switch=Varied(*SWITCHES),
            port=Varied(*PORTS),
        ),
        "filled": _observed(
            "call(switch, record)",
            lambda answer: [answer, filled.mtu],
            call=module.VSQEX_GetVSInfo,
            switch=Varied(*SWITCHES),
            record=filled,
        ),
        "lifetime": _observed("new()", lambda record: record.mtu, new=module.VSInfo),
        "item": _figure("record[1]", record=uplinks),
        "length": _figure("length(record)", length=len, record=uplinks),
    }


def _assignment(target: str, observe: Callable[[], Any], value: Any, **names: Any) -> Figure:
    """A figure that assigns; `value` names what is assigned."""
    names["value"] = value
    statement = f"{target} = value"

    def run() -> Any:
        exec(statement, {}, _first(names))
        return observe()

    return Figure(statement, names, run)


def cffi_api(module: Any) -> Dict[str, Figure]:
    """Structures and functions of a compiled cffi module."""
    ffi, library = module.ffi, module.lib
    info, scratch, filled = (ffi.new("VSInfo *") for _ in range(3))
    info.mtu = MTU
    scratch_name, names = ffi.new("qex_Name *"), [ffi.new("qex_Name *") for _ in NAMES]
    for name, text in zip(names, NAMES):
        name.string = text.encode()
    out = ffi.new("VSUplinks **")
    assert library.VSQEX_GetUplinks(SWITCH.encode(), out) == 0
    # A type that is parsed beforehand spares each allocation a look-up of its text.
    info_type, number_type = ffi.typeof("VSInfo *"), ffi.typeof("int *")
    return {
        "read": _figure("record.mtu", record=info),
        "write": _assignment("record.mtu", lambda: scratch.mtu, record=scratch, value=MTU + 1),
        "text_read": _figure(
            "string(record.string).decode()", string=ffi.string, record=Varied(*names)
        ),
        "text_write": _encoded_assignment(
            lambda: ffi.string(scratch_name.string).decode(),
            record=scratch_name,
            value=Varied(*PORTS),
        ),
        "status": _figure(
            "call(switch.encode(), mtu)",
            call=library.VSDVS_SetMTU,
            switch=Varied(*SWITCHES),
            mtu=MTU,
        ),
        "pair": Figure(
            "number = new(int_type); [call(switch.encode(), port.encode(), number), number[0]]",
            {
                "new": ffi.new,
                "int_type": number_type,
                "call": library.VSDVS_DvPortIDToPortID,
                "switch": Varied(*SWITCHES),
                "port": Varied(*PORTS),
            },
            lambda: _cffi_pair(ffi, library),
        ),
        "filled": _observed(
            "call(switch.encode(), record)",
            lambda answer: [answer, filled.mtu],
            call=library.VSQEX_GetVSInfo,
            switch=Varied(*SWITCHES),
            record=filled,
        ),
        "lifetime": _observed("new(type)", lambda record: record.mtu, new=ffi.new, type=info_type),
        "item": _figure(
            "string(record.entries[1].name.string).decode()", string=ffi.string, record=out[0]
        ),
        "length": _figure("record.numEntries", record=out[0]),
    }


def _encoded_assignment(observe: Callable[[], Any], value: Varied, **names: Any) -> Figure:
    """A figure that assigns the bytes of a text to `record.string`."""
    names["value"] = value
    statement = "record.string = value.encode()"

    def run() -> Any:
        exec(statement, {}, _first(names))
        return observe()

    return Figure(statement, names, run)


def _cffi_pair(ffi: Any, library: Any) -> List[int]:
    number = ffi.new("int *")
    return [
        library.VSDVS_DvPortIDToPortID(SWITCH.encode(), PORT.encode(), number),
        number[0],
    ]


def ctypes_declared(module: Any) -> Dict[str, Figure]:
    """Structures and prototypes of ctypes."""
    from ctypes import POINTER, byref, c_int, cast

    info, scratch, filled = module.VSInfo(), module.VSInfo(), module.VSInfo()
    info.mtu = MTU
    scratch_name, names = module.qex_Name(), [module.qex_Name() for _ in NAMES]
    for name, text in zip(names, NAMES):
        name.string = text.encode()
    uplinks = POINTER(module.VSUplinks)()
    assert module.VSQEX_GetUplinks(SWITCH.encode(), byref(uplinks)) == 0
    entries = cast(uplinks.contents.entries, POINTER(module.VSUplinks_entries))

    def pair() -> List[int]:
        number = c_int()
        return [
            module.VSDVS_DvPortIDToPortID(SWITCH.encode(), PORT.encode(), byref(number)),
            number.value,
        ]

    return {
        "read": _figure("record.mtu", record=info),
        "write": _assignment("record.mtu", lambda: scratch.mtu, record=scratch, value=MTU + 1),
        "text_read": _figure("record.string.decode()", record=Varied(*names)),
        "text_write": _encoded_assignment(
            lambda: scratch_name.string.decode(), record=scratch_name, value=Varied(*PORTS)
        ),
        "status": _figure(
            "call(switch.encode(), mtu)",
            call=module.VSDVS_SetMTU,
            switch=Varied(*SWITCHES),
            mtu=MTU,
        ),
        "pair": Figure(
            "number = new(); [call(switch.encode(), port.encode(), ref(number)), number.value]",
            {
                "new": c_int,
                "ref": byref,
                "call": module.VSDVS_DvPortIDToPortID,
                "switch": Varied(*SWITCHES),
                "port": Varied(*PORTS),
            },
            pair,
        ),
        "filled": _observed(
            "call(switch.encode(), ref(record))",
            lambda answer: [answer, filled.mtu],
            call=module.VSQEX_GetVSInfo,
            ref=byref,
            switch=Varied(*SWITCHES),
            record=filled,
        ),
        "lifetime": _observed("new()", lambda record: record.mtu, new=module.VSInfo),
        "item": _figure("entries[1].name.string.decode()", entries=entries),
        "length": _figure("record.numEntries", record=uplinks.contents),
    }


Builder = Callable[[Any], Dict[str, Figure]]


@dataclass(frozen=True)
class Peer:
    """A binding of the measured calls: its module of functions, if any, and its own form if it has
    one."""

    title: str
    functions: Optional[str]
    build: Builder = flat
    own: Optional[str] = None
    build_own: Optional[Builder] = None


PEERS: Dict[str, Peer] = {
    "ours": Peer("this module", "_libvswitch", flat, "_libvswitch", flat),
    "twin": Peer("its twin", "_libvswitch"),
    "handwritten": Peer("hand-written, same contract", "handwritten"),
    "fastcall": Peer("hand-written, floor", "fastcall", vector),
    "stock": Peer("stock SWIG", "_stock"),
    "pybind11": Peer("pybind11", "pybind11_peer", flat, "pybind11_peer", classes),
    "cffi": Peer("cffi", "cffi_functions", flat, "cffi_peer", cffi_api),
    "ctypes": Peer("ctypes", "ctypes_functions", flat, "ctypes_peer", ctypes_declared),
    "cython": Peer("Cython", "cython_peer", flat, "cython_peer", classes),
    "classes": Peer("libvswitch", None, flat, "libvswitch", classes),
}

FORMS: Dict[str, List[str]] = {
    "functions": [key for key, peer in PEERS.items() if peer.functions],
    "own": [key for key, peer in PEERS.items() if peer.functions and peer.own],
    "classes": ["classes", "pybind11"],
}
"""The peers of each form."""

MEASURED = {"functions": "ours", "own": "ours", "classes": "classes"}
"""What the peers of each form are compared with."""


def figures_of(key: str, form: str) -> Dict[str, Figure]:
    """The figures of a peer in one form; the host's libraries must be there."""
    peer = PEERS[key]
    if form == "functions":
        assert peer.functions is not None
        return peer.build(importlib.import_module(peer.functions))
    assert peer.own is not None and peer.build_own is not None
    return peer.build_own(importlib.import_module(peer.own))
