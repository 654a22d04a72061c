"""What hosts share, looked at and changed by an operator who is at none of them."""

import json
import subprocess
from pathlib import Path
from typing import Any, Dict, Iterator

import pytest

from certificates import Authority, Certificate
from fabric_lab import FabricLab, Host, Trust, killed, started
from frame_lab import comes_true
from operating import PROGRAM, Operator, of_lab
from vswitch.command.fabric import program

LAB: Dict[str, Any] = {
    "uplinks": [{"name": "nic0"}],
    "switches": [
        {
            "alias": "lab",
            "mtu": 9000,
            "uplinks": ["nic0"],
            "ports": [{"id": "a", "vlan": {"id": 7, "priority": 3}}, {"id": "b"}],
        }
    ],
}
OTHER: Dict[str, Any] = {"uplinks": [{"name": "nic0"}], "switches": [{"alias": "mine"}]}


@pytest.fixture
def lab(tmp_path: Path) -> Iterator[FabricLab]:
    with FabricLab(tmp_path) as lab:
        yield lab


@pytest.fixture
def operator(lab: FabricLab) -> Operator:
    return Operator(lab)


def shared(lab: FabricLab) -> Host:
    """A host that shares the switch lab."""
    one = started(lab.host("one", LAB))
    one.ctl("share", "lab")
    return one


def test_an_operator_sees_and_changes_what_hosts_share(lab: FabricLab, operator: Operator) -> None:
    one, other = shared(lab), started(lab.host("two", OTHER))
    other.ctl("join", "lab")

    (listed,) = operator.json("list")
    assert (listed["alias"], listed["mtu"], listed["max_ports"]) == ("lab", 9000, 128)
    assert (listed["hosts"], listed["ports"]) == (["one", "two"], {"a": None, "b": None})
    lines = operator.process("list").stdout.splitlines()
    assert lines[0].split() == ["SWITCH", "MTU", "PORTS", "CONNECTED", "HOSTS"]
    assert lines[1].split() == ["lab", "9000", "2", "of", "128", "0", "one,two"]

    # A setting has the words that it has on each host.
    assert operator.json("show", "lab/a")["vlan"] == one.ports("lab")["a"]["vlan"]
    assert "vlan: id=7 priority=3" in operator.told("show", "lab")
    assert operator.json("show", "lab/b")["observed"] == {"host": None}

    wanted = of_lab(
        mtu=1600,
        ports=[
            {"id": "a", "vlan": 8, "addresses": [{"mac": "020000000001", "type": "static"}]},
            {"id": "b", "state": "absent"},
            {"id": "c", "forbids": ["forged_transmits"]},
        ],
    )
    changes = [
        "lab/mtu: 9000 -> 1600",
        "lab/a/vlan: id=7 priority=3 -> 8",
        "lab/a/macs/02:00:00:00:00:01: absent -> mac=02:00:00:00:00:01 vlan=0 vni=0 type=static",
        "lab/b: id=b -> absent",
        "lab/c: absent -> id=c",
        "lab/c/forbids: absent -> forged_transmits",
    ]
    assert operator.told("diff", "-", given=wanted).splitlines() == changes
    assert operator.told("apply", "-", "--dry-run", given=wanted).splitlines() == changes
    assert one.setting("lab", "mtu") == 9000
    done = operator("apply", "-", "--wait", "30", given=wanted)
    assert done == (0, "\n".join([*changes, ""]), "# in force on one, two\n")
    for host in (one, other):
        ports = host.ports("lab")
        assert (host.setting("lab", "mtu"), sorted(ports)) == (1600, ["a", "c"])
        assert ports["a"]["vlan"] == 8 and ports["c"]["forbids"] == ["forged_transmits"]
        assert ports["a"]["addresses"][0]["mac"] == "02:00:00:00:00:01"
    # What hosts made of it says the same.
    assert operator.told("apply", "-", "--wait", "30", given=wanted) == "no changes\n"
    assert other.call("VSDVS_SetMTU", "lab", 1700) == 0
    assert operator.json("list")[0]["mtu"] == 1700

    # What is wrong is told, and how it ends.
    own = "each host has its own, and a fabric has none"
    done = operator("apply", "-", given=of_lab(uplinks=["nic0"]))
    assert done == (1, "", f"vswitch: -: switches[0].uplinks: {own}\n")
    done = operator("watch", "--kind", "x")
    assert done.status == 2 and "--kind: 'x' is not one of switch, port" in done.stderr

    told = operator.json("hosts")
    assert [host["name"] for host in told["hosts"]] == ["one", "two"]
    assert told["hosts"][0]["links"] == {"nic0": "up"}
    # A switch that an operator makes, on one of them.
    made = {"switches": [{"alias": "new", "hosts": ["two"], "ports": [{"id": "x"}]}]}
    operator.told("apply", "-", "--wait", "30", given=made)
    assert sorted(other.ports("new")) == ["x"] and one.setting("new", "id") is None
    gone = {"switches": [{"alias": "new", "state": "absent"}, {"alias": "lab", "hosts": ["one"]}]}
    operator.told("apply", "-", "--wait", "30", given=gone)
    assert other.setting("new", "id") is None and other.setting("lab", "id") is None
    assert sorted(one.ports("lab")) == ["a", "c"]


