"""The commands that change the host: what they take, say and leave."""

import subprocess
from typing import Any, Dict, List

import pytest
from command_line import PROGRAM, SIMULATED, Refused, Vswitch
from simhost import SharedHost


def port_of(host: SharedHost, id_: str = "web-1") -> Dict[str, Any]:
    switch = switch_of(host)
    return next(one for one in switch["ports"] if one["id"] == id_)


def switch_of(host: SharedHost, alias: str = "lab") -> Dict[str, Any]:
    return next(one for one in host.describe()["switches"] if one["alias"] == alias)


def test_set(vswitch: Vswitch, lab: SharedHost) -> None:
    done = vswitch("set", "lab", "mtu=1500")
    assert (done.status, done.stdout, done.stderr) == (0, "lab/mtu: 9000 -> 1500\n", SIMULATED)
    assert switch_of(lab)["mtu"] == 1500
    assert vswitch("set", "lab", "mtu=1500").stdout == "no changes\n"


def test_set_for_programs(vswitch: Vswitch) -> None:
    told = vswitch("set", "lab", "mtu=1500", "--json").json
    assert told == [{"path": "lab/mtu", "before": 9000, "after": 1500}]
    assert vswitch("set", "--json", "lab", "mtu=1500").json == []


def test_several_settings(vswitch: Vswitch, lab: SharedHost) -> None:
    done = vswitch("set", "lab/web-2", "vlan=7", "trunk=10-12,20", "forbids=forged_transmits")
    assert done.stdout == (
        "lab/web-2/vlan: absent -> id=7 trunk=10-12,20\n"
        "lab/web-2/forbids: absent -> forged_transmits\n"
    )
    port = port_of(lab, "web-2")
    assert port["vlan"] == {"id": 7, "trunk": ["10-12", 20]}
    assert port["forbids"] == ["forged_transmits"]


@pytest.mark.parametrize(
    "assignments, vlan",
    [
        (["vlan=9"], 9),
        (["id=9"], {"id": 9, "trunk": ["10-12"]}),
        (["vlan.id=9", "priority=3"], {"id": 9, "priority": 3, "trunk": ["10-12"]}),
        (["trunk="], 7),
        (["vlan=9", "trunk=5"], {"id": 9, "trunk": [5]}),
        (['vlan={"id": 3, "guest_tagging": true}'], {"id": 3, "guest_tagging": True}),
    ],
)
def test_members(vswitch: Vswitch, lab: SharedHost, assignments: List[str], vlan: object) -> None:
    """A member leaves the others of its setting as they are; a setting does not."""
    assert vswitch("set", "lab/web-1", *assignments).status == 0
    assert port_of(lab)["vlan"] == vlan


@pytest.mark.parametrize(
    "place, assignment, path, value",
    [
        ("lab", "flags=notify", ["teaming", "flags"], ["notify"]),
        ("lab", "teaming.standby=", ["teaming", "standby"], []),
        ("lab", "multicast=snooping", ["multicast"], "snooping"),
        ("lab", "disabled=true", ["disabled"], True),
        ("lab", "aging_time=60", ["mac_learning", "aging_time"], 60),
        ("lab/web-1", "forbids=", ["forbids"], []),
        (
            "lab/web-1",
            "forbids=mac_changes,promiscuous",
            ["forbids"],
            ["promiscuous", "mac_changes"],
        ),
        ("lab/web-1", "alias=the web, first", ["alias"], "the web, first"),
        ("lab/web-1", "alias=a=b", ["alias"], "a=b"),
        ("lab/web-1", "alias=7", ["alias"], "7"),
        ("lab/web-1", "uplink=right", ["uplink"], "right"),
        ("lab/web-1", "frames=unicast,sink", ["ethernet_filter", "frames"], ["unicast", "sink"]),
        (
            "lab/web-1",
            "addresses=01:00:5e:00:00:01",
            ["ethernet_filter", "addresses"],
            ["01:00:5e:00:00:01"],
        ),
    ],
)
def test_values(
    vswitch: Vswitch, lab: SharedHost, place: str, assignment: str, path: List[str], value: Any
) -> None:
    done = vswitch("set", place, assignment)
    assert done.status == 0, done
    held: Any = port_of(lab) if "/" in place else switch_of(lab)
    for name in path:
        held = held.get(name, []) if value == [] else held[name]
    assert held == value


def test_mirrors_as_json(vswitch: Vswitch, lab: SharedHost) -> None:
    assert (
        vswitch("set", "lab/web-1", 'mirrors=[{"sid": "a", "to": [{"port": "web-2"}]}]').status == 0
    )
    assert [one["sid"] for one in port_of(lab)["mirror_sessions"]] == ["a"]


def test_private_vlans_as_json(vswitch: Vswitch, lab: SharedHost) -> None:
    entries = '[{"primary": 100, "secondary": 101, "type": "isolated"}]'
    assert vswitch("set", "lab", f"private_vlans={entries}").status == 0
    expected = [{"primary": 100, "secondary": 101, "type": "isolated"}]
    assert vswitch("show", "lab", "--json").json["private_vlans"] == expected


