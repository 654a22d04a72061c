#!/usr/bin/env python3
"""Hosts that share a switch, while their databases, wires, daemons and callers fail by chance, and
what they say to the databases comes late, not, in part, or twice.

    fabric_by_chance.py [--seconds N] [--seed N]

In the end all is whole again, and all hosts must have the same: each port that a call added with
success, none of a call that was refused, and those of which nobody knew once or not at all.
"""

import json
import random
import subprocess
import sys
import tempfile
import time
from pathlib import Path
from typing import Any, Callable, Dict, List, Optional, Sequence, Set

sys.path.insert(0, str(Path(__file__).parents[1] / "support"))

import seeds  # noqa: E402  (after the path is set)
from seeds import Outcome  # noqa: E402

from fabric_lab import FabricLab, Host, killed, started  # noqa: E402
from frame_lab import TOOLS, comes_true  # noqa: E402
from relays import FROM_HOST, TO_HOST, Relay  # noqa: E402

PROGRAM = TOOLS.parent / "bin" / "vswitch"
LAB = {"switches": [{"alias": "lab", "max_ports": 5000}]}
_UNKNOWN = ("QEX_TIMEOUT", "nobody knows whether the change")
SERVERS = 3
STEPS = 40


class Calls:
    """Calls that add a port each, in processes of their own."""

    def __init__(self) -> None:
        self._running: Dict[str, "subprocess.Popen[str]"] = {}
        self.made: Set[str] = set()
        self.refused: Dict[str, str] = {}
        self.unknown: Set[str] = set()

    def begin(self, host: Host, name: str) -> None:
        """On a host."""
        self._begin([TOOLS / "simhostctl", "apply", "-"], name, host.environment)

    def operate(self, lab: FabricLab, relay: Relay, name: str) -> None:
        """By an operator, who reaches the databases as a host does."""
        command = [*lab.hub.words(), PROGRAM, "--fabric", relay.addresses, "apply", "-"]
        self._begin(command, name)

    def _begin(
        self, command: Sequence[Any], name: str, environment: Optional[Dict[str, str]] = None
    ) -> None:
        call = subprocess.Popen(
            command,
            env=environment,
            stdin=subprocess.PIPE,
            stdout=subprocess.DEVNULL,
            stderr=subprocess.PIPE,
            text=True,
        )
        assert call.stdin is not None
        call.stdin.write(json.dumps({"switches": [{"alias": "lab", "ports": [{"id": name}]}]}))
        call.stdin.close()
        call.stdin = None
        self._running[name] = call

    def kill_one(self, chance: random.Random) -> None:
        if self._running:
            self._running[chance.choice(sorted(self._running))].kill()

    def end(self) -> None:
        for name, call in self._running.items():
            said = call.communicate(timeout=60)[1]
            if call.returncode == 0:
                self.made.add(name)
            elif "QEX_BUSY" in said or _is_operators_refusal(call.returncode, said):
                self.refused[name] = said.strip()
            else:
                assert call.returncode < 0 or any(word in said for word in _UNKNOWN), said
                self.unknown.add(name)
        self._running.clear()

    def wrong(self, ports: Set[str]) -> List[str]:
        lost = [f"the port {name} was added, and is lost" for name in sorted(self.made - ports)]
        return lost + [
            f"the port {name} is there, and was refused: {said}"
            for name, said in sorted(self.refused.items())
            if name in ports
        ]


def _is_operators_refusal(status: int, said: str) -> bool:
    return status == 1 and said.startswith("vswitch: ")


