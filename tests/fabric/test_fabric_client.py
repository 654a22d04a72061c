"""The client of a fabric's database, with no host: what becomes of changes when servers, others and
signals come in between, and what it tells of changes."""

import itertools
import json
import os
import subprocess
import sys
import time
from contextlib import suppress
from pathlib import Path
from typing import Any, Callable, Dict, List, Set, Tuple

import pytest
from ovs.jsonrpc import Message

from fabric_lab import SCHEMA, Databases, FabricLab
from frame_lab import comes_true
from libvswitch.errors import Busy, HostError, NotRestored
from operating import PROGRAM, of_lab, populate
from vswitch import transaction
from vswitch.command.fabric import changing
from vswitch.fabric import (
    Fabric,
    Failover,
    OtherVersion,
    Unreachable,
    _cluster,
    _deciding,
    _server,
)
from vswitch.fabric._cluster import Cluster
from vswitch.fabric._errors import TransactionRefused
from vswitch.fabric._server import News, Server
from vswitch.words import DocumentError


def mtu(fabric: Fabric) -> Any:
    return fabric.view().switches["lab"].settings.get("mtu")


def changes(databases: Databases) -> List[bool]:
    """Of those that have an id, whether each is revoked."""
    return [row["revoked"] for row in databases.rows("Change")]


def test_what_is_wrong_is_told_and_changes_nothing(databases: Databases, fabric: Fabric) -> None:
    before = databases.rows("Switch"), databases.rows("Port")
    view = fabric.view()
    own = "each host has its own, and a fabric has none"
    for document, said in (
        (of_lab(mtu=1), "switches[0].mtu: 1 is below 1280"),
        (of_lab(uplinks=["nic0"]), f"switches[0].uplinks: {own}"),
        ({"mac_learning": {}}, f"mac_learning: {own}"),
        (of_lab(hosts=["x"]), "switches[0].hosts[0]: no host 'x' in the fabric (there are one)"),
        (of_lab(hosts="one"), "switches[0].hosts: 'one' is not a list"),
        (of_lab(id="other"), "switches[0].id: the switch has 'lab-1', which stays"),
        (
            {"switches": [{"alias": "new"}]},
            "switches[0]: 'hosts' is missing: the names of those that have it",
        ),
        (
            of_lab(properties={"x.y": {"type": "runtime", "text": "z"}}),
            "switches[0].properties.x.y: what a restart takes away each host has of its own",
        ),
    ):
        with pytest.raises(DocumentError) as raised:
            fabric.plan(document)
        assert str(raised.value) == said
    there = "in the fabric (there are"
    asked: List[Tuple[Callable[[], object], str]] = [
        (lambda: view.switches["nope"], f"no switch 'nope' {there} lab)"),
        (lambda: view.switches["lab"].ports["x"], f"no port 'x' of switch 'lab' {there} a)"),
        (lambda: fabric.plan_to_forget("x"), f"no host 'x' {there} one)"),
        (lambda: Fabric("tcp:192.0.2.1"), "'tcp:192.0.2.1' is no server"),
        (lambda: Fabric("ssl:192.0.2.1:6640"), "ssl: takes a private key, its certificate and"),
    ]
    for ask, said in asked:
        with pytest.raises(HostError) as refused:
            ask()
        assert said in str(refused.value)
    assert (databases.rows("Switch"), databases.rows("Port")) == before


def test_what_is_set_byte_by_byte_and_addresses_are_kept(fabric: Fabric) -> None:
    raw = {"x.y": {"type": "config", "hex": "00ff"}}
    mac: Dict[str, Any] = {"mac": "02:00:00:00:00:01", "vlan": 7, "vni": 0, "type": "static"}
    fabric.plan(of_lab(ports=[{"id": "a", "properties": raw, "addresses": [mac]}])).apply()
    state = fabric.view().switches["lab"].ports["a"].state()
    assert (state["properties"], state["addresses"], state["vlan"]) == (raw, [mac], 7)
    # What it says of itself changes nothing.
    assert fabric.plan({"switches": [fabric.view().switches["lab"].state()]}).changes == ()
    gone: Dict[str, Any] = {
        "id": "a",
        "properties": {"x.y": "absent"},
        "addresses": [{**mac, "state": "absent"}],
    }
    assert len(fabric.plan(of_lab(ports=[gone])).changes) == 2
    fabric.plan(of_lab(ports=[gone])).apply()
    state = fabric.view().switches["lab"].ports["a"].state()
    assert set(state) == {"id", "vlan", "observed"}


