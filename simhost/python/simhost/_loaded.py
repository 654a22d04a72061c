"""The simulated host that this process has loaded, through the functions that it exports.

They are looked up from the module, whose libraries are the host: so they are those of the one core
that the module's calls reach, whatever else lies in the library path.
"""

import contextlib
import ctypes
import functools
import importlib
import os
import shutil
from pathlib import Path
from typing import Any, Iterator, List, Optional

from simhost import _ledger
from simhost._control import EMPTY, Control, HostRefused

_TEXT, _STATUS, _MILLISECONDS = ctypes.c_char_p, ctypes.c_int, ctypes.c_int64
_NUMBER, _SIZE = ctypes.c_uint32, ctypes.c_size_t
_SIGNATURES = {
    "simhost_error": (_TEXT, []),
    "simhost_apply": (_STATUS, [_TEXT]),
    "simhost_describe": (_SIZE, [_TEXT, _SIZE]),
    "simhost_state_file": (_SIZE, [_TEXT, _SIZE]),
    "simhost_restart": (_STATUS, []),
    "simhost_reset": (_STATUS, []),
    "simhost_clock_now": (_MILLISECONDS, []),
    "simhost_clock_stop": (_STATUS, []),
    "simhost_clock_run": (_STATUS, []),
    "simhost_clock_step": (_STATUS, [_MILLISECONDS]),
    "simhost_clock_set": (_STATUS, [_MILLISECONDS]),
    "simhost_set_link": (_STATUS, [_TEXT, ctypes.c_int]),
    "simhost_learn": (_STATUS, [_TEXT, _TEXT, _TEXT, ctypes.c_uint16, _NUMBER]),
    "simhost_set_counter": (_STATUS, [_TEXT, _TEXT, _TEXT, _TEXT, ctypes.c_uint64]),
    "simhost_clear_faults": (_STATUS, [_TEXT]),
    "simhost_ledger_report": (_SIZE, [_TEXT, _SIZE]),
}
_DOCTOR = "python3 -m libvswitch.doctor says which host is loaded, and from where."


class NotSimulated(Exception):
    """The host under the module is no simulated one, or there is none."""


class _DlInfo(ctypes.Structure):
    _fields_ = [
        ("file", ctypes.c_char_p),
        ("base", ctypes.c_void_p),
        ("symbol", ctypes.c_char_p),
        ("address", ctypes.c_void_p),
    ]


class LoadedControl(Control):
    """The host of this process. The state is the one that the process began with."""

    def __init__(self) -> None:
        self._library = _library()

    def state_file(self) -> Optional[Path]:
        """The file in which the host of this process is kept, whatever the environment says by now;
        None for a host in memory."""
        name = self._text("state_file")
        refusal = self._refusal()
        if str(refusal):
            raise refusal
        return Path(name) if name else None

    def reset(self, *, empty: bool) -> None:
        file = self.state_file()
        if file is not None:
            raise HostRefused(
                f"the host of this process is kept in {file}, which other processes may use and a"
                " reset would empty: SIMHOST_STATE named it when the host was first used"
            )
        with _fresh_hosts_are(EMPTY if empty else None):
            self._do("reset")

    def restart(self) -> None:
        self._do("restart")

    def apply(self, document: str) -> None:
        self._do("apply", document.encode())

    def describe(self) -> str:
        return self._text("describe")

    def set_link(self, uplink: str, up: bool) -> None:
        self._do("set_link", uplink.encode(), up)

    def learn(self, switch: str, mac: str, port: Optional[str], vlan: int, vni: int) -> None:
        self._do("learn", switch.encode(), _or_null(port), mac.encode(), vlan, vni)

    def set_counter(
        self, switch: str, name: str, value: int, port: Optional[str], session: Optional[str]
    ) -> None:
        place = switch.encode(), _or_null(port), _or_null(session)
        self._do("set_counter", *place, name.encode(), value)

    def clear_faults(self, call: Optional[str]) -> None:
        self._do("clear_faults", _or_null(call))

    def clock_now(self) -> int:
        now = int(self._library.simhost_clock_now())
        if now < 0:
            raise self._refusal()
        return now

    def clock_stop(self) -> None:
        self._do("clock_stop")

    def clock_run(self) -> None:
        self._do("clock_run")

    def clock_step(self, milliseconds: int) -> None:
        self._do("clock_step", milliseconds)

    def clock_set(self, milliseconds: int) -> None:
        self._do("clock_set", milliseconds)

    def ledger(self) -> List[_ledger.Block]:
        """The blocks that are out, oldest first."""
        return _ledger.blocks_of(self._text("ledger_report"))

    def _do(self, function: str, *arguments: Any) -> None:
        if getattr(self._library, f"simhost_{function}")(*arguments) != 0:
            raise self._refusal()

    def _text(self, function: str) -> str:
        write = getattr(self._library, f"simhost_{function}")
        size = write(None, 0)
        while True:
            text = ctypes.create_string_buffer(size + 1)
            # Another thread may have made it longer in between.
            size = write(text, len(text))
            if size < len(text):
                return os.fsdecode(text.value)

    def _refusal(self) -> HostRefused:
        return HostRefused(self._library.simhost_error().decode())


def library_file() -> Path:
    """The file of the simulated host's core; NotSimulated if the host is another."""
    return _file_of(_library().simhost_error)


def program(name: str, package: str) -> Path:
    """A program beside the loaded host, whose version it has; a system may keep it with its
    commands. NotSimulated if it is nowhere."""
    beside = library_file().with_name(name)
    if beside.exists():
        return beside
    found = shutil.which(name)
    if found is None:
        raise NotSimulated(
            f"{name} is neither {beside} nor in PATH: Debian's package {package} has it"
        )
    return Path(found)


@functools.lru_cache(maxsize=None)
def _library() -> ctypes.CDLL:
    try:
        module = importlib.import_module("_libvswitch")
    except ImportError as error:
        raise NotSimulated(f"tests need the simulated host, and {error}. {_DOCTOR}") from error
    library = ctypes.CDLL(module.__file__)
    try:
        for name, (result, parameters) in _SIGNATURES.items():
            function = getattr(library, name)
            function.restype, function.argtypes = result, parameters
    except AttributeError:
        raise NotSimulated(
            f"tests need the simulated host, and {_file_of(library.VSDVS_SetMTU)} is another: no"
            " test touches it. Let LD_LIBRARY_PATH name the folder of the simulated host's"
            f" libraries before Python starts. {_DOCTOR}"
        ) from None
    return library


def _file_of(function: Any) -> Path:
    info = _DlInfo()
    ctypes.CDLL(None).dladdr(ctypes.cast(function, ctypes.c_void_p), ctypes.byref(info))
    return Path(os.fsdecode(info.file))


@contextlib.contextmanager
def _fresh_hosts_are(document: Optional[Path]) -> Iterator[None]:
    """What the shell has chosen for fresh hosts is not what a test was written for."""
    chosen = os.environ.pop("SIMHOST_SCENARIO", None)
    if document is not None:
        os.environ["SIMHOST_SCENARIO"] = str(document)
    try:
        yield
    finally:
        os.environ.pop("SIMHOST_SCENARIO", None)
        if chosen is not None:
            os.environ["SIMHOST_SCENARIO"] = chosen


def _or_null(text: Optional[str]) -> Optional[bytes]:
    return None if text is None else text.encode()