class Disturbed:
    """What fails, and is whole again later."""

    def __init__(self, lab: FabricLab, chance: random.Random) -> None:
        self._lab = lab
        self._chance = chance
        self._mends: List[Callable[[], None]] = []

    def disturb(self) -> None:
        if len(self._mends) > 1 or (self._mends and self._chance.random() < 0.5):
            self.mend_one()
            return
        host = self._chance.choice(self._lab.hosts)
        disturbances = [
            *(self._kill_database, self._pause, self._cut, self._kill_daemon),
            *(self._slow, self._hold, self._repeat, self._cut_in_a_message),
        ]
        self._chance.choice(disturbances)(host)

    def mend_one(self) -> None:
        self._mends.pop(0)()

    def mend(self) -> None:
        while self._mends:
            self.mend_one()

    def _kill_database(self, _: Host) -> None:
        databases = self._lab.databases
        running = databases.running()
        if len(running) == SERVERS:
            server = self._chance.choice(running)
            databases.kill(server)
            self._mends.append(lambda: databases.start(server))

    def _pause(self, _: Host) -> None:
        self._lab.databases.pause()
        time.sleep(self._chance.random())
        self._lab.databases.resume()

    def _cut(self, host: Host) -> None:
        self._lab.cut(host)
        self._mends.append(lambda: self._lab.cut(host, up=True))

    def _slow(self, host: Host) -> None:
        relay = relay_of(host)
        relay.delay(self._chance.random())
        self._mends.append(lambda: relay.delay(0))

    def _hold(self, host: Host) -> None:
        relay = relay_of(host)
        relay.hold()
        self._mends.append(relay.release)

    def _repeat(self, host: Host) -> None:
        relay = relay_of(host)
        relay.repeat()
        self._mends.append(lambda: relay.repeat(False))

    def _cut_in_a_message(self, host: Host) -> None:
        relay_of(host).cut(self._chance.choice([FROM_HOST, TO_HOST]))

    def _kill_daemon(self, host: Host) -> None:
        if host.daemon is not None:
            killed(host)
            self._mends.append(host.start)


def relay_of(host: Host) -> Relay:
    assert host.relay is not None
    return host.relay


def ports_of(host: Host) -> Set[str]:
    return set(host.ports("lab"))


def run(seed: int, steps: int = STEPS, hosts: int = 3) -> Outcome:
    """How many calls were made, and what is wrong with what came of them."""
    chance = random.Random(seed)
    calls = Calls()
    with tempfile.TemporaryDirectory() as folder, FabricLab(Path(folder), SERVERS) as lab:
        first = started(lab.relayed(lab.host("h0", LAB)))
        first.ctl("share", "lab")
        for number in range(1, hosts):
            started(lab.relayed(lab.host(f"h{number}"))).ctl("join", "lab")
        # The server that is asked below may know less than the one that told a host.
        assert comes_true(lambda: len(hosts_of_the_switch(lab)) == hosts)
        before = revision(lab)
        disturbed = Disturbed(lab, chance)
        for step in range(steps):
            for host in chance.sample(lab.hosts, chance.randint(1, hosts)):
                calls.begin(host, f"{step}-{host.name}")
            if chance.random() < 0.2:
                calls.operate(lab, relay_of(chance.choice(lab.hosts)), f"{step}-operator")
            if chance.random() < 0.4:
                disturbed.disturb()
            if chance.random() < 0.1:
                calls.kill_one(chance)
            time.sleep(chance.random() * 0.1)
        disturbed.mend()
        calls.end()
        last = f"last-{first.name}"
        assert comes_true(lambda: add(first, last))
        assert comes_true(lambda: all(last in ports_of(host) for host in lab.hosts))
        found = [ports_of(host) for host in lab.hosts]
        wrong = [problem for ports in found for problem in calls.wrong(ports)]
        wrong += ["hosts have different ports"] * (found.count(found[0]) != len(found))
        assert comes_true(lambda: last in {row["id"] for row in lab.databases.rows("Port")})
        in_fabric = {str(row["id"]) for row in lab.databases.rows("Port")}
        wrong += ["the fabric has other ports"] * (in_fabric != found[0])
        # Each call is a change.
        made = revision(lab) - before
        wrong += [f"{made} changes made {len(in_fabric)} ports"] * (made != len(in_fabric))
        logs = [host.log() for host in lab.hosts] if wrong else []
    total = len(calls.made) + len(calls.refused) + len(calls.unknown)
    return total, [f"seed {seed}: {problem}" for problem in wrong] + logs


def hosts_of_the_switch(lab: FabricLab) -> Set[str]:
    (row,) = lab.databases.rows("Switch")
    said = row["hosts"]
    return set(said[1]) if isinstance(said, list) else {said}


def revision(lab: FabricLab) -> int:
    (row,) = lab.databases.rows("Fabric")
    return int(row["revision"])


def add(host: Host, name: str) -> bool:
    document = {"switches": [{"alias": "lab", "ports": [{"id": name}]}]}
    return host.try_ctl("apply", "-", given=json.dumps(document)).returncode == 0


if __name__ == "__main__":
    sys.exit(seeds.main(run))