def test_what_hosts_cannot_bear_and_who_is_away_is_told(lab: FabricLab, operator: Operator) -> None:
    one, other = shared(lab), started(lab.host("two", {"switches": [{"alias": "taken"}]}))
    other.ctl("join", "lab")
    many = {"switches": [{"alias": "taken", "hosts": ["one", "two"]}]}
    done = operator("apply", "-", "--wait", "30", given=many)
    assert done.status == 3 and done.stdout.startswith("taken: absent -> id=")
    assert "not all can bear it: two: taken: " in done.stderr
    assert "two: taken: " in operator.told("hosts")
    asked = operator("drill", "taken")
    assert (asked.status, asked.stderr) == (1, "vswitch: two: the host has no such switch\n")
    # A host that is away is waited for in vain.
    killed(other)
    said = {"errors": ["map", [["state", "the disk is full"], ["taken", "is taken"]]]}
    of_two = [["name", "==", "two"]]
    lab.databases.transact({"op": "update", "table": "Host", "where": of_two, "row": said})
    done = operator("apply", "-", "--wait", "0.5", given=of_lab(mtu=1600))
    assert (done.status, done.stdout) == (3, "lab/mtu: 9000 -> 1600\n")
    why = "two (state: the disk is full)"
    assert done.stderr == f"vswitch: the change is made, and not in force on {why} after 0.5 s\n"
    assert comes_true(lambda: one.setting("lab", "mtu") == 1600)
    # Gone for good, it is forgotten.
    assert operator.told("forget", "two").splitlines() == [
        "two: name=two -> absent",
        "lab/hosts: one,two -> one",
        "taken/hosts: one,two -> one",
    ]
    assert [host["name"] for host in operator.json("hosts")["hosts"]] == ["one"]


def test_hosts_tell_what_would_carry_their_ports(lab: FabricLab, operator: Operator) -> None:
    two_uplinks = {
        "uplinks": [{"name": "nic0"}, {"name": "nic1"}],
        "switches": [
            {
                "alias": "lab",
                "uplinks": ["nic0", "nic1"],
                "teaming": {"balance": "explicit", "active": ["nic0"], "standby": ["nic1"]},
                "ports": [{"id": "a"}, {"id": "b", "uplink": "nic1"}, {"id": "c"}],
            }
        ],
    }
    one, other = started(lab.host("one", two_uplinks)), started(lab.host("two", OTHER))
    one.ctl("share", "lab")
    other.ctl("join", "lab")
    for port in ("a", "b"):
        one.client("lab", port)
    # As a drill of that host alone finds, which takes the links down.
    command = [str(PROGRAM), "drill", "lab", "--json"]
    done = subprocess.run(command, env=one.environment, stdout=subprocess.PIPE, text=True)
    found = [row for row in json.loads(done.stdout) if row["port"] != "c"]
    assert {(row["uplink"], row["port"], row["meanwhile"]) for row in found} == {
        ("nic0", "a", "nic1"),
        ("nic1", "b", None),
    }
    asked = operator("drill", "lab", "--json")
    assert json.loads(asked.stdout) == [{"host": "one", **row} for row in found]
    assert asked.status == 1
    assert asked.stderr == "vswitch: no uplink would carry b without one/nic1\n"
    one.ctl("disconnect", "lab", "b")
    lines = operator.told("drill", "lab").splitlines()
    assert [line.split() for line in lines[1:]] == [["one", "nic0", "a", "nic1"]]
    assert operator.json("hosts")["hosts"][0]["links"] == {"nic0": "up", "nic1": "up"}
    killed(other)
    asked = operator("drill", "lab", "--timeout", "0.5")
    assert (asked.status, asked.stderr) == (1, "vswitch: no reply from two\n")
    assert lab.databases.rows("Drill") == []


