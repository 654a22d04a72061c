#!/usr/bin/env python3
"""Hosts that share switches, while their databases, wires, daemons, states and callers fail by
chance, and what they say to the databases comes late, not, in part, or twice.

    fabric_by_chance.py [--seconds N] [--seed N]

Hosts and operators change the same things at once. In the end all is whole again. What the cluster
made of it, change by change, must be what was asked: each call that succeeded once, none that was
refused, and those of which nobody knew once or not at all; and all hosts must have what that comes
to.
"""

import json
import random
import re
import subprocess
import sys
import tempfile
import time
from pathlib import Path
from typing import Any, Callable, Dict, List, Sequence, Set

sys.path.insert(0, str(Path(__file__).parents[1] / "support"))

import seeds  # noqa: E402  (after the path is set)
from seeds import Outcome  # noqa: E402

import fabric_calls as calls_of  # noqa: E402
from fabric_calls import CTL, OPERATOR, Calls, Wanted  # noqa: E402
from fabric_history import Switch, Switches, Transaction, row_in, switches_in  # noqa: E402
from fabric_lab import (  # noqa: E402
    FabricLab,
    Host,
    are_reported,
    kept,
    killed,
    relay_of,
    restored,
    started,
)
from frame_lab import TOOLS, comes_true  # noqa: E402
from relays import FROM_HOST, TO_HOST  # noqa: E402

PROGRAM = str(TOOLS.parent / "bin" / "vswitch")
POOL = [f"p{number}" for number in range(4)]
"""Ports that are there to be contended for."""
LAB = {"switches": [{"alias": "lab", "max_ports": 5000, "ports": [{"id": id_} for id_ in POOL]}]}
SERVERS = 3
STEPS = 40
# What a host tells of a shared switch and of its ports, and others need not.
_OWN_OF_SWITCH = ("portset", "persistent", "running", "uplink_ports", "uplinks", "lags")
_OWN_OF_PORT = ("device", "client", "observed", "counters", "groups")


class Asking:
    """Who asks by chance for what."""

    def __init__(self, lab: FabricLab, chance: random.Random) -> None:
        self._lab = lab
        self._chance = chance
        self._numbers = iter(range(1280, 9000))
        self._shares: Dict[str, "subprocess.Popen[str]"] = {}
        self.calls = Calls()

    def ask(self) -> None:
        """Several hosts at once, each for something of the same."""
        chance = self._chance
        hosts = chance.sample(self._lab.hosts, chance.randint(1, len(self._lab.hosts)))
        kinds = (self._add, self._set_switch, self._set_port, self._move, self._remove, self._whole)
        (kind,) = chance.choices(kinds, weights=(2, 2, 3, 3, 2, 3))
        port = chance.choice(POOL)
        for host in hosts:
            wanted = kind(host, port)
            process = self.calls.on(host, wanted)
            if wanted.shares:
                self._shares[wanted.shares] = process
        if chance.random() < 0.3:
            self._operate(chance.choice(self._lab.hosts), port)

    def _number(self) -> int:
        """So that no two calls do the same."""
        return next(self._numbers)

    def _add(self, _: Host, __: str) -> Wanted:
        return calls_of.put_port([CTL], "lab", f"n{self._number()}")

    def _set_switch(self, _: Host, __: str) -> Wanted:
        return self._set_by([CTL])

    def _set_by(self, command: Sequence[str]) -> Wanted:
        number = self._number()
        kinds: List[Dict[str, Any]] = [{"mtu": number}, {"fabric": tunnels(number)}]
        settings = self._chance.choice(kinds)
        return calls_of.set_switch(command, "lab", **settings)

    def _set_port(self, _: Host, port: str) -> Wanted:
        return calls_of.put_port([CTL], "lab", port, external_id=f"vm-{self._number()}")

    def _move(self, host: Host, port: str) -> Wanted:
        if self._chance.random() < 0.7:
            return calls_of.connect(host.name, "lab", port, device_of(port))
        return calls_of.disconnect(host.name, "lab", port)

    def _remove(self, _: Host, port: str) -> Wanted:
        return calls_of.remove_port("lab", port)

    def _whole(self, host: Host, _: str) -> Wanted:
        """Of a switch that comes and goes."""
        name, number = host.name, self._number()
        aliases = self._shared_anew()
        if not aliases or self._chance.random() < 0.3:
            return calls_of.share(name, f"s{number}")
        alias = self._chance.choice(aliases[-3:])
        port = calls_of.add_port(name, alias, f"n{number}")
        (wanted,) = self._chance.choices(
            (calls_of.join(name, alias), calls_of.leave(name, alias), port), weights=(3, 1, 2)
        )
        return wanted

    def _shared_anew(self) -> List[str]:
        """Until that has ended they may get ports before they are shared."""
        return [alias for alias, process in self._shares.items() if process.poll() is not None]

    def _operate(self, host: Host, port: str) -> None:
        """By an operator, who reaches the databases as a host does."""
        command = [*self._lab.hub.words(), PROGRAM, "--fabric", relay_of(host).addresses]
        number = self._number()
        wanted = [
            calls_of.put_port(command, "lab", f"n{number}"),
            calls_of.put_port(command, "lab", port, external_id=f"vm-{number}"),
            self._set_by(command),
            calls_of.operator_removes_port(command, "lab", port),
            *(
                calls_of.operator_removes_switch(command, alias)
                for alias in self._shared_anew()[-1:]
            ),
        ]
        self.calls.begin(OPERATOR, self._chance.choice(wanted), None)


