"""Snapshots with other names and addresses: nothing of the old ones is left, and all else is as it
was."""

import ipaddress
import json
from typing import Any, Iterator, List, Optional

import drawn_documents
import pytest
import seeds
import simhost
from drawn_documents import STOPPED, Document, host_of
from hypothesis import given, seed
from vswitch import DocumentError, Host, Switch, _table
from vswitch.anonymizing import anonymized

CLIENT = "com.quorix.common.port.vnicConnectee"
# Names and addresses that stand nowhere else in a document, in each place that has some.
SECRET: Document = {
    "runtime_options": {"IGMPRouterIP": "10.77.3.1", "MLDRouterIP": "fd77:3::1"},
    "uplinks": [{"name": "secretnic0"}, {"name": "secretnic1"}],
    "switches": [
        {
            "alias": "secret switch",
            "id": "secret-id",
            "portset": "secret-portset",
            "uplink_ports": [{"id": "secret-left", "name": "Secret Left", "uplink": "secretnic0"}],
            "uplinks": ["secretnic1"],
            "lags": [{"name": "secretlag", "uplinks": ["secretnic0", "secretnic1"]}],
            "teaming": {"active": ["secretlag"], "standby": ["Secret Left", "secretnic1"]},
            "addresses": [{"mac": "00:77:66:00:00:09"}, {"mac": "00:77:66:00:00:0a"}],
            "uplink_mirror_sessions": [{"sid": "secret-edge", "to": [{"ip": "10.77.3.9"}]}],
            "properties": {"com.secretcorp.note": {"type": "config", "text": "secret note"}},
            "host_properties": {"com.secretcorp.rack": {"type": "runtime", "text": "secret rack"}},
            "counters": {"txErrors": 3},
            "ports": [
                {
                    "id": "secret-port",
                    "alias": "secret desk",
                    "connection": 77031,
                    "vlan": {"id": 100, "trunk": ["10-12", 20], "priority": 5},
                    "uplink": "Secret Left",
                    "ethernet_filter": {"addresses": ["01:00:5e:77:66:55", "77:66:55:44:33:22"]},
                    "addresses": [
                        {"mac": "00:77:66:00:00:01", "type": "static"},
                        {"mac": "76:66:55:00:00:02", "vlan": 10, "age": 20},
                    ],
                    "groups": [
                        {"address": "239.77.3.1", "sources": ["10.77.3.7"], "version": 3},
                        {"address": "ff05::7703:1"},
                        {"address": "33:33:77:66:55:44"},
                    ],
                    "mirror_sessions": [
                        {
                            "sid": "secret-audit",
                            "name": "secret audit of the desk",
                            "to": [{"port": "secret-other"}, {"ip": "fd77:3::9"}],
                            "received_by": [{"uplink": "secretnic1"}, {"vlan": 5}],
                        }
                    ],
                    "properties": {CLIENT: {"type": "runtime", "text": "secret machine"}},
                },
                {"id": "secret-other", "teaming": {"active": ["secretnic0"]}, "connection": 77031},
            ],
        }
    ],
}


@pytest.fixture(autouse=True)
def stopped(host: simhost.Host) -> None:
    host_of({"clock": STOPPED})


@pytest.fixture
def secret(host: simhost.Host) -> Switch:
    host.apply({"switches": []})
    host_of({**SECRET, "clock": STOPPED})
    return Host(simulated=True).switches["secret switch"]


def texts(value: Any) -> Iterator[Any]:
    """All texts and numbers of a document, keys too."""
    if isinstance(value, dict):
        for key, one in value.items():
            yield key
            yield from texts(one)
    elif isinstance(value, list):
        for one in value:
            yield from texts(one)
    else:
        yield value


def packed(address: str) -> bytes:
    if ":" in address and len(address) == 17:
        return bytes.fromhex(address.replace(":", ""))
    return ipaddress.ip_address(address).packed


ADDRESSES = [one for one in texts(SECRET) if isinstance(one, str) and "77" in one]


def survivors(said: Document) -> List[str]:
    """What of the names and addresses is in the text or in any bytes of a document."""
    text = json.dumps(said).lower()
    data = b"".join(bytes.fromhex(one) for one in texts(said) if is_hex(one))
    found = [word for word in ("secret", "77031", "77:66", "66:55") if word in text]
    found += [one for one in ADDRESSES if one in text or packed(one) in data]
    found += ["bytes"] if b"secret" in data.lower() else []
    return found


def is_hex(one: Any) -> bool:
    try:
        return isinstance(one, str) and bool(bytes.fromhex(one))
    except ValueError:
        return False


