"""The host of a test, as the test sees it."""

import importlib
import json
import os
import subprocess
from pathlib import Path
from typing import TYPE_CHECKING, Any, Dict, List, Mapping, Optional, Sequence, Tuple, Type, Union

from simhost._control import Control
from simhost._in_file import InFileControl
from simhost._ledger import Block, MemoryLeftOut, split_summary
from simhost._loaded import LoadedControl

if TYPE_CHECKING:
    import vswitch

Document = Union[Mapping[str, Any], str, "os.PathLike[str]"]
"""A scenario document: as a dict, or the name of a JSON file."""


class Clock:
    """The host's own clock, by which everything on it ages. It shows real time until it is told
    otherwise. Times are seconds, exact to the millisecond."""

    def __init__(self, control: Control) -> None:
        self._control = control

    @property
    def now(self) -> float:
        """Seconds since the beginning of 1970.

        >>> host.clock.stop()
        >>> host.clock.set(1000.5)
        >>> host.clock.now
        1000.5
        """
        return self._control.clock_now() / 1000

    def stop(self) -> None:
        """Stops the clock, so that it moves only by `step` and `set`.

        >>> host.clock.stop()
        >>> host.clock.now == host.clock.now
        True
        """
        self._control.clock_stop()

    def run(self) -> None:
        """Lets the clock run on from what it shows.

        >>> host.clock.stop()
        >>> host.clock.run()
        """
        self._control.clock_run()

    def step(self, seconds: float) -> None:
        """Moves the clock forward, whether or not it runs.

        >>> host.clock.stop()
        >>> before = host.clock.now
        >>> host.clock.step(299.999)
        >>> round(host.clock.now - before, 3)
        299.999
        """
        self._control.clock_step(_milliseconds(seconds))

    def set(self, seconds: float) -> None:
        """Sets what the clock shows.

        >>> host.clock.stop()
        >>> host.clock.set(86400)
        >>> host.clock.now
        86400.0
        """
        self._control.clock_set(_milliseconds(seconds))


class Link:
    """The cable of an uplink."""

    def __init__(self, control: Control, uplink: str) -> None:
        self._control = control
        self.uplink = uplink

    def up(self) -> None:
        """Plugs the cable in.

        >>> host.link("nic4").up()
        """
        self._control.set_link(self.uplink, True)

    def down(self) -> None:
        """Pulls the cable.

        >>> host.link("nic4").down()
        """
        self._control.set_link(self.uplink, False)

    def __repr__(self) -> str:
        return f"Link({self.uplink!r})"