class Disturbed:
    """What fails, and is whole again later."""

    def __init__(self, lab: FabricLab, chance: random.Random, calls: Calls) -> None:
        self._lab = lab
        self._chance = chance
        self._calls = calls
        self._mends: List[Callable[[], None]] = []
        self._kept: Set[Host] = set()
        self.restored: List[str] = []

    def disturb(self) -> None:
        if len(self._mends) > 1 or (self._mends and self._chance.random() < 0.5):
            self.mend_one()
            return
        host = self._chance.choice(self._lab.hosts)
        disturbances = [
            *(self._kill_database, self._pause, self._hang, self._cut, self._kill_daemon),
            *(self._slow, self._hold, self._repeat, self._cut_in_a_message, self._restore),
        ]
        self._chance.choice(disturbances)(host)

    def keep(self) -> None:
        """The state of a host, as it is now."""
        host = self._chance.choice(self._lab.hosts)
        kept(host, "kept")
        self._kept.add(host)

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

    def _hang(self, _: Host) -> None:
        databases = self._lab.databases
        server = self._chance.choice(databases.running())
        databases.pause(server)

        def resume() -> None:
            if server in databases.running():
                databases.resume(server)

        self._mends.append(resume)

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

    def _restore(self, host: Host) -> None:
        """To the state of another time."""
        if host.daemon is None or host not in self._kept:
            return
        killed(host)
        # Callers go on with the file that they have.
        self._calls.end(host.name)
        restored(host, "kept")
        self.restored.append(host.name)
        self._mends.append(host.start)


def tunnels(key: int) -> Dict[str, Any]:
    """To nobody: all that is asked is whose key it is."""
    return {"encapsulation": "geneve", "key": key, "peers": []}


def device_of(port: str) -> str:
    """The same on each host."""
    return f"tap-{port}"


def with_devices(host: Host) -> Host:
    for port in POOL:
        ends = "name", device_of(port), "type", "veth", "peer", "name", f"far-{port}"
        host.host.run("ip", "link", "add", *ends)
    return host


def run(seed: int, steps: int = STEPS, hosts: int = 3) -> Outcome:
    """How many calls were made, and what is wrong with what came of them."""
    chance = random.Random(seed)
    with tempfile.TemporaryDirectory() as folder, FabricLab(Path(folder), SERVERS) as lab:
        first = started(with_devices(lab.relayed(lab.host("h0", LAB))))
        first.ctl("share", "lab")
        for number in range(1, hosts):
            started(with_devices(lab.relayed(lab.host(f"h{number}")))).ctl("join", "lab")
        asking = Asking(lab, chance)
        disturbed = Disturbed(lab, chance, asking.calls)
        for _ in range(steps):
            asking.ask()
            if chance.random() < 0.4:
                disturbed.disturb()
            if chance.random() < 0.1:
                asking.calls.kill_one(chance)
            if chance.random() < 0.1:
                disturbed.keep()
            time.sleep(chance.random() * 0.1)
        disturbed.mend()
        asking.calls.end()
        last = calls_of.put_port([CTL], "lab", "last")
        assert comes_true(lambda: begun_and_made(asking.calls, first, last))
        wrong = found_wrong(lab, asking.calls, disturbed.restored)
        logs = [host.log() for host in lab.hosts] if wrong else []
    return len(asking.calls.all), [f"seed {seed}: {problem}" for problem in wrong] + logs


