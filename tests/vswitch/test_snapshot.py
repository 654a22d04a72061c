"""A host as a document from which its clone starts: what is in it, and what is said of the rest."""

import json
import random
import re
import types
from pathlib import Path
from typing import Any, Callable, Dict, Iterator, List, Set, Tuple

import drawn_documents
import pytest
import simhost
from conftest import LAB
from drawn_documents import STOPPED, Document, host_of, told
from libvswitch import checked
from test_faults import NO_STATUS, names
from test_transaction import everything
from vswitch import DocumentError, Host, MacType, Port, Switch, _table, snapshot
from vswitch._properties import LONGEST_KEY

ROOT = Path(__file__).parents[2]
SCENARIOS = (ROOT / "simhost" / "SCENARIOS.md").read_text(encoding="utf-8")
GUIDES = sorted((ROOT / "docs" / "guides").glob("*.md"))
CLIENT = "com.quorix.common.port.vnicConnectee"
LINK = "com.quorix.common.port.linkstatus"
RUNTIME = _table.PROPERTY_TYPES["runtime"]


def documents() -> List[Any]:
    """All that the pages and the tests of this folder describe a host with."""
    found = [pytest.param(LAB, id="lab")]
    for at, text in enumerate(re.findall(r"^```json\n(.*?)^```", SCENARIOS, re.M | re.S)):
        found.append(pytest.param(json.loads(text), id=f"SCENARIOS {at}"))
    for page in GUIDES:
        heredoc = r"^\$ cat > \w+\.json <<'\.'\n(.*?)^> \.$"
        for text in re.findall(heredoc, page.read_text(encoding="utf-8"), re.M | re.S):
            document = json.loads(re.sub(r"^> ?", "", text, flags=re.M))
            found.append(pytest.param(document, id=page.stem))
    return found


DOCUMENTS = documents()


@pytest.fixture(autouse=True)
def stopped(host: simhost.Host) -> None:
    host.clock.stop()


def clone_of(said: Document) -> simhost.Host:
    """A host that starts from the snapshot; the time of both stands still."""
    return host_of({**json.loads(json.dumps(said)), "clock": STOPPED})


def of(said: Document, *about: str) -> List[Document]:
    """What is listed under `observed`."""
    listed: List[Document] = []
    for one in about:
        listed += said["observed"][one]
    return listed


def whole(objects: Host) -> Document:
    """A snapshot that lacks nothing."""
    said = objects.snapshot()
    assert of(said, "refused", "left_out") == []
    return said


# Clones


def test_there_are_documents_of_each_kind() -> None:
    names = " ".join(str(one.id) for one in DOCUMENTS)
    assert len(DOCUMENTS) > 8 and "lab" in names and "describing_a_host" in names


# What brings frames to a host.
WIRES = ("device", "fabric", "underlay")


def without_wires(said: Any) -> Any:
    """Frames go by real time, and the clock of these tests stands."""
    if isinstance(said, dict):
        return {key: without_wires(one) for key, one in said.items() if key not in WIRES}
    return [without_wires(one) for one in said] if isinstance(said, list) else said


@pytest.mark.parametrize("document", DOCUMENTS)
def test_the_clone_of_what_pages_describe(
    host: simhost.Host, objects: Host, document: Document
) -> None:
    """On top of the default host, whose clone it is, too."""
    host.apply({**without_wires(document), "faults": []})
    host.apply({"clock": STOPPED})
    before, described = whole(objects), host.describe()
    clone = clone_of(before)
    assert objects.snapshot() == before
    for key in ("switches", "runtime_options", "mac_learning"):
        assert told(clone.describe()[key]) == told(described[key])


def test_the_clone_of_the_default_host(host: simhost.Host, objects: Host) -> None:
    before, described = whole(objects), host.describe()
    clone = clone_of(before)
    assert objects.snapshot() == before and told(clone.describe()["switches"]) == told(
        described["switches"]
    )


def test_clones_of_hosts_that_chance_describes() -> None:
    count, wrong = drawn_documents.run(7, 20)
    assert wrong == []
    # Most of what is drawn is a host.
    assert count.taken > 15


def test_a_clone_that_is_another_host_would_be_noticed(monkeypatch: pytest.MonkeyPatch) -> None:
    forgets: Callable[..., Document] = lambda *_: {}
    monkeypatch.setattr(snapshot._Snapshot, "counted_by", forgets)
    _, wrong = drawn_documents.run(7, 20, shrink=False)
    assert len(wrong) == 1 and "counters" in wrong[0]