class SimulatedHost:
    """A fresh host, and what comes to a host from outside.

    Names of files are beside the test. What the host refuses raises HostRefused with its reason.
    """

    def __init__(self, control: Control, scenario: Optional[Document], folder: Path) -> None:
        self._control = control
        self._scenario = scenario
        self._folder = folder
        self.clock = Clock(control)
        self.reset()

    def reset(self) -> None:
        """Makes the host as it was when the test began.

        >>> host.apply({"switches": [{"alias": "lab"}]})
        >>> host.reset()
        >>> [switch["alias"] for switch in host.describe()["switches"]]
        ['vswitch0']
        """
        self._control.reset(empty=self._scenario is not None)
        if self._scenario is not None:
            self.apply(self._scenario)

    def restart(self) -> None:
        """Restarts the host: what is volatile, learned or counted goes, and so do switches that are
        not persistent.

        >>> host.apply({"switches": [{"alias": "brief", "persistent": False}]})
        >>> host.restart()
        >>> [switch["alias"] for switch in host.describe()["switches"]]
        ['vswitch0']
        """
        self._control.restart()

    def apply(self, document: Document) -> None:
        """Changes the host as a scenario document says: all of it, or nothing of it.

        >>> host.apply({"switches": [{"alias": "lab", "mtu": 9000, "uplinks": ["nic0"]}]})
        """
        if isinstance(document, Mapping):
            text = json.dumps(document)
        else:
            text = (self._folder / document).read_text(encoding="utf-8")
        self._control.apply(text)

    def describe(self) -> Dict[str, Any]:
        """The whole host as a document that `apply` reads.

        >>> [uplink["name"] for uplink in host.describe()["uplinks"]]
        ['nic0', 'nic1', 'nic2', 'nic3', 'nic4', 'nic5']
        """
        described: Dict[str, Any] = json.loads(self._control.describe())
        return described

    def link(self, uplink: str) -> Link:
        """The cable of an uplink, to be pulled and plugged in.

        >>> host.link("nic4").down()
        """
        return Link(self._control, _text("uplink", uplink))

    def learn(
        self, switch: str, mac: str, port: Optional[str] = None, *, vlan: int = 0, vni: int = 0
    ) -> None:
        """A frame from an address arrives at a port, or without one beyond the uplinks.

        >>> host.learn("vswitch0", "02:00:00:00:0a:01", "web-1", vlan=10)
        """
        place = _text("switch", switch), _text("mac", mac), _optional_text("port", port)
        self._control.learn(*place, vlan, vni)

    def set_counter(
        self,
        switch: str,
        name: str,
        value: int,
        *,
        port: Optional[str] = None,
        session: Optional[str] = None,
    ) -> None:
        """Sets a counter of a switch, of one of its ports or of a mirror session.

        >>> host.set_counter("vswitch0", "txErrors", 3)
        """
        if not 0 <= value < 2**64:
            raise ValueError(f"a counter has 64 bits and no sign, which {value} does not fit")
        optional = _optional_text("port", port), _optional_text("session", session)
        self._control.set_counter(_text("switch", switch), _text("name", name), value, *optional)

    def fault(
        self,
        call: str,
        *,
        nth: int = 1,
        times: int = 1,
        status: Union[int, str, None] = None,
        panic: Optional[Tuple[Union[str, Type[BaseException]], str]] = None,
        delay: float = 0,
    ) -> None:
        """Lets the nth call of a function from now on fail, or wait.

        The call returns `status`, a number or a name; or it traps, which raises the
        exception that `panic` names, with its text; or it takes so many seconds longer, alone or
        before that. `times` calls are hit, with 0 all that follow.

        >>> host.fault("VSDVS_SetMTU", status="QEX_BUSY")
        >>> host.fault("VSDVS_SetMTU", nth=2, panic=(OSError, "the device is gone"))
        """
        if status is None and panic is None and not delay:
            raise ValueError(f"a fault of {call} takes a status, a panic or a delay")
        fault: Dict[str, Any] = {"call": _text("call", call), "nth": nth, "times": times}
        if status is not None:
            fault["status"] = status if isinstance(status, str) else _status_name(status)
        if panic is not None:
            fault["exception"], fault["message"] = _exception(panic)
        if delay:
            fault["delay"] = round(delay, 3)
        self.apply({"faults": [fault]})

    def clear_faults(self, call: Optional[str] = None) -> None:
        """Removes the faults of a function, or all.

        >>> host.fault("VSDVS_SetMTU", times=0, status="QEX_BUSY")
        >>> host.clear_faults("VSDVS_SetMTU")
        """
        self._control.clear_faults(_optional_text("call", call))