def begun_and_made(calls: Calls, host: Host, wanted: Wanted) -> bool:
    calls.on(host, wanted)
    calls.end(host.name)
    return calls.all[-1].outcome == "made"


def found_wrong(lab: FabricLab, calls: Calls, were_restored: Sequence[str]) -> List[str]:
    """Once all is whole."""
    # The server that is asked may know less than the one that told a host.
    assert comes_true(lambda: "last" in {row["id"] for row in lab.databases.rows("Port")})
    if not comes_true(lambda: are_reported(lab)):
        return [f"not all is in force: {lab.databases.rows('Host')}"]
    made = lab.databases.history()
    begin = next(at for at, one in enumerate(made) if len(hosts_of_lab(one)) == len(lab.hosts))
    wrong = calls_of.wrong(calls.all, made[begin + 1 :], made[begin], were_restored)
    fabric = switches_in(
        map(row_in, lab.databases.rows("Switch")), map(row_in, lab.databases.rows("Port"))
    )
    wrong += ["the fabric has other than its log"] * (fabric != made[-1].switches)
    wrong += decided_otherwise(lab, made)
    for host in lab.hosts:
        wrong += differences(host, fabric, host.name in were_restored)
    return wrong + unlike(lab, fabric)


def hosts_of_lab(transaction: Transaction) -> Sequence[str]:
    return sorted(transaction.switches.get("lab", Switch()).hosts)


def decided_otherwise(lab: FabricLab, made: Sequence[Transaction]) -> List[str]:
    """What hosts said of changes of which nobody knew."""
    ids = [one.change for one in made]
    found = [f"made twice: {one}" for one in set(ids) if ids.count(one) > 1]
    for host in lab.hosts:
        said = re.findall(r"the change (\w+) of which nobody knew was (not )?made", host.log())
        found += [
            f"{host.name} says otherwise of {change}"
            for change, no in said
            if (change in ids) == bool(no)
        ]
    return found


def told(host: Host) -> Dict[str, Any]:
    """Of its switches."""
    switches = json.loads(host.ctl("show", "--json"))["switches"]
    for switch in switches:
        if "fabric" in switch:
            # What the uplink is called is the host's own.
            del switch["fabric"]["uplink"]
    return {one["alias"]: one for one in switches}


def differences(host: Host, fabric: Switches, was_restored: bool) -> List[str]:
    """Between what a host has and what it shares."""
    found, seen = [], told(host)
    for alias, switch in fabric.items():
        if host.name not in switch.hosts:
            # One that it had before it shared it may have come back.
            found += [f"{host.name} has {alias} yet"] * (alias in seen and not was_restored)
            continue
        there = seen.get(alias, {"ports": []})
        ports = {
            one["id"]: (one.get("external_id"), host.name if "device" in one else "")
            for one in there["ports"]
        }
        expected = {
            id_: (port.settings.get("external_id"), port.host if port.host == host.name else "")
            for id_, port in switch.ports.items()
        }
        settings = {name: there.get(name) for name in switch.settings}
        if (settings, ports) != (switch.settings, expected):
            has, is_to_have = (settings, ports), (switch.settings, expected)
            found.append(f"{host.name} has {alias} as {has}, and is to have {is_to_have}")
    return found


def unlike(lab: FabricLab, fabric: Switches) -> List[str]:
    """What hosts tell differently of the same switch."""
    found = []
    for alias, switch in fabric.items():
        said = {
            host.name: shared_of(told(host)[alias])
            for host in lab.hosts
            if host.name in switch.hosts and alias in told(host)
        }
        if any(one != next(iter(said.values())) for one in said.values()):
            found.append(f"hosts have {alias} differently: {said}")
    return found


def shared_of(switch: Dict[str, Any]) -> Dict[str, Any]:
    """Without what is each host's own."""
    left = {name: value for name, value in switch.items() if name not in _OWN_OF_SWITCH}
    left["ports"] = {
        port["id"]: {name: value for name, value in port.items() if name not in _OWN_OF_PORT}
        for port in switch["ports"]
    }
    return left


if __name__ == "__main__":
    sys.exit(seeds.main(run))
