"""Labs: what documents say, and that nothing is left of one."""

import json
import os
import signal
import subprocess
from pathlib import Path
from typing import Any, Dict, Iterator, List

import pytest

from frame_lab import TOOLS, comes_true
from simhost._lab_document import LabError, read

HOST: Dict[str, Any] = {"switches": [{"alias": "s", "ports": [{"id": "a"}]}]}


def refusal(folder: Path, document: Any) -> str:
    file = folder / "rack.json"
    file.write_text(json.dumps(document), encoding="utf-8")
    with pytest.raises(LabError) as refused:
        read(file)
    said = str(refused.value)
    assert said.startswith(f"{file}: ")
    return said[len(f"{file}: ") :]


def hosts(**more: Any) -> Dict[str, Any]:
    return {"hosts": [{"name": "h1", "document": HOST}, {"name": "h2", "document": HOST}], **more}


CLIENT = {"name": "c1", "host": "h1", "switch": "s", "port": "a", "address": "10.0.0.1/24"}


@pytest.mark.parametrize(
    "document, said",
    [
        ({}, "'hosts' is missing"),
        ({"hosts": 1}, "hosts: must be an array"),
        ({"host": []}, "host: unknown key"),
        ({"hosts": [{"name": "h1"}]}, "hosts[0]: 'document' is missing"),
        (
            {"hosts": [{"name": "h1", "document": 7}]},
            "hosts[0].document: must be a scenario document, or the name of a file with one",
        ),
        (
            {"hosts": [{"name": "../h", "document": {}}]},
            "hosts[0].name: '../h' is no name: letters, digits, '-', '_' and '.', 31 at most",
        ),
        (
            {"hosts": [{"name": "h1", "document": {}}, {"name": "h1", "document": {}}]},
            "hosts[1].name: there are two machines 'h1'",
        ),
        (
            hosts(networks=[{"name": "lan", "uplinks": ["h3/nic0"]}]),
            "networks[0].uplinks[0]: there is no host 'h3'",
        ),
        (
            hosts(networks=[{"name": "lan", "uplinks": ["nic0"]}]),
            'networks[0].uplinks[0]: must be a host and an uplink, such as "h1/nic0"',
        ),
        (
            hosts(networks=[{"name": "lan", "uplinks": ["h1/nic0", "h1/nic0"]}]),
            "networks[0].uplinks[1]: the uplink 'h1/nic0' is at networks[0].uplinks[0] already",
        ),
        (
            hosts(networks=[{"name": "lan", "joins": ["lan"]}]),
            "networks[0].joins[0]: there is no other network 'lan'",
        ),
        (
            hosts(routers=[{"name": "r", "links": [{"host": "h1", "device": "eth1"}]}]),
            "routers[0].links[0]: 'address' is missing",
        ),
        (
            hosts(clients=[{**CLIENT, "address": "10.0.0.1"}]),
            "clients[0].address: must be an address and the bits of its network, such as"
            " 192.0.2.1/24",
        ),
        (
            hosts(clients=[CLIENT, {**CLIENT, "name": "c2"}]),
            "clients[1].port: the port 'h1/s/a' is at clients[0].port already",
        ),
        (
            hosts(networks=[{"name": "lan"}], clients=[{**CLIENT, "network": "lan"}]),
            "clients[0].host: a client of a network is at no port",
        ),
    ],
)
def test_a_document_that_is_wrong_is_told_where(tmp_path: Path, document: Any, said: str) -> None:
    assert refusal(tmp_path, document) == said


def test_a_file_of_a_host_is_beside_the_document(tmp_path: Path) -> None:
    (tmp_path / "host.json").write_text(json.dumps(HOST), encoding="utf-8")
    file = tmp_path / "rack.json"
    file.write_text(json.dumps({"hosts": [{"name": "h1", "document": "host.json"}]}), "utf-8")
    lab = read(file)
    assert (lab.name, lab.hosts[0].document) == ("rack", HOST)


class Labs:
    """The labs in a folder of their own."""

    def __init__(self, folder: Path) -> None:
        self.folder = folder
        self._environment = {
            **{name: text for name, text in os.environ.items() if not name.startswith("SIMHOST_")},
            "XDG_RUNTIME_DIR": str(folder),
        }

    def start(self, *words: str) -> "subprocess.Popen[str]":
        return subprocess.Popen(
            [TOOLS / "simhostctl", "lab", *words],
            env=self._environment,
            stdout=subprocess.PIPE,
            stderr=subprocess.STDOUT,
            text=True,
        )

    def try_run(self, *words: str) -> "subprocess.CompletedProcess[str]":
        process = self.start(*words)
        said, _ = process.communicate(timeout=60)
        return subprocess.CompletedProcess(words, process.returncode, said)

    def run(self, *words: str) -> str:
        done = self.try_run(*words)
        assert done.returncode == 0, done.stdout
        return done.stdout

    def file(self, **more: Any) -> str:
        file = self.folder / "rack.json"
        file.write_text(json.dumps(rack(**more)), encoding="utf-8")
        return str(file)

    def processes(self) -> List[int]:
        """That are there because of them."""
        found = []
        for entry in Path("/proc").iterdir():
            try:
                words = (entry / "cmdline").read_bytes() if entry.name.isdigit() else b""
            except OSError:
                continue
            if os.fsencode(str(self.folder / "simhost-labs-")) in words:
                found.append(int(entry.name))
        return found

    def left(self) -> List[Path]:
        return [one for folder in self.folder.glob("simhost-labs-*") for one in folder.iterdir()]