def test_of_two_changes_of_the_same_thing_one_wins(databases: Databases, fabric: Fabric) -> None:
    late = fabric.plan(of_lab(mtu=1600, ports=[{"id": "b"}]))
    elsewhere = fabric.plan(of_lab(ports=[{"id": "a", "vlan": 8}]))
    databases.set("Switch", "mtu", 9000, id="lab-1")
    with pytest.raises(Busy, match="somebody else changed the same meanwhile"):
        late.apply()
    assert mtu(fabric) == 9000 and list(fabric.view().switches["lab"].ports) == ["a"]
    # What nobody else touched does not meet.
    assert elsewhere.apply() == 2
    assert fabric.plan(of_lab(mtu=1600)).apply() == 3
    databases.set("Port", "vlan", 9, id="a")
    remove = fabric.plan(of_lab(ports=[{"id": "a", "state": "absent"}]))
    databases.set("Port", "vlan", 10, id="a")
    with pytest.raises(Busy):
        remove.apply()


def test_a_new_port_may_be_changed_by_the_hosts_that_its_switch_then_has(
    databases: Databases, fabric: Fabric
) -> None:
    databases.insert(Host={"name": "two", "state": "t"})

    def writers(port: str) -> Set[str]:
        (row,) = [row for row in databases.rows("Port") if row["id"] == port]
        return {name for name, _ in row["writers"][1]}

    fabric.plan(of_lab(hosts=["one", "two"], ports=[{"id": "b"}])).apply()
    assert writers("a") == writers("b") == {"one", "two"}
    stale = fabric.plan(of_lab(ports=[{"id": "d"}]))
    fabric.plan(of_lab(hosts=["two"], ports=[{"id": "c"}])).apply()
    assert writers("a") == writers("b") == writers("c") == {"two"}
    with pytest.raises(Busy):
        stale.apply()


def test_a_setting_that_no_program_wrote_can_be_set_again(
    databases: Databases, fabric: Fabric
) -> None:
    words = ["map", [["vlan", "seven"], ["properties", "none"], ["addresses", "none"]]]
    of_a = [["id", "==", "a"]]
    databases.transact({"op": "update", "table": "Port", "where": of_a, "row": {"settings": words}})
    wish = {"id": "a", "vlan": 7, "properties": {"x.y": {"type": "config", "hex": "00"}}}
    mac = {"mac": "02:00:00:00:00:01", "vlan": 0, "vni": 0, "type": "static"}
    fabric.plan(of_lab(ports=[{**wish, "addresses": [mac]}])).apply()
    state = fabric.view().switches["lab"].ports["a"].state()
    assert (state["vlan"], state["properties"], state["addresses"]) == (
        7,
        wish["properties"],
        [mac],
    )


def test_a_host_that_comes_to_have_a_switch_may_not_bear_a_port_of_it(
    databases: Databases, fabric: Fabric
) -> None:
    row = {"name": "two", "state": "t", "errors": ["map", [["lab/a", "no"], ["other", "no"]]]}
    databases.insert(Host=row)
    plan = fabric.plan(of_lab(hosts=["one", "two"]))
    assert changing.unborne(fabric.view(), plan) == [("two", "lab/a", "no")]
    errors = {"errors": ["map", [["frames", "none go"]]]}
    of_two = [["name", "==", "two"]]
    databases.transact({"op": "update", "table": "Host", "where": of_two, "row": errors})
    assert changing.unborne(fabric.view(), plan) == [("two", "frames", "none go")]


def test_when_servers_are_lost_that_has_changed_something_it_stays_changed(
    monkeypatch: pytest.MonkeyPatch, fabric: Fabric
) -> None:
    before = transaction.committed()
    revision = fabric.plan(of_lab(mtu=1600)).apply()
    assert transaction.committed() == before + 1

    def lost(*_: object) -> None:
        raise Unreachable("no server can be reached")

    monkeypatch.setattr(fabric, "view", lost)
    with pytest.raises(NotRestored, match="the change is made, and nobody tells where it is"):
        fabric.wait(revision, ["one"], 0)


Transact = Callable[..., Any]


def replied(monkeypatch: pytest.MonkeyPatch, error: BaseException, made: bool) -> None:
    """The first change from now on ends so for who makes it, whether it is made or not."""
    really: Transact = Server.transact
    turns = itertools.count()

    def transact(server: Server, database: str, operations: Any, deadline: float) -> Any:
        first = any("mutations" in one for one in operations) and next(turns) == 0
        result = really(server, database, operations, deadline) if made or not first else None
        if first:
            raise error
        return result

    monkeypatch.setattr(Server, "transact", transact)