class Host(SimulatedHost):
    """The host of the test's own process; its state is in memory."""

    def __init__(self, scenario: Optional[Document], folder: Path) -> None:
        self._loaded = LoadedControl()
        self._out_before = frozenset(self._loaded.ledger())
        self._objects: Optional["vswitch.Host"] = None
        super().__init__(self._loaded, scenario, folder)

    @property
    def objects(self) -> "vswitch.Host":
        """The same host as `vswitch` has it: switches, ports and uplinks as objects.

        Who asks for it loads the classes of `libvswitch`, which flat functions return from then on.

        >>> host.objects.switches["vswitch0"].mtu = 9000
        >>> host.describe()["switches"][0]["mtu"]
        9000
        """
        if self._objects is None:
            # Only a test that asks for the objects pays for them, and needs them installed.
            from vswitch import Host as Objects

            # One for the whole test: a transaction sees the writes through its own host alone.
            self._objects = Objects(simulated=True)
        return self._objects

    def ledger(self) -> List[Block]:
        """The memory that the host has given out since the test began and not got back, oldest
        first.

        >>> import _libvswitch as vs
        >>> status, uplinks = vs.VSQEX_GetUplinks("vswitch0")
        >>> [str(block) for block in host.ledger()]
        ['VSQEX_GetUplinks: 80 bytes']
        >>> vs.VSQEX_FreeMemory(uplinks)
        >>> host.ledger()
        []
        """
        return [block for block in self._loaded.ledger() if block not in self._out_before]


class SharedHost(SimulatedHost):
    """A host in a file, for tools that are tested as the commands that they are."""

    def __init__(
        self,
        state_file: Path,
        scenario: Optional[Document],
        folder: Path,
        *,
        may_leave_memory: bool = False,
    ) -> None:
        in_file = InFileControl(state_file)
        self.state_file = state_file
        self.environment = in_file.environment
        """Lets commands that the test starts by itself find this host."""
        self._may_leave_memory = may_leave_memory
        super().__init__(in_file, scenario, folder)

    def run(
        self, command: Sequence[Union[str, "os.PathLike[str]"]], *, input: Optional[str] = None
    ) -> "subprocess.CompletedProcess[str]":
        """Runs a command on this host to its end, well or not.

        A command that leaves memory of the host out raises MemoryLeftOut, which fails the test.

        >>> import sys
        >>> program = "import _libvswitch as vs; print(vs.VSDVS_SetMTU('vswitch0', 9000))"
        >>> shared_host.run([sys.executable, "-c", program]).stdout
        '0\\n'
        """
        __tracebackhide__ = True  # pytest then shows the line of the test
        done = subprocess.run(
            _words(command),
            env={**self.environment, "SIMHOST_LEDGER": "1"},
            input=input,
            stdout=subprocess.PIPE,
            stderr=subprocess.PIPE,
            encoding="utf-8",
        )
        done.stderr, left = split_summary(done.stderr)
        if left and not self._may_leave_memory:
            raise MemoryLeftOut(f"the command {' '.join(done.args)}", left)
        return done


def _text(name: str, value: str) -> str:
    if not isinstance(value, str):
        raise TypeError(f"{name} is a str, not {value!r}")
    return value


def _optional_text(name: str, value: Optional[str]) -> Optional[str]:
    return None if value is None else _text(name, value)


def _exception(panic: Tuple[Union[str, Type[BaseException]], str]) -> Tuple[str, str]:
    """The name of an exception and its text."""
    if isinstance(panic, tuple) and len(panic) == 2:
        kind, text = panic
        if isinstance(kind, type) and issubclass(kind, BaseException):
            kind = kind.__name__
        if isinstance(kind, str) and isinstance(text, str):
            return kind, text
    raise TypeError(f"panic is an exception and its text, as in (OSError, 'gone'), not {panic!r}")


def _words(command: Sequence[Union[str, "os.PathLike[str]"]]) -> List[str]:
    if isinstance(command, (str, bytes, os.PathLike)):
        raise TypeError(f"a command is a list of words, not {command!r}")
    words = [_text("a word of a command", os.fspath(word)) for word in command]
    if not words:
        raise ValueError("a command has at least one word")
    return words


def _milliseconds(seconds: float) -> int:
    return round(seconds * 1000)


def _status_name(status: int) -> str:
    # The statuses come first among the module's constants.
    constants = vars(importlib.import_module("_libvswitch"))
    for name, value in constants.items():
        if value == status and name.startswith("QEX_") and status >= constants["QEX_FAILURE"]:
            return str(name)
    raise ValueError(f"{status} is no status of a failure")