def of_the_guide(number: int) -> Dict[str, Any]:
    """A document that it shows, from 1."""
    guide = (Path(__file__).parents[2] / "docs/guides/rack.md").read_text(encoding="utf-8")
    document: Dict[str, Any] = json.loads(guide.split("} json\n")[number].split("```")[0])
    return document


def rack(**more: Any) -> Dict[str, Any]:
    """The first one: two hosts with a router between them, and a client at each."""
    return {**of_the_guide(1), **more}


@pytest.fixture
def labs(tmp_path: Path) -> Iterator[Labs]:
    labs = Labs(tmp_path)
    yield labs
    labs.run("down", "--all")
    assert labs.left() == []
    assert comes_true(lambda: labs.processes() == [])


def test_a_lab_is_up_until_it_is_ended(labs: Labs) -> None:
    assert labs.run("up", labs.file()).splitlines() == [
        "router core: h1/eth1, h2/eth1",
        "host h1: simhostd is ready",
        "host h2: simhostd is ready",
        "client web: 10.0.0.1/24 at h1/rack/web-1",
        "client db: 10.0.0.2/24 at h2/rack/db-1",
        "lab rack is up",
    ]
    assert labs.run("list").splitlines() == [
        "rack  up  2 hosts, 1 router, 2 clients",
        *["  host h1", "  host h2", "  router core", "  client web", "  client db"],
    ]
    ping = ["exec", "web", "ping", "-c", "1", "-W", "1", "10.0.0.2"]
    assert comes_true(lambda: labs.try_run(*ping).returncode == 0)
    plane = labs.run("exec", "rack/h1", str(TOOLS / "simhostctl"), "plane", "--json")
    assert json.loads(plane)["said"] == ""
    assert labs.try_run("exec", "c3").stdout == "simhostctl lab: no lab has a machine 'c3'\n"
    again = labs.try_run("up", labs.file())
    assert again.returncode == 1
    assert again.stdout == (
        "simhostctl lab: there is a lab 'rack' already: simhostctl lab down rack\n"
    )
    assert labs.run("down", "rack") == "lab rack is down\n"
    assert labs.processes() == []
    assert labs.try_run("down", "rack").stdout == "simhostctl lab: there is no lab 'rack'\n"


def test_networks_that_join_are_one_whatever_their_order(labs: Labs) -> None:
    """Two that the guide shows, and more of them that name one another round and round."""
    teaming = {"balance": "explicit", "active": ["nic0"], "standby": ["nic1"]}
    uplinks = ["nic0", "nic1"]
    switch = {"alias": "s", "uplinks": uplinks, "teaming": teaming, "ports": [{"id": "a"}]}
    host = {"uplinks": [{"name": name} for name in uplinks], "switches": [switch]}
    left, right = of_the_guide(2)["networks"]
    document = {
        "hosts": [{"name": name, "document": host} for name in ("h1", "h2")],
        "networks": [
            left,
            {**right, "joins": ["left"]},
            {"name": "up", "joins": ["down", "right"]},
            {"name": "down", "joins": ["left", "up"]},
        ],
        "clients": [
            {**CLIENT, "name": "one"},
            {**CLIENT, "name": "two", "host": "h2", "address": "10.0.0.2/24"},
            {"name": "far", "network": "down", "address": "10.0.0.3/24"},
        ],
    }
    file = labs.folder / "joined.json"
    file.write_text(json.dumps(document), encoding="utf-8")
    said = labs.run("up", str(file)).splitlines()
    assert said[:2] == [
        "network left: h1/nic0, h2/nic0, right",
        "network right: h1/nic1, h2/nic1, left",
    ]

    def wires(network: str) -> int:
        at_bridge = ["exec", network, "ip", "-json", "link", "show", "master", "bridge"]
        return len(json.loads(labs.run(*at_bridge)))

    # Uplinks, clients, and a wire for each of three that joined another one.
    assert [wires(name) for name in ("left", "right", "up", "down")] == [3, 4, 2, 2]
    for one, address in (("one", "10.0.0.2"), ("one", "10.0.0.3"), ("two", "10.0.0.3")):
        ping = ["exec", one, "ping", "-c", "1", "-W", "1", address]
        assert comes_true(lambda: labs.try_run(*ping).returncode == 0)


def test_what_a_host_refuses_leaves_nothing(labs: Labs) -> None:
    document = {"switches": [{"alias": "s", "mtu": 99}]}
    hosts = [{"name": "h1", "document": document}]
    refused = labs.try_run("up", labs.file(hosts=hosts, routers=[], clients=[]))
    assert refused.returncode == 1
    assert refused.stdout == ("simhostctl lab: the host h1: switches[0].mtu: 99 is below 1280\n")
    assert labs.left() == []


def test_one_that_is_interrupted_leaves_nothing(labs: Labs) -> None:
    process = labs.start("up", labs.file())
    assert process.stdout is not None
    assert process.stdout.readline()
    process.send_signal(signal.SIGINT)
    process.communicate(timeout=60)
    assert process.returncode == 130
    assert labs.left() == []
    assert comes_true(lambda: labs.processes() == [])


def test_one_whose_process_is_killed_leaves_nothing_but_a_folder(labs: Labs) -> None:
    labs.run("up", labs.file())
    (keeper,) = labs.folder.glob("simhost-labs-*/rack/pid")
    os.kill(int(keeper.read_text(encoding="ascii")), signal.SIGKILL)
    assert comes_true(lambda: labs.processes() == [])
    assert labs.run("list").splitlines()[0].startswith("rack  dead")