def test_links_of_a_clone(host: simhost.Host, objects: Host) -> None:
    host.apply(LAB)
    host.apply({"uplinks": [{"name": "nic0", "lacp": "down"}, {"name": "nic1", "link": "down"}]})
    said = whole(objects)
    links = {one["name"]: one for one in said["uplinks"]}
    assert links["nic0"] == {"name": "nic0", "link": "up", "lacp": "down"}
    assert links["nic1"] == {"name": "nic1", "link": "down"}
    clone_of(said)
    assert objects.snapshot() == said
    lab = objects.switches["lab"]
    assert [str(one.lacp) for one in lab.uplinks.values()] == ["down", "down"]


def test_counters_of_a_clone(host: simhost.Host, lab: Switch, objects: Host) -> None:
    host.set_counter("lab", "txErrors", 7)
    host.set_counter("lab", "mirroredPkts", 9, session="audit")
    said = whole(objects)["switches"][1]
    assert said["counters"] == {"txErrors": 7}
    assert said["mirror_counters"] == {"audit": {"mirroredPkts": 9}}
    assert said["ports"][0]["counters"] == {"pktsInUnicast": 100, "numMACsMoved": 4}


@pytest.mark.parametrize("up", [0, 1])
def test_the_side_of_a_client(host: simhost.Host, lab: Switch, objects: Host, up: int) -> None:
    port = lab.ports["desk-4"]
    port.set_property(CLIENT, b"vm", RUNTIME)
    port.set_property(LINK, bytes([up, 0, 0, 0]), RUNTIME)
    said = whole(objects)
    clone_of(said)
    assert objects.switches["lab"].ports["desk-4"].link == up
    assert objects.snapshot() == said


Change = Callable[[bytes], bytes]
RAW: Dict[str, Tuple[str, str, Change]] = {
    "a name that goes on after its end": ("desk-1", "teaming", lambda data: data[:-1] + b"x"),
    "a text that is no UTF-8": ("desk-1", "alias", lambda data: b"d\xffsk\0"),
    "a text that would clear it": ("desk-1", "alias", lambda data: b"absent\0"),
    "no bit of a priority": ("desk-1", "vlan", lambda data: bytes([1]) + data[1:]),
}


@pytest.mark.parametrize("case", RAW)
def test_bytes_that_no_words_make(
    host: simhost.Host, lab: Switch, objects: Host, case: str
) -> None:
    id_, name, change = RAW[case]
    port = lab.ports[id_]
    known = port._settings[name]
    data = change(port.get_property(known.key))
    port.set_property(known.key, data, known.type)
    for said in (whole(objects), snapshot.backup(objects)):
        (described,) = [one for one in said["switches"][1]["ports"] if one["id"] == id_]
        assert described["properties"][known.key]["hex"] == data.hex()
        clone_of(objects.snapshot())
        assert objects.switches["lab"].ports[id_].get_property(known.key) == data


def test_a_priority_without_vlans(host: simhost.Host, lab: Switch, objects: Host) -> None:
    key = lab.ports["desk-4"]._settings["vlan"].companions[0]
    lab.ports["desk-4"].set_property(key, bytes([5, 0, 0, 0]), _table.PROPERTY_TYPES["policy"])
    held = lab.ports["desk-4"].properties()
    said = whole(objects)
    clone_of(said)
    again = objects.switches["lab"].ports["desk-4"].properties()
    assert {name: one for name, one in again.items() if "volatile.status" not in name} == {
        name: one for name, one in held.items() if "volatile.status" not in name
    }
    assert objects.snapshot() == said


# What a call refuses


def calls_of(host: simhost.Host, objects: Host) -> Dict[str, int]:
    """How often a snapshot makes each call."""
    for name in names():
        host.fault(name, nth=2**31 - 1, panic=(OSError, "never"))
    objects.snapshot()
    faults = host.describe()["faults"]
    host.clear_faults()
    return {one["call"]: one["observed"]["calls"] for one in faults if one["observed"]["calls"]}


def places(said: Document) -> Dict[Tuple[str, ...], Document]:
    """What is said, by the switch and the port that it is said of."""
    found: Dict[Tuple[str, ...], Document] = {(): {**said, "switches": None, "observed": None}}
    for switch in said["switches"]:
        found[switch["alias"],] = {**switch, "ports": None, "uplink_ports": None}
        for port in (*switch["ports"], *switch["uplink_ports"]):
            found[switch["alias"], port["id"]] = port
    return found


SETTINGS = {name for kind in (_table.SWITCH, _table.PORT, _table.UPLINK_PORT) for name in kind}
# What else of the same thing is missing with what was refused.
FOLLOWS: Dict[str, Set[str]] = {
    "properties": {*SETTINGS, "host_properties", "counters"},
    "number": {"groups"},
    **{name: {"properties"} for name in SETTINGS},
}


