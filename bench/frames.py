#!/usr/bin/env python3
"""What real frames cost through the simulated host's pipeline, and what its changes do.

    frames.py [--quick]

BUILD_DIR names what was built. Each figure is of this run, and those that have a peer are ratios to
it, measured in turns. It takes root's rights or user namespaces, and leaves nothing.
"""

import argparse
import json
import os
import re
import subprocess
import sys
import tempfile
import time
from pathlib import Path
from statistics import median
from typing import Dict, Iterator, List, NamedTuple, Sequence, Tuple

from come_back import gaps
from targets import FRAMES, NOISE

from frame_lab import Lab
from lasting_open_vswitch import LastingOpenVSwitch
from many_ports import SWITCH, ManyPorts, many_ports
from simhost import Client


class Effort(NamedTuple):
    """How much is measured."""

    turns: int
    seconds: float  # of one stream
    pings: int
    rounds: int
    calls: int
    ports: Sequence[int]  # of the switches of which a setting is changed
    large: int  # ports of the switch that is made from nothing
    flooded: int
    broadcasts: int
    resynced: int  # ports of the switch whose flows are gone
    ends: int  # of each of what frames come back after


FULL = Effort(9, 0.5, 3_000, 9, 20, (100, 1_000), 1_000, 3_000, 20, 500, 5)
QUICK = Effort(2, 0.1, 200, 2, 5, (10, 100), 100, 300, 3, 100, 1)


class Row(NamedTuple):
    """A figure, and what it is to be, if FRAMES has something of that name."""

    name: str
    value: float
    unit: str
    target: str = ""

    def is_met(self) -> bool:
        bounds = FRAMES.get(self.target, {})
        least, most = bounds.get("least", 0.0), bounds.get("most", float("inf"))
        return least * (1 - NOISE) <= self.value <= most * (1 + NOISE)

    def __str__(self) -> str:
        words = ", ".join(
            f"at {word} {bound:g}" for word, bound in FRAMES.get(self.target, {}).items()
        )
        verdict = f"   {words}: {'met' if self.is_met() else 'missed'}" if words else ""
        return f"{self.name:56}{self.value:>10.3f} {self.unit:12}{verdict}"


# Frames.

RECEIVE = """
import socket, time
with socket.create_server(("", 5000)) as server:
    print(flush=True)
    stream = server.accept()[0]
    started, count, buffer = time.perf_counter(), 0, bytearray(1 << 20)
    while size := stream.recv_into(buffer):
        count += size
    print(count * 8 / (time.perf_counter() - started) / 1e9)
"""
SEND = """
import socket, sys, time
data, deadline = bytes(1 << 18), time.perf_counter() + float(sys.argv[2])
with socket.create_connection((sys.argv[1], 5000)) as stream:
    while time.perf_counter() < deadline:
        stream.sendall(data)
"""


def stream(one: Client, other: Client, seconds: float) -> float:
    """Gbit/s of one TCP stream."""
    with other.namespace.start(sys.executable, "-c", RECEIVE, stdout=-1) as receiver:
        assert receiver.stdout is not None and receiver.stdout.readline()
        one.namespace.run(sys.executable, "-c", SEND, other.address, str(seconds))
        return float(receiver.communicate()[0])


def round_trip(one: Client, other: Client, pings: int) -> float:
    """Microseconds, each ping sent when the one before was replied to."""
    said = one.namespace.run("ping", "-q", "-f", "-c", str(pings), other.address)
    found = re.search(r" 0% packet loss.*\n.* = [\d.]+/([\d.]+)/", said)
    assert found, said
    return float(found.group(1)) * 1e3


def switch_clients(lab: Lab) -> Tuple[Client, Client]:
    """Two at a switch of the host."""
    return lab.client(SWITCH, "a"), lab.client(SWITCH, "b")


def normal_clients(lab: Lab) -> Tuple[Client, Client]:
    """Two at a bridge beside the host's, in the same data path, that forwards by itself."""
    far = [lab.frames.new_namespace() for _ in range(2)]
    for number, namespace in enumerate(far):
        lab.wire(f"n{number}", namespace, "eth0")
    lab.host.run(
        *("ovs-vsctl", f"--db=unix:{lab.run_folder()}/db.sock", "add-br", "normal"),
        *("--", "set", "Bridge", "normal", "datapath_type=netdev"),
        *("--", "add-port", "normal", "n0", "--", "add-port", "normal", "n1"),
    )
    return lab.frames.new_client(far[0]), lab.frames.new_client(far[1])