def test_servers_and_operators_prove_who_they_are(tmp_path: Path) -> None:
    place = tmp_path / "trust"
    place.mkdir()
    trust = Trust(place)
    ours = trust.of_hosts.issue("operator")
    expired = trust.of_hosts.issue("late", days=-1)
    stranger = Authority(place, "others").issue("operator")
    with FabricLab(tmp_path, trust=trust) as lab:
        operator = Operator(lab)
        assert operator.process("list").status == 2
        expected = (
            (trust.options_of_host(ours), ""),
            (trust.options_of_host(stranger), "one does that does not take this certificate"),
            (
                trust.options_of_host(expired),
                f" (the certificate {expired.certificate} expired on ",
            ),
            (ours.options(trust.of_hosts.certificate), "certificate verify failed"),
        )
        # Each waits for servers that will do.
        asked = [operator.start("hosts", before=options) for options, _ in expected]
        for process, (_, said) in zip(asked, expected):
            _, wrong = process.communicate()
            assert (process.returncode, said in wrong) == (1 if said else 0, True), wrong
        trust.server = trust.of_servers.issue("database", days=-1)
        lab.databases.kill(0)
        lab.databases.start(0)
        done = operator.process("hosts", before=trust.options_of_host(ours))
        assert (done.status, "certificate has expired" in done.stderr) == (1, True), done
        lab.databases.kill(0)
        done = operator.process("hosts", before=trust.options_of_host(ours))
        assert (done.status, "it is not there, or hung up\n" in done.stderr) == (1, True), done


def test_a_file_that_will_not_do_is_told_with_its_option(
    tmp_path: Path, capsys: pytest.CaptureFixture[str]
) -> None:
    authority = Authority(tmp_path, "ours")
    ours, other = authority.issue("operator"), authority.issue("other")
    junk, none, trusted = tmp_path / "junk", tmp_path / "none", authority.certificate
    junk.write_text("none\n", encoding="utf-8")
    missing = "No such file or directory"
    empty = "it has no certificate"
    for certificate, ca_cert, said in (
        (Certificate(ours.certificate, none), trusted, f"--private-key {none}: {missing}"),
        (Certificate(none, ours.key), trusted, f"--certificate {none}: {missing}"),
        (ours, none, f"--ca-cert {none}: {missing}"),
        (Certificate(ours.certificate, junk), trusted, f"--private-key {junk}: it has no"),
        (Certificate(junk, ours.key), trusted, f"--certificate {junk}: {empty}"),
        (ours, junk, f"--ca-cert {junk}: {empty}"),
        (
            Certificate(ours.certificate, other.key),
            trusted,
            f"--private-key {other.key}: it is not the key of the certificate {ours.certificate}",
        ),
    ):
        with pytest.raises(SystemExit) as end:
            program.main(["--fabric", "ssl:192.0.2.1:6640", *certificate.options(ca_cert), "list"])
        wrong = capsys.readouterr().err
        assert (end.value.code, wrong.startswith(f"vswitch: {said}")) == (1, True), wrong