def test_the_search_finds_what_is_there(secret: Switch) -> None:
    said = secret.host.snapshot()
    assert set(ADDRESSES) | {"secret", "77031", "bytes"} <= set(survivors(said))
    assert len(ADDRESSES) > 12
    teaming = secret.properties()["com.quorix.vswitch.teaming"].data
    assert survivors({"hex": teaming.hex()}) == ["bytes"]


@pytest.mark.parametrize("key", [None, b"a key"])
def test_nothing_survives_and_a_clone_starts(secret: Switch, key: Any) -> None:
    # Bytes that are understood, beside what words say: of another type, and with something after
    # the end of a name.
    for thing, name in ((secret, "teaming"), (secret.ports["secret-port"], "mirror_sessions")):
        held = thing.properties()[thing._settings[name].key]
        thing.set_property(held.name, held.data, _table.PROPERTY_TYPES["runtime"])
    other = secret.ports["secret-other"]
    policy = other.properties()[other._settings["teaming"].key]
    tail = policy.data.replace(b"secretnic0\0", b"secretnic0\0secret tail")[: len(policy.data)]
    other.set_property(policy.name, tail, _table.PROPERTY_TYPES["config"])
    before = secret.host.snapshot()
    assert before["observed"]["left_out"] == []
    said = secret.host.snapshot(anonymize=True, key=key)
    assert survivors(said) == []
    host_of({**json.loads(json.dumps(said)), "clock": STOPPED})
    clone = Host(simulated=True).snapshot()
    assert shape(clone) == shape(said) == shape(before)
    (switch,) = Host(simulated=True).switches.values()
    assert {str(one) for one in switch.carriers().values()} <= set(switch.uplinks)


NAMED_BY = ("properties", "host_properties", "mirror_counters")


def shape(value: Any, under: str = "") -> Any:
    """A document with all texts alike, and in any order: what addresses become has another."""
    if isinstance(value, dict):
        names = [one if under not in NAMED_BY or one in _table.BY_KEY else "" for one in value]
        held = [(name, shape(one, key)) for name, (key, one) in zip(names, value.items())]
        return sorted((one for one in held if one[0] != "observed"), key=repr)
    if isinstance(value, list):
        return sorted((shape(one) for one in value), key=repr)
    return "a number" if under == "connection" else "a text" if isinstance(value, str) else value


def test_what_is_one_is_one_other(secret: Switch) -> None:
    said = secret.host.snapshot(anonymize=True)
    (switch,) = said["switches"]
    port, other = switch["ports"]
    assert switch["uplink_ports"][0]["name"] == port["uplink"] == switch["teaming"]["standby"][0]
    assert switch["lags"][0]["name"] == switch["teaming"]["active"][0]
    assert [one["name"] for one in said["uplinks"]] == switch["lags"][0]["uplinks"]
    (session,) = port["mirror_sessions"]
    assert session["to"][0]["port"] == other["id"]
    assert session["received_by"][0]["uplink"] == said["uplinks"][1]["name"]
    assert session["received_by"][1] == {"vlan": 5} and port["vlan"]["id"] == 100
    assert port["connection"] == other["connection"] not in (0, 77031)


def test_what_is_kept_of_addresses(secret: Switch) -> None:
    said = secret.host.snapshot(anonymize=True)
    (switch,) = said["switches"]
    port = switch["ports"][0]
    macs = [one["mac"] for one in (*switch["addresses"], *port["addresses"])]
    assert len({one[:8] for one in macs}) == 2 and len(set(macs)) == 4
    assert [int(one[:2], 16) & 3 for one in macs] == [0, 0, 0, 2]
    group, other = port["ethernet_filter"]["addresses"]
    assert group.startswith("01:00:5e:") and int(group[9:11], 16) < 128
    assert int(other[:2], 16) & 3 == 3
    groups = [one["address"] for one in port["groups"]]
    assert sorted(len(one) == 17 for one in groups) == [False, False, True]
    assert any(one.startswith("239.") for one in groups)
    assert any(one.startswith("ff05::") for one in groups)
    assert any(one.startswith("33:33:00:") for one in groups)


def test_what_is_not_understood_is_zeroed_and_said(secret: Switch) -> None:
    said = secret.host.snapshot(anonymize=True)
    (switch,) = said["switches"]
    zeroed = {"type": "config", "hex": "00" * len(b"secret note\0")}
    ((note, held),) = switch["properties"].items()
    assert held == zeroed and note == "property-1"
    listed = said["observed"]["anonymized"]
    assert listed["dropped"] == []
    assert [(one["what"], one["keys"], one.get("port")) for one in listed["zeroed"]] == [
        ("properties", [CLIENT], switch["ports"][0]["id"]),
        ("properties", ["property-1"], None),
        ("host_properties", ["property-2"], None),
    ]