def frame_rows(effort: Effort) -> Iterator[Row]:
    document = {"switches": [{"alias": SWITCH, "ports": [{"id": "a"}, {"id": "b"}]}]}
    with tempfile.TemporaryDirectory() as folder, Lab(Path(folder), document) as lab:
        lab.start()
        pairs = [switch_clients(lab), normal_clients(lab)]
        for one, other in pairs:
            assert one.comes_to_reach(other)
            for client in one, other:
                # Nobody takes the frames that it would keep.
                client.close()
        streams: List[List[float]] = []
        trips: List[List[float]] = []
        for turn in range(effort.turns):
            order = pairs if turn % 2 == 0 else pairs[::-1]
            gained = {pair: stream(*pair, effort.seconds) for pair in order}
            taken = {pair: round_trip(*pair, effort.pings) for pair in order}
            streams.append([gained[pair] for pair in pairs])
            trips.append([taken[pair] for pair in pairs])
    for at, whose in enumerate(("the pipeline", "NORMAL")):
        yield Row(f"TCP through {whose}", max(turn[at] for turn in streams), "Gbit/s")
        yield Row(f"ping through {whose}", min(turn[at] for turn in trips), "us")
    yield Row("TCP to NORMAL's", median(ours / peers for ours, peers in streams), "", "throughput")
    yield Row("ping to NORMAL's", median(ours / peers for ours, peers in trips), "", "round trip")


# Calls.


def best_of_calls(ports: int, effort: Effort) -> Dict[str, float]:
    """Milliseconds of a call, in the best round, on the host that SIMHOST_STATE names."""
    import _libvswitch as vs

    security = vs.new_VSPropSecurity()

    def change(index: int) -> int:
        vlan = 8 + index // ports % 2
        return int(
            vs.VSDVS_SetPortVLANPolicy(SWITCH, f"port-{index % ports}", vlan, 0, 0, 0, None, 0)
        )

    def question(index: int) -> int:
        return int(vs.VSDVS_GetPortSecurity(SWITCH, f"port-{index % ports}", security))

    best = {}
    for name, call, calls in ("change", change, effort.calls), ("question", question, 500):
        rounds = []
        for first in range(effort.rounds):
            started = time.perf_counter()
            statuses = {call(first * calls + index) for index in range(calls)}
            rounds.append((time.perf_counter() - started) / calls * 1e3)
            assert statuses == {vs.QEX_OK}, statuses
        best[name] = min(rounds)
    vs.delete_VSPropSecurity(security)
    return best


def calls_apart(lab: Lab, ports: int, quick: bool) -> Dict[str, float]:
    """Likewise, in a process of its own on the host of a lab."""
    options = ["--quick"] if quick else []
    done = subprocess.run(
        [sys.executable, __file__, *options, "--calls", str(ports)],
        env=lab.environment,
        check=True,
        stdout=subprocess.PIPE,
        text=True,
    )
    best: Dict[str, float] = json.loads(done.stdout)
    return best


def change_rows(effort: Effort, quick: bool) -> Iterator[Row]:
    for ports in effort.ports:
        with many_ports(ports) as many:
            many.lab.start()
            many.apply()
            best = calls_apart(many.lab, ports, quick)["change"]
            # Calls that end before their change is in force would be too fast.
            many.wait()
        yield Row(f"a change in force, {ports:,} ports", best, "ms", f"change, {ports:,} ports")


def call_rows(effort: Effort, quick: bool) -> Iterator[Row]:
    """Beside a host without a daemon, in turns."""
    ports = 3
    with many_ports(ports) as with_daemon, many_ports(ports) as without:
        with_daemon.lab.start()
        with_daemon.apply()
        without.document["switches"][0]["ports"] = [
            {"id": port["id"], "vlan": port["vlan"]}
            for port in without.document["switches"][0]["ports"]
        ]
        without.lab.apply(without.document)
        turns = [
            [calls_apart(many.lab, ports, quick) for many in (with_daemon, without)]
            for _ in range(effort.turns)
        ]
    for name, unit in ("change", "ms"), ("question", "ms"):
        ours, theirs = (min(turn[at][name] for turn in turns) for at in (0, 1))
        yield Row(f"a {name}, with a daemon", ours, unit)
        yield Row(f"a {name}, without", theirs, unit)
        if name == "change":
            yield Row("a daemon adds to a change", ours - theirs, unit, "added to a change")
        else:
            ratio = median(turn[0][name] / turn[1][name] for turn in turns)
            yield Row("a question with to one without", ratio, "", "question")


# Many ports.


def from_nothing_rows(effort: Effort) -> Iterator[Row]:
    with many_ports(effort.large) as many:
        many.lab.start()
        seconds = many.apply()
    yield Row(f"a switch of {effort.large:,} ports from nothing", seconds, "s", "from nothing")