def test_a_text_that_clears_in_documents(vswitch: Vswitch, lab: SharedHost) -> None:
    assert vswitch("set", "lab/web-1", "alias=absent").status == 0
    assert "├── alias: absent" in vswitch("show", "lab/web-1").lines


def test_set_an_uplink_port(vswitch: Vswitch, lab: SharedHost) -> None:
    assert vswitch("set", "lab/left", "blocked=true").stdout == "lab/left/blocked: absent -> true\n"
    assert switch_of(lab)["uplink_ports"][0]["blocked"] is True


def test_unset(vswitch: Vswitch, lab: SharedHost) -> None:
    done = vswitch("unset", "lab/web-1", "forbids", "teaming")
    assert done.stdout == "lab/web-1/forbids: promiscuous -> absent\n"
    assert "forbids" not in port_of(lab)
    assert vswitch("unset", "lab/web-1", "mirrors").stdout == "no changes\n"


def test_add_a_switch(vswitch: Vswitch, lab: SharedHost) -> None:
    options = ["--identifier", "new-1", "--max-ports", "8", "--uplink", "nic2", "--portset", "p"]
    done = vswitch("add", "new", "mtu=9000", "active=uplink1", *options)
    assert done.status == 0, done
    made = switch_of(lab, "new")
    assert (made["id"], made["max_ports"], made["mtu"]) == ("new-1", 8, 9000)
    assert made["teaming"]["active"] == ["uplink1"]
    assert made["uplink_ports"][0]["uplink"] == "nic2" and made["portset"] == "p"


def test_add_a_port(vswitch: Vswitch, lab: SharedHost) -> None:
    done = vswitch("add", "lab/web-3", "vlan=7", "trunk=9", "--external-id", "vm-1")
    assert done.lines[0] == "lab/web-3: absent -> id=web-3"
    made = port_of(lab, "web-3")
    assert (made["vlan"], made["external_id"]) == ({"id": 7, "trunk": [9]}, "vm-1")


def test_remove(vswitch: Vswitch, lab: SharedHost) -> None:
    assert vswitch("remove", "lab/web-2").stdout == "lab/web-2: id=web-2 -> absent\n"
    assert [one["id"] for one in switch_of(lab)["ports"]] == ["web-1"]
    assert vswitch("remove", "lab").stdout == "lab: alias=lab -> absent\n"
    assert [one["alias"] for one in lab.describe()["switches"]] == ["vswitch0"]


def test_uplinks(vswitch: Vswitch, lab: SharedHost) -> None:
    def uplinks() -> List[str]:
        shown = vswitch("show", "lab", "--json").json
        assert isinstance(shown["uplinks"], list)
        return shown["uplinks"]

    lab.link("nic2").up()
    assert vswitch("uplink", "lab", "add", "nic2").stdout == "lab/nic2: absent -> name=nic2\n"
    assert uplinks() == ["nic0", "nic1", "nic2"]
    assert vswitch("uplink", "lab", "down", "nic2").stdout == "uplinks/nic2/link: up -> down\n"
    assert "lab       9000  2 of 64   nic0 up, nic1 up, nic2 down" in vswitch("list").lines
    assert vswitch("uplink", "lab", "up", "nic2").stdout == "uplinks/nic2/link: down -> up\n"
    assert vswitch("uplink", "lab", "up", "nic2").stdout == "no changes\n"
    assert vswitch("uplink", "lab", "remove", "nic2").stdout == "lab/nic2: name=nic2 -> absent\n"
    assert uplinks() == ["nic0", "nic1"]


SETTINGS = (
    "alias, blocked, connection, ethernet_filter, forbids, mac_learning, mirror_sessions,"
    " nested_tag, teaming, transmit_uplink, uplink, vlan"
)


@pytest.mark.parametrize(
    "words, said",
    [
        (["set", "lab", "mtu=99"], "mtu: 99 is below 1280"),
        (
            ["set", "lab", "mtu=many"],
            "mtu: 'many' is not a whole number from 1280 to 9190",
        ),
        (["set", "lab", "mtu"], "'mtu' is not NAME=VALUE"),
        (["set", "lab"], "Missing argument 'NAME=VALUE...'."),
        (["set", "lab/web-1", "mtu=1500"], f"no setting 'mtu' (there are {SETTINGS})"),
        (["set", "lab/web-1", "=1500"], f"no setting '' (there are {SETTINGS})"),
        (["set", "lab/web-1", "vlan.mtu=1"], f"no setting 'vlan.mtu' (there are {SETTINGS})"),
        (["set", "lab/web-1", "vlan=4095"], "vlan.id: 4095 is above 4094"),
        (["set", "lab/web-1", "trunk=12-10"], "vlan.trunk[0]: '12-10' is not in rising order"),
        (["set", "lab/web-1", "blocked=yes"], "blocked: 'yes' is not true or false"),
        (
            ["set", "lab/web-1", "limit=x"],
            "mac_learning.limit: 'x' is not a whole number from 0 to",
        ),
        (
            ["set", "lab", "teaming=port"],
            "teaming: 'port' is not a JSON object with some of balance",
        ),
        (["set", "lab", "teaming={"], "teaming: '{' is not JSON: Expecting property name"),
        (["set", "lab", "mtu=" + "9" * 5000], "mtu: '9999"),
        (["set", "lab", "teaming=" + "[" * 5000], "teaming: '[[[["),
        (["unset", "lab/web-1", "trunk"], f"no setting 'trunk' (there are {SETTINGS})"),
        (["add", "new", "--max-ports", "0"], "max_ports: 0 is below 1"),
        (["add", "new", "--external-id", "x"], "--external-id is for a port"),
        (["add", "lab/x", "--uplink", "nic2"], "--uplink is for a switch"),
        (
            ["uplink", "lab", "sideways", "nic0"],
            "Invalid value for 'add|remove|up|down': 'sideways'",
        ),
    ],
)
def test_wrong_command_lines(refused: Refused, words: List[str], said: str) -> None:
    told = refused(*words, status=2)
    assert told.startswith(f"vswitch: {said}")
    assert told.endswith(f"vswitch: see vswitch {words[0]} --help\n")