def check_refusal(said: Document, full: Document, call: str, status: str) -> None:
    """The refusal is listed, and what it is not about is whole."""
    (refusal,) = of(said, "refused")
    # What traps while another call is copied or released is a trap of that one.
    assert refusal["call"] == call or status == "trap"
    assert refusal["status"] == status
    assert refusal["words"] == ("Busy" if status == "QEX_BUSY" else "OSError: the device is gone")
    about = tuple(refusal[key] for key in ("switch", "port") if key in refusal)
    what = refusal["what"]
    now = places(said)
    for place, members in places(full).items():
        if place not in now:
            parts = {"switches": (), "ports": about, "uplink_ports": about}
            assert parts[what] == place[: len(about)]
            continue
        different = {name for name, one in members.items() if now[place].get(name) != one}
        if place == about:
            different -= {what, *FOLLOWS.get(what, ())}
        # Which uplinks there are, the host says by its switches, and a port by its uplink.
        if place == () or (what in ("uplinks", "port") and place[:1] == about[:1]):
            different -= {"uplinks", "uplink"}
        # Its VLAN is in private VLANs that are not known.
        for one in of(said, "left_out"):
            assert (one["what"], refusal["what"], about) == ("vlan", "properties", ("lab",))
            different -= {"vlan"} if place == (one["switch"], one["port"]) else set()
        assert different == set(), refusal


@pytest.mark.leaves_host_memory("of a deallocator that traps nobody knows what it did")
def test_each_refused_call_is_listed_and_the_rest_is_whole(
    host: simhost.Host, lab: Switch, objects: Host
) -> None:
    lab.ports["desk-4"].set_property(CLIENT, b"vm", RUNTIME)
    full = whole(objects)
    calls = calls_of(host, objects)
    assert len(calls) > 40
    for call, count in calls.items():
        for nth in sorted({1, count}):
            if call.startswith(NO_STATUS):
                status = "trap"
                host.fault(call, nth=nth, panic=(OSError, "the device is gone"))
            else:
                status = "QEX_BUSY"
                host.fault(call, nth=nth, status=status)
            said = objects.snapshot()
            host.clear_faults()
            check_refusal(said, full, call, status)


@pytest.mark.leaves_host_memory("of a deallocator that traps nobody knows what it did")
def test_a_clone_of_what_was_told(host: simhost.Host, lab: Switch, objects: Host) -> None:
    """Each call of a kind refuses all the time: there is a document nevertheless, and a clone."""
    for call in calls_of(host, objects):
        host.fault(call, times=0, panic=(OSError, "the device is gone"))
        said = objects.snapshot()
        host.clear_faults()
        assert of(said, "refused") != []
        clone_of(said)
        host.reset()
        host.apply(LAB)


def test_what_goes_while_a_snapshot_is_made(
    host: simhost.Host, lab: Switch, objects: Host, monkeypatch: pytest.MonkeyPatch
) -> None:
    look = Port.properties

    def meanwhile(port: Port) -> Any:
        if port.id == "desk-2" and port.exists():
            checked.VSDVS_RemoveDVPort("lab", "desk-2")
        return look(port)

    monkeypatch.setattr(Port, "properties", meanwhile)
    assert [one["id"] for one in whole(objects)["switches"][1]["ports"]] == [
        "desk-1",
        "desk-3",
        "desk-4",
    ]


# What no document says


def test_numbers_that_no_document_says(
    host: simhost.Host, lab: Switch, objects: Host, monkeypatch: pytest.MonkeyPatch
) -> None:
    """A host may know what this one does not: the clone starts without it."""
    table = checked.VSQEX_GetPortMACTable
    options = checked.VSQEX_GetRuntimeOptions
    entry = checked.VSMACEntry("02:00:00:00:00:77", MacType(9), False, 4095)

    monkeypatch.setattr(checked, "DVS_GetMaxPorts", lambda handle: 65536)
    monkeypatch.setattr(checked, "VSQEX_GetPortMACTable", lambda *of: (*table(*of), entry))
    monkeypatch.setattr(
        checked,
        "VSQEX_GetRuntimeOptions",
        lambda: (*options(), types.SimpleNamespace(name="Unheard", value=1)),
    )
    said = objects.snapshot()
    monkeypatch.undo()
    left = [one.get("path", one.get("what")) for one in of(said, "left_out")]
    assert sorted(left) == [
        *["addresses"] * 7,
        "runtime_options.Unheard",
        "switches[0].max_ports",
        "switches[1].max_ports",
    ]
    clone_of(said)
    assert len(objects.switches["lab"].ports["desk-1"].macs) == 2


