"""For how long frames stay away when something ends, or somebody else changes it."""

import os
import signal
import tempfile
import threading
import time
from pathlib import Path
from typing import Callable, Dict, Iterator, List, Sequence, Tuple

from frame_lab import ONE_SWITCH, Lab, comes_true
from simhost import Client, frame
from simhost._namespaces import PATIENCE

BETWEEN_FRAMES = 0.005
# That come before and after what happens.
STEADY = 100


class Stream:
    """Numbered frames from one client to another, and when each of them came."""

    def __init__(self, sender: Client, receiver: Client) -> None:
        self.came: List[float] = []
        self._sender, self._receiver = sender, receiver
        self._ends = threading.Event()
        self._threads = [threading.Thread(target=work) for work in (self._send, self._receive)]

    def __enter__(self) -> "Stream":
        for thread in self._threads:
            thread.start()
        return self

    def __exit__(self, *unused: object) -> None:
        self._ends.set()
        for thread in self._threads:
            thread.join()

    def await_more(self) -> None:
        """Until as many more came as show that they do."""
        wanted, deadline = len(self.came) + STEADY, time.monotonic() + PATIENCE
        while len(self.came) < wanted:
            if time.monotonic() > deadline:
                raise AssertionError("frames do not come back")
            time.sleep(BETWEEN_FRAMES)

    def _send(self) -> None:
        number, source = 0, self._sender.mac
        while not self._ends.wait(BETWEEN_FRAMES):
            number += 1
            payload = b"%08d" % number
            self._sender.send(frame("ff:ff:ff:ff:ff:ff", source, payload=payload.ljust(46)))

    def _receive(self) -> None:
        while not self._ends.is_set():
            try:
                self._receiver.expect(lambda came: came[14:22].isdigit(), timeout=0.1)
                self.came.append(time.monotonic())
            except (AssertionError, OSError):
                continue  # none, or no device


def longest(came: Sequence[float]) -> float:
    """Between two that followed each other."""
    return max(later - earlier for earlier, later in zip(came, came[1:]))


def kill(lab: Lab, program: str) -> None:
    os.kill(lab.processes()[program], signal.SIGKILL)


def start_daemon_anew(lab: Lab) -> None:
    lab.stop(signal.SIGKILL)
    lab.start()


def empty_bridge(lab: Lab) -> None:
    """Until its flows are there again: for a while frames go as Open vSwitch remembers."""
    (socket,) = lab.run_folder().glob("vs*.mgmt")
    wanted = len(lab.flows())
    lab.host.run("ovs-ofctl", "-OOpenFlow15", "del-flows", f"unix:{socket}")
    assert comes_true(lambda: len(lab.flows()) >= wanted)


def remake_device(lab: Lab, client: Client) -> None:
    lab.host.run("ip", "link", "delete", "c2")
    lab.wire("c2", client.namespace, "eth0")
    client.set_up()


def gaps(rounds: int) -> Iterator[Tuple[str, float]]:
    """What happens, and the longest time of all rounds in which no frame came, in seconds."""
    with tempfile.TemporaryDirectory() as folder, Lab(Path(folder), ONE_SWITCH) as lab:
        lab.start()
        one, other = lab.client("lab", "a"), lab.client("lab", "b")
        causes: Dict[str, Callable[[], None]] = {
            "ovs-vswitchd is killed": lambda: kill(lab, "ovs-vswitchd"),
            "ovsdb-server is killed": lambda: kill(lab, "ovsdb-server"),
            "simhostd is killed, and started": lambda: start_daemon_anew(lab),
            "a device is made anew": lambda: remake_device(lab, other),
            "somebody deletes all flows": lambda: empty_bridge(lab),
        }
        for name, cause in causes.items():
            found = []
            for _ in range(rounds):
                with Stream(one, other) as stream:
                    stream.await_more()
                    cause()
                    stream.await_more()
                found.append(longest(stream.came))
            yield name, max(found)