@pytest.mark.parametrize(
    "words, said",
    [
        (["set", "nope", "mtu=9000"], "no switch 'nope' (there are lab, vswitch0)"),
        (["set", "lab/x", "vlan=7"], "no port 'x' of switch 'lab' (it has web-1, web-2)"),
        (["add", "lab"], "the switch 'lab' is there already"),
        (["add", "lab/web-1"], "the port 'web-1' of switch 'lab' is there already"),
        (["add", "lab/left"], "the port 'left' of switch 'lab' is there already"),
        (["add", "nope/x"], "no switch 'nope' (there are lab, vswitch0)"),
        (["add", "new", "--uplink", "nic99"], "the host has no uplink 'nic99'"),
        (["add", "new", "--uplink", "nic0"], "the uplink 'nic0' is at switch 'lab'"),
        (["uplink", "lab", "add", "nic0"], "the uplink 'nic0' is at switch 'lab' already"),
        (["uplink", "lab", "add", "nic4"], "the uplink 'nic4' is at switch 'vswitch0'"),
        (
            ["uplink", "lab", "remove", "nic4"],
            "no uplink 'nic4' of switch 'lab' (it has nic0, nic1)",
        ),
        (["remove", "lab/x"], "no port 'x' of switch 'lab' (it has web-1, web-2)"),
        (["remove", "lab/"], "no port '' of switch 'lab' (it has web-1, web-2)"),
        (["unset", "lab/", "teaming"], "no port '' of switch 'lab' (it has web-1, web-2)"),
        (["add", "new/"], "no switch 'new' (there are lab, vswitch0)"),
    ],
)
def test_what_the_host_has_not(refused: Refused, words: List[str], said: str) -> None:
    assert refused(*words) == f"vswitch: {said}\n"


def test_several_settings_are_one_transaction(lab: SharedHost, refused: Refused) -> None:
    lab.fault("VSDVS_SetPortSecurity", status="QEX_BUSY")
    told = refused("set", "lab/web-1", "vlan=9", "forbids=mac_changes")
    assert told.startswith("vswitch: VSDVS_SetPortSecurity")
    assert told.endswith("; everything is as it was before\n")


def test_what_cannot_be_put_back(lab: SharedHost, vswitch: Vswitch) -> None:
    lab.fault("VSDVS_SetPortSecurity", status="QEX_BUSY")
    lab.fault("DVSQEX_PortDataSet", status="QEX_BUSY", times=99)
    lab.fault("VSDVS_SetPortVLANPolicy", nth=2, status="QEX_BUSY", times=99)
    done = vswitch("set", "lab/web-1", "vlan=9", "forbids=mac_changes")
    assert (done.status, done.stdout) == (3, "")
    assert done.stderr.endswith("; not as it was: lab/web-1: vlan\n")
    assert port_of(lab)["vlan"] == 9


def test_a_trap_is_undone(lab: SharedHost, refused: Refused) -> None:
    lab.fault("VSDVS_SetPortSecurity", panic=("OSError", "gone"))
    told = refused("set", "lab/web-1", "vlan=9", "forbids=mac_changes")
    assert "gone" in told and told.endswith("; everything is as it was before\n")


def test_what_is_done_and_cannot_be_told(lab: SharedHost) -> None:
    """It is not as before, so the status does not say so."""
    with open("/dev/full", "w") as full:
        done = subprocess.run(
            [PROGRAM, "set", "lab", "mtu=1500"],
            env=lab.environment,
            stdout=full,
            stderr=subprocess.PIPE,
            text=True,
        )
    said = "vswitch: it is done, which cannot be written: [Errno 28] No space left on device\n"
    assert (done.returncode, done.stderr) == (3, SIMULATED + said)
    assert switch_of(lab)["mtu"] == 1500


def test_a_link_that_stays_down(lab: SharedHost, refused: Refused) -> None:
    lab.apply({"uplinks": [{"name": "nic0", "link": "down"}]})
    told = refused("uplink", "lab", "up", "nic0")
    assert told.startswith("vswitch: lab/nic0 is not up within 5 s")