ODD = {
    "com.quorix.vswitch.teaming": bytes(4),
    "com.quorix.vswitch.port.security": bytes([0x80, 0, 0, 0]),
    "com.quorix.vswitch.port.mirrorSessions": b"none",
    "com.quorix.common.port.block": b"\2",
    "com.quorix.vswitch.mtu": bytes([0, 6, 0, 0]),
    "com.quorix.common.port.alias": b"no end",
    # One byte more than the host takes.
    "k" * (LONGEST_KEY + 1): b"any",
}


def test_bytes_that_no_document_says(
    host: simhost.Host, lab: Switch, objects: Host, monkeypatch: pytest.MonkeyPatch
) -> None:
    lab.ports["desk-4"].set_property("k" * LONGEST_KEY, b"any", RUNTIME)
    look = Port.properties
    odd = {key: checked.DVSDataItem(key, data, RUNTIME) for key, data in ODD.items()}

    def foreign(port: Port) -> Any:
        return {**look(port), **odd} if port.id == "desk-4" else look(port)

    monkeypatch.setattr(Port, "properties", foreign)
    said = objects.snapshot()
    monkeypatch.undo()
    left = of(said, "left_out")
    assert {one["key"]: one["hex"] for one in left} == {
        key: data.hex() for key, data in ODD.items()
    }
    assert {(one["switch"], one["port"]) for one in left} == {("lab", "desk-4")}
    clone_of(said)


# Plans


def test_a_snapshot_is_a_plan_that_changes_nothing(
    host: simhost.Host, lab: Switch, objects: Host
) -> None:
    host.link("nic0").down()
    said = whole(objects)
    before = everything(host)
    for is_whole in (False, True):
        assert objects.plan(said, whole=is_whole).apply() == ()
    host.link("nic0").up()
    host.set_counter("lab", "txErrors", 9)
    assert objects.plan(said, whole=True).changes == ()
    host.link("nic0").down()
    assert everything(host) == before
    lab.mtu = 1400
    (change,) = objects.plan(said, whole=True).changes
    assert change.path == "lab/mtu"


def test_a_plan_takes_nothing_away_that_a_snapshot_does_not_know(
    host: simhost.Host, lab: Switch, objects: Host
) -> None:
    host.fault("VSDVS_GetMTU", times=0, status="QEX_BUSY")
    host.fault("DVSState_PortForEach", times=0, panic=(OSError, "the device is gone"))
    said = objects.snapshot()
    host.clear_faults()
    with pytest.raises(DocumentError, match="^observed.refused: what was refused when this was"):
        objects.plan(said, whole=True)
    assert objects.plan(said).changes == ()
    said["observed"]["refused"] = [{"what": "counters"}, {"what": "link"}]
    assert objects.plan({**said, "switches": objects.snapshot()["switches"]}, whole=True)
    said["observed"]["left_out"] = [{"what": "properties"}]
    with pytest.raises(DocumentError, match="^observed.left_out: what was left out when this was"):
        objects.plan(said, whole=True)


@pytest.mark.parametrize("version", [0, 2, "1", None])
def test_a_snapshot_of_another_version(objects: Host, version: object) -> None:
    said = objects.snapshot()
    said["observed"]["snapshot"] = version
    expected = f"observed.snapshot: a snapshot of version {version!r}; this reads version 1"
    with pytest.raises(DocumentError, match=expected):
        objects.plan(said)


# Damaged snapshots


def damaged(text: str) -> Iterator[str]:
    """A snapshot that is cut, or of which a value is another."""
    for part in range(8):
        yield text[: len(text) * part // 8]
    chance = random.Random(4)
    for _ in range(40):
        said = json.loads(text)
        found: Any = said
        while isinstance(found, (dict, list)) and found:
            place = found
            at = chance.choice(list(found) if isinstance(found, dict) else range(len(found)))
            found = found[at]
        place[at] = chance.choice([None, -1, 2**64, "\0", "x" * 300, [[]], {"hex": "0"}, 1e300])
        yield json.dumps(said)


def test_damaged_snapshots_say_where_and_change_nothing(
    host: simhost.Host, lab: Switch, objects: Host
) -> None:
    said = objects.snapshot()
    said["observed"] = {"snapshot": 1}
    before = everything(host)
    refusals: Set[str] = set()
    planned: Set[str] = set()
    for text in damaged(json.dumps(said)):
        try:
            host.apply(json.loads(text))
            before = everything(host)
        except ValueError as error:
            refusals.add(f"no JSON: {error}")
        except simhost.HostRefused as error:
            refusals.add(str(error))
            assert everything(host) == before
            try:
                objects.plan(json.loads(text), whole=True)
            except DocumentError as wrong:
                assert wrong.path
                planned.add(str(wrong))
            assert everything(host) == before
    assert len(refusals) > 20 and len(planned) > 20
    assert all(": " in one for one in refusals)