FLOOD = """
import socket, sys, time
def at(device):
    end = socket.socket(socket.AF_PACKET, socket.SOCK_RAW, socket.htons(3))
    end.bind((device, 0))
    end.settimeout(10)
    return end
sender, receiver = at("f0"), at(sys.argv[1])
frame = b"\\xff" * 6 + bytes([2, 0, 0, 0, 0, 1]) + b"\\x88\\xb5" + bytes(46)
best = float("inf")
for _ in range(int(sys.argv[2])):
    started = time.perf_counter()
    sender.send(frame)
    receiver.recv(2000)
    best = min(best, time.perf_counter() - started)
    time.sleep(0.05)
print(best * 1e3)
"""


def flood(many: ManyPorts, ports: int, broadcasts: int) -> float:
    """Milliseconds until the last port has a broadcast of the first. All have each of them once."""
    before = many.received()
    words = [sys.executable, "-c", FLOOD, f"f{ports - 1}", str(broadcasts)]
    best = float(many.far.run(*words))
    time.sleep(1)
    check_copies([after - earlier for earlier, after in zip(before, many.received())], broadcasts)
    return best


def check_copies(counts: List[int], broadcasts: int) -> None:
    """Raises AssertionError unless all but the first port have each broadcast once."""
    assert counts == [0] + [broadcasts] * (len(counts) - 1), sorted(set(counts))


def flood_rows(effort: Effort) -> Iterator[Row]:
    with many_ports(effort.flooded) as many:
        many.lab.start()
        many.apply()
        best = flood(many, effort.flooded, effort.broadcasts)
    yield Row(f"a broadcast to {effort.flooded:,} ports of a VLAN", best, "ms")


def empty_bridges(lab: Lab) -> None:
    for socket in lab.run_folder().glob("vs*.mgmt"):
        for command in "del-flows", "del-groups":
            lab.host.run("ovs-ofctl", "-OOpenFlow15", command, f"unix:{socket}")


def time_of_main_thread(process: int) -> float:
    """Seconds of a processor that it has taken so far."""
    stat = Path(f"/proc/{process}/task/{process}/stat").read_text(encoding="utf-8")
    user, system = stat.rpartition(")")[2].split()[11:13]
    return (int(user) + int(system)) / os.sysconf("SC_CLK_TCK")


def resync_rows(effort: Effort) -> Iterator[Row]:
    """A daemon that starts beside an Open vSwitch whose flows are gone."""
    with many_ports(effort.resynced) as many, LastingOpenVSwitch(
        many.lab.host, many.lab.run_folder()
    ) as open_vswitch:
        lab = many.lab
        # As many flows as are to be told: each range that a client tags takes two.
        for port in many.document["switches"][0]["ports"]:
            port["vlan"] = {"id": 7, "trunk": ["10-12"]}
        lab.start(open_vswitch.where)
        many.apply()
        switch = lab.processes()["ovs-vswitchd"]
        seconds, flows = [], 0
        for _ in range(min(effort.rounds, 5)):
            lab.stop()
            empty_bridges(lab)
            said = lab.log()
            taken, started = time_of_main_thread(switch), time.perf_counter()
            lab.start(open_vswitch.where)
            seconds.append((time.perf_counter() - started, time_of_main_thread(switch) - taken))
            told = re.search(r": (\d+) flows and groups changed", lab.log().replace(said, ""))
            assert told, lab.log()
            flows = int(told.group(1))
    whole, of_switch = min(seconds)
    yield Row(f"a daemon resyncs {flows:,} flows", whole, "s", "resync")
    yield Row("of which the main thread of ovs-vswitchd takes", of_switch, "s")


def come_back_rows(effort: Effort) -> Iterator[Row]:
    for name, seconds in gaps(effort.ends):
        yield Row(f"no frames: {name}", seconds, "s", "come back")


def rows(effort: Effort, quick: bool) -> Iterator[Row]:
    yield from frame_rows(effort)
    yield from call_rows(effort, quick)
    yield from change_rows(effort, quick)
    yield from from_nothing_rows(effort)
    yield from flood_rows(effort)
    yield from resync_rows(effort)
    yield from come_back_rows(effort)


def main() -> int:
    parser = argparse.ArgumentParser(
        description=__doc__, formatter_class=argparse.RawDescriptionHelpFormatter
    )
    parser.add_argument("--quick", action="store_true", help="seconds, and rough figures")
    parser.add_argument("--calls", type=int, help=argparse.SUPPRESS)
    given = parser.parse_args()
    effort = QUICK if given.quick else FULL
    if given.calls:
        print(json.dumps(best_of_calls(given.calls, effort)))
        return 0
    missed = []
    for row in rows(effort, given.quick):
        print(row, flush=True)
        if not row.is_met():
            missed.append(row.name)
    print(f"missed by: {', '.join(missed) or 'none'}")
    return 1 if missed and not given.quick else 0


if __name__ == "__main__":
    sys.exit(main())