@pytest.mark.parametrize("made", [True, False])
def test_a_lost_reply_loses_and_doubles_nothing(
    databases: Databases, fabric: Fabric, monkeypatch: pytest.MonkeyPatch, made: bool
) -> None:
    replied(monkeypatch, Unreachable("lost"), made)
    assert fabric.plan(of_lab(mtu=1600)).apply() == 2
    assert (mtu(fabric), fabric.view().revision) == (1600, 2)
    assert changes(databases) == [False, False]


def test_what_a_server_makes_twice_is_made_once(
    databases: Databases, fabric: Fabric, monkeypatch: pytest.MonkeyPatch
) -> None:
    really: Transact = Server.transact

    def transact(*arguments: Any) -> Any:
        with suppress(TransactionRefused):
            really(*arguments)
        return really(*arguments)

    def follow(cluster: Cluster, deadline: float) -> bool:
        told = {"reply": json.dumps({"failovers": []})}
        databases.transact({"op": "update", "table": "Drill", "where": [], "row": told})
        return wait(cluster, deadline)

    wait = Cluster.follow
    monkeypatch.setattr(Server, "transact", transact)
    monkeypatch.setattr(Cluster, "follow", follow)
    assert fabric.plan(of_lab(mtu=1600, ports=[{"id": "b"}])).apply() == 2
    assert (mtu(fabric), fabric.view().revision) == (1600, 2)
    assert changes(databases) == [False, False]
    assert fabric.drill("lab") == {"one": []}
    assert databases.rows("Drill") == []
    assert fabric.outcome("of nobody") is False


def test_a_change_that_is_interrupted_is_told_whole(
    databases: Databases, fabric: Fabric, monkeypatch: pytest.MonkeyPatch
) -> None:
    replied(monkeypatch, KeyboardInterrupt(), made=True)
    with pytest.raises(NotRestored, match="interrupted, and the change is made"):
        fabric.plan(of_lab(mtu=1600)).apply()
    assert mtu(fabric) == 1600
    monkeypatch.undo()
    replied(monkeypatch, SystemExit(143), made=False)
    with pytest.raises(SystemExit):
        fabric.plan(of_lab(mtu=1700)).apply()
    assert mtu(fabric) == 1600
    assert sorted(changes(databases)) == [False, False, True]


def decided(fabric: Fabric, change: str) -> bool:
    """What became of a change, as soon as a server says so that has just been resumed."""
    outcomes: List[bool] = []

    def is_told() -> bool:
        try:
            outcomes.append(fabric.outcome(change))
        except Unreachable:
            return False
        return True

    assert comes_true(is_told)
    return outcomes[-1]


def test_an_unknown_outcome_is_told_and_decided_later(
    databases: Databases, fabric: Fabric, monkeypatch: pytest.MonkeyPatch
) -> None:
    monkeypatch.setattr(_deciding, "_LONGEST", 0.5)
    monkeypatch.setattr(_deciding, "_ELECTION", 0.5)
    plan = fabric.plan(of_lab(mtu=1600))
    databases.pause()
    with pytest.raises(NotRestored, match="nobody knows whether the change") as raised:
        plan.apply()
    databases.resume()
    change = str(raised.value).split("the change ")[1].split()[0]
    made = decided(fabric, change)
    assert made == (mtu(fabric) == 1600)
    # It stays as it was decided.
    assert fabric.outcome(change) == made
    assert fabric.outcome("of nobody") is False


def why_not(servers: str) -> str:
    """Why no server tells what the fabric has; nothing if one does."""
    try:
        with Fabric(servers) as fabric:
            fabric.view()
    except Unreachable as why:
        return str(why)
    return ""


def test_without_a_majority_nothing_is_changed(
    tmp_path: Path, monkeypatch: pytest.MonkeyPatch
) -> None:
    with FabricLab(tmp_path, servers=3) as lab:
        populate(lab.databases)
        with Fabric(lab.databases.local_addresses) as fabric:
            plan = fabric.plan(of_lab(mtu=1600))
            lab.databases.kill(lab.databases.leader())
            # An election later it goes on.
            with monkeypatch.context() as patient:
                patient.setattr(_deciding, "_LONGEST", 30.0)
                patient.setattr(_deciding, "_ELECTION", 30.0)
                assert plan.apply() == 2
            plan = fabric.plan(of_lab(mtu=1700))
            monkeypatch.setattr(_deciding, "_LONGEST", 1.0)
            lab.databases.kill(lab.databases.running()[0])
            with pytest.raises((Unreachable, NotRestored)):
                plan.apply()
        told = lab.databases.local_addresses
        assert comes_true(lambda: "it has lost the majority of its cluster" in why_not(told))