def test_with_a_key_all_snapshots_say_the_same(secret: Switch) -> None:
    host = secret.host
    first = host.snapshot(anonymize=True, key=b"one")
    secret.ports["secret-other"].remove()
    secret.add_port("secret-third")
    again = host.snapshot(anonymize=True, key=b"one")
    assert again["switches"][0]["ports"][0] == first["switches"][0]["ports"][0]
    other = host.snapshot(anonymize=True, key=b"another")
    assert other["switches"][0]["alias"] != again["switches"][0]["alias"]


def test_what_was_refused_has_no_names(host: simhost.Host, secret: Switch) -> None:
    host.fault("VSQEX_GetRARPStats", status="QEX_BUSY")
    host.fault("VSDVS_GetPortSecurity", panic=(OSError, "secret-port is gone"))
    host.fault("VSDVS_GetPortTeamingPolicy", panic=(OSError, "secret-other is gone"))
    said = secret.host.snapshot(anonymize=True)
    host.clear_faults()
    assert survivors(said) == []
    (switch,) = said["switches"]
    by_call = {one["call"]: one for one in said["observed"]["refused"]}
    busy = by_call["VSQEX_GetRARPStats"]
    assert (busy["switch"], busy["status"], busy["words"]) == (switch["alias"], "QEX_BUSY", "Busy")
    trap = by_call["VSDVS_GetPortTeamingPolicy"]
    assert (trap["port"], trap["status"]) == (switch["ports"][1]["id"], "trap")


TUNNELS = {
    "underlay": {"device": "secret1", "address": "203.0.113.77/24", "gateway": "203.0.113.177"},
    "uplinks": [{"name": "secretnic0", "device": "secret2"}],
    "switches": [
        {
            "alias": "secret",
            "ports": [
                {"id": "one", "device": "secret3"},
                {"id": "other", "device": {"name": "secret4", "mac": "02:00:00:00:77:66"}},
            ],
            "fabric": {
                "encapsulation": "geneve",
                "key": 77031,
                "peers": ["203.0.113.77", "203.0.113.78", "2001:db8::77"],
                "uplink": "secret-tunnels",
            },
        }
    ],
}


@pytest.mark.parametrize("key", [None, b"a key"])
def test_nothing_survives_of_what_brings_frames(host: simhost.Host, key: Optional[bytes]) -> None:
    host.apply({"switches": [], "clock": {"stopped": False}})
    said = anonymized(TUNNELS, key)
    assert survivors(TUNNELS) != survivors(said) == []
    fabric = said["switches"][0]["fabric"]
    assert fabric["key"] < 2**24 and fabric["encapsulation"] == "geneve"
    own, bits = said["underlay"]["address"].split("/")
    assert own in fabric["peers"] and bits == "24"
    if key:
        again = anonymized({**TUNNELS, "uplinks": []}, key)
        assert again["switches"] == said["switches"]
    # A host takes it, as it took the other.
    for document in TUNNELS, said:
        host_of(document)


def test_no_plan_makes_a_host_what_it_says(secret: Switch) -> None:
    said = secret.host.snapshot(anonymize=True)
    with pytest.raises(DocumentError, match="^observed.anonymized: what it names has other names"):
        secret.host.plan(said, whole=True)


@pytest.mark.parametrize(
    "change, words",
    [
        ({"hosts": []}, "hosts: unknown key"),
        ({"switches": [{"alias": "a", "owner": "x"}]}, r"switches\[0\].owner: unknown key"),
        ({"switches": [{}]}, r"switches\[0\].alias: None is not a text"),
        ({"switches": [{"alias": "a", "addresses": [{"mac": "x"}]}]}, r"mac: 'x' is not six bytes"),
    ],
)
def test_what_nobody_knows_is_no_document(change: Document, words: str) -> None:
    with pytest.raises(DocumentError, match=words):
        anonymized(change)


def test_what_chance_describes() -> None:
    """Whatever a document has, the names are others, and a host takes it if it took the other."""
    taken: List[bool] = []

    @seed(11)
    @seeds.options(12)
    @given(drawn_documents.documents())
    def each(document: Document) -> None:
        try:
            host_of(document)
        except simhost.HostRefused:
            return
        said = Host(simulated=True).snapshot(anonymize=True)
        host_of(json.loads(json.dumps(said)))
        names = {one for one in texts(said) if isinstance(one, str)}
        assert not names & {"swïtch 0", "swïtch 1", "web-1", "wéb", "nic0", "nic1", "left", "lag1"}
        taken.append(True)

    each()
    assert len(taken) > 6