def test_a_first_server_that_hangs_hides_nothing(tmp_path: Path) -> None:
    with FabricLab(tmp_path, servers=3) as lab:
        populate(lab.databases)
        servers = lab.databases.local_addresses
        with Fabric(servers) as fabric, Fabric(servers) as other:
            assert mtu(fabric) is None
            lab.databases.pause_first()
            other.plan(of_lab(mtu=1600)).apply()
            assert mtu(fabric) == 1600
            # What it has still to learn nobody sees.
            lab.databases.resume(0)
            for _ in range(3):
                fabric.close()
                assert mtu(fabric) == 1600


def test_a_fabric_of_another_version_is_none(tmp_path: Path) -> None:
    schema = tmp_path / "other.ovsschema"
    text = SCHEMA.read_text(encoding="utf-8")
    schema.write_text(json.dumps({**json.loads(text), "version": "2.0.0"}), encoding="utf-8")
    with FabricLab(tmp_path, schema=schema) as lab:
        with pytest.raises(OtherVersion, match="a schema of version 2.0.0, which is none of 1.x"):
            Fabric(lab.databases.local_addresses).view()


def test_what_changes_is_told_as_it_comes(databases: Databases, fabric: Fabric) -> None:
    with Fabric(databases.local_addresses) as other:
        events = fabric.watch(30)
        documents: List[Dict[str, Any]] = [
            of_lab(mtu=1600),
            of_lab(ports=[{"id": "a", "vlan": "absent"}, {"id": "b"}]),
            of_lab(state="absent"),
        ]
        databases.transact({"op": "update", "table": "Port", "where": [], "row": {"host": "one"}})
        expected = [
            {"place lab/a/host: absent -> one", "setting lab/mtu: absent -> 1600"},
            {"setting lab/a/vlan: 7 -> absent", "port lab/b: absent -> id=b"},
            {
                "switch lab: id=lab-1 -> absent",
                "hosts lab/hosts: one -> absent",
                "setting lab/mtu: 1600 -> absent",
                "port lab/a: id=a -> absent",
                "place lab/a/host: one -> absent",
                "port lab/b: id=b -> absent",
            },
        ]
        for document, lines in zip(documents, expected):
            told: Set[str] = set()
            other.plan(document).apply()
            while told != lines:
                event = next(events)
                told.add(f"{event.kind} {event}")
                assert told <= lines


def test_news_of_the_servers_hide_none_of_the_fabric(
    fabric: Fabric, monkeypatch: pytest.MonkeyPatch
) -> None:
    fabric.view()
    come = [News("_Server", {}), News("fabric", {})]
    monkeypatch.setattr(Server, "news", lambda self, deadline: come.pop(0) if come else None)
    assert fabric._cluster.follow(time.monotonic())
    assert not fabric._cluster.follow(time.monotonic())


class NewsWithoutEnd:
    """From a server, with a clock that goes on with each of them."""

    def __init__(self, monitor: str) -> None:
        self._news = News(monitor, {})
        self.time = 0.0

    def monotonic(self) -> float:
        return self.time

    def __call__(self, *_: object) -> News:
        self.time += 0.01
        assert self.time < 60, "nobody looks at the deadline"
        return self._news

    def recv(self) -> Tuple[int, Any]:
        self()
        return 0, Message.create_notify("update", self._news)


@pytest.mark.parametrize("monitor, has_any", [("_Server", False), ("fabric", True)])
def test_of_news_without_end_some_are_left_for_the_next_time(
    fabric: Fabric, monkeypatch: pytest.MonkeyPatch, monitor: str, has_any: bool
) -> None:
    fabric.view()
    without_end = NewsWithoutEnd(monitor)
    with monkeypatch.context() as patched:
        patched.setattr(_cluster, "time", without_end)
        patched.setattr(Server, "news", without_end)
        assert fabric._cluster.follow(5.0) == has_any


def test_who_tells_of_other_things_only_does_not_reply(
    fabric: Fabric, monkeypatch: pytest.MonkeyPatch
) -> None:
    fabric.view()
    server = fabric._cluster._server
    assert server is not None
    without_end = NewsWithoutEnd("fabric")
    with monkeypatch.context() as patched:
        patched.setattr(_server, "time", without_end)
        patched.setattr(server._rpc, "recv", without_end.recv)
        with pytest.raises(Unreachable, match="it does not reply"):
            server.request("echo", [], 5.0)


def test_what_a_server_had_no_time_to_say_hides_nothing_that_it_said(
    monkeypatch: pytest.MonkeyPatch,
) -> None:
    said = ["it does not take this certificate"]

    def connect(cluster: Cluster, deadline: float) -> None:
        if said:
            raise Unreachable(said.pop())
        time.sleep(max(deadline - time.monotonic(), 0))
        raise Unreachable("it timed out")

    monkeypatch.setattr(Cluster, "_connect", connect)
    with pytest.raises(Unreachable, match="^it does not take this certificate$"):
        Cluster(["any"]).connect(time.monotonic() + 0.3)
    # Nothing else was said.
    with pytest.raises(Unreachable, match="^it timed out$"):
        Cluster(["any"]).connect(time.monotonic() + 0.05)


def test_what_the_servers_do_not_let_one_do_is_told(
    fabric: Fabric, monkeypatch: pytest.MonkeyPatch
) -> None:
    refused = TransactionRefused("permission error", "of roles")
    plan = fabric.plan(of_lab(mtu=1600))
    really: Transact = Server.transact

    def transact(server: Server, database: str, operations: Any, deadline: float) -> Any:
        if any(one["op"] == "insert" for one in operations):
            raise refused
        return really(server, database, operations, deadline)

    monkeypatch.setattr(Server, "transact", transact)
    asked: List[Callable[[], object]] = [plan.apply, lambda: fabric.drill("lab")]
    for ask in asked:
        with pytest.raises(Busy, match="does not let this client change that: .* of roles"):
            ask()


def test_a_host_that_does_not_tell_hides_no_other_s_reply(
    databases: Databases, fabric: Fabric, monkeypatch: pytest.MonkeyPatch
) -> None:
    databases.insert(Host={"name": "two", "state": "t"})
    fabric.plan(of_lab(hosts=["one", "two"])).apply()
    replies = {
        "one": {"failovers": [{"uplink": "nic0", "port": "a", "meanwhile": None}]},
        "two": {"refused": "no such switch"},
    }
    really = Cluster.follow

    def follow(cluster: Cluster, deadline: float) -> bool:
        for host, reply in replies.items():
            row, where = {"reply": json.dumps(reply)}, [["host", "==", host]]
            databases.transact({"op": "update", "table": "Drill", "where": where, "row": row})
        return really(cluster, deadline)

    monkeypatch.setattr(Cluster, "follow", follow)
    told = fabric.drill("lab")
    assert told["one"] == [Failover("one", "nic0", "a", None)]
    assert isinstance(told["two"], HostError) and str(told["two"]) == "no such switch"


def test_shells_complete_what_the_fabric_has(databases: Databases) -> None:
    begun = ["vswitch", "--fabric", databases.local_addresses]
    for more, offered in (
        ("show lab/", ["plain,lab/a"]),
        ("forget ", ["plain,one"]),
        ("ap", ["plain,apply"]),
        ("set lab mt", ["plain,mtu="]),
        ("set lab/a forbids=mac_changes,forg", ["plain,forbids=mac_changes,forged_transmits"]),
        ("set lab/a teaming.active=", ["plain,teaming.active=nic0"]),
        ("add lab/new vla", ["plain,vlan="]),
        ("add other mt", ["plain,mtu="]),
        ("unset lab/a vl", ["plain,vlan"]),
    ):
        asked = {"COMP_WORDS": " ".join([*begun, more]), "_VSWITCH_COMPLETE": "bash_complete"}
        environment = {**os.environ, **asked}
        done = subprocess.run([PROGRAM], env=environment, stdout=subprocess.PIPE, text=True)
        assert done.stdout.splitlines() == offered


def test_what_it_takes_is_told_where_it_is_missing() -> None:
    words = ["vswitch", "--fabric", "tcp:192.0.2.1:6640", "list"]
    program = (
        f"import sys; sys.modules['ovs'] = None; sys.argv = {words}\n"
        "from vswitch.command import main; main()"
    )
    done = subprocess.run([sys.executable, "-c", program], capture_output=True, text=True)
    assert done.returncode == 1
    assert done.stderr.endswith("; --fabric takes Debian's python3-openvswitch\n"), done.stderr
