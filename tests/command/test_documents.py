"""Documents in files: told, applied, backed up and restored."""

import json
from pathlib import Path
from typing import Any, Dict

import pytest
import yaml
from command_line import SIMULATED, Refused, Vswitch, state
from simhost import SharedHost

DOCUMENT = """
# The lab as it is wanted.
switches:
- alias: lab
  mtu: 1500
  ports:
  - {id: web-1, vlan: 8, forbids: absent}
  - {id: web-3}
"""
CHANGES = (
    "lab/mtu: 9000 -> 1500\n"
    "lab/web-1/vlan: id=7 trunk=10-12 -> 8\n"
    "lab/web-1/forbids: promiscuous -> absent\n"
    "lab/web-3: absent -> id=web-3\n"
)


@pytest.fixture
def document(tmp_path: Path) -> str:
    path = tmp_path / "lab.yaml"
    path.write_text(DOCUMENT)
    return str(path)


def test_diff_changes_nothing(vswitch: Vswitch, lab: SharedHost, document: str) -> None:
    before = state(lab)
    assert vswitch("diff", document) == (0, CHANGES, SIMULATED)
    assert vswitch("apply", document, "--dry-run") == (0, CHANGES, SIMULATED)
    assert state(lab) == before


def test_apply(vswitch: Vswitch, document: str) -> None:
    assert vswitch("apply", document) == (0, CHANGES, SIMULATED)
    assert vswitch("apply", document) == (0, "no changes\n", SIMULATED)
    assert vswitch("diff", document).stdout == "no changes\n"


def test_json_from_standard_input(vswitch: Vswitch) -> None:
    given = json.dumps({"switches": [{"alias": "lab", "mtu": 1500}]})
    told = vswitch("apply", "-", "--json", input=given).json
    assert told == [{"path": "lab/mtu", "before": 9000, "after": 1500}]


@pytest.mark.parametrize(
    "text, said",
    [
        ("a: [\n", "line 2: expected the node content, but found '<stream end>'"),
        ("a: 1\nb: 2\na: 3\n", "line 3: the key 'a' is there twice"),
        ('{"a": 1, "a": 2}', "the key 'a' is there twice"),
        ("? [1]\n: 2\n", "line 1: a key that is no text"),
        ("!!python/object/apply:os.system ['true']\n", "line 1: could not determine a constructor"),
        ("[" * 5000, "it is nested too deeply"),
        ('a: !!int "many"\n', "line 1: this is no int that can be read"),
        ("a: 1\nb: !!bool maybe\n", "line 2: this is no bool that can be read"),
        ("a: !!timestamp x\n", "line 1: could not determine a constructor"),
        ("[" + "9" * 5000 + "]", "line 1: this is no int that can be read"),
    ],
)
def test_files_that_are_no_documents(
    refused: Refused, tmp_path: Path, text: str, said: str
) -> None:
    path = tmp_path / "document"
    path.write_text(text)
    assert refused("apply", str(path)).startswith(f"vswitch: {path}: {said}")


@pytest.mark.parametrize(
    "text, said",
    [
        ("switches:\n- alias: lab\n  mtu: 99\n", "switches[0].mtu: 99 is below 1280"),
        ("switch: []\n", "switch: unknown key; there are "),
        ("", "None is not an object"),
        ("- 1\n", "[1] is not an object"),
        (
            "switches: [{alias: lab, uplinks: [nic99]}]",
            "switches[0].uplinks[0]: the host has no uplink 'nic99'",
        ),
        ("switches: [{alias: lab, disabled: yes}]", "switches[0].disabled: 'yes' is not true"),
    ],
)
@pytest.mark.parametrize("command", ["diff", "apply", "restore"])
def test_what_is_wrong_with_a_document(
    refused: Refused, tmp_path: Path, text: str, said: str, command: str
) -> None:
    path = tmp_path / "document"
    path.write_text(text)
    assert refused(command, str(path)).startswith(f"vswitch: {path}: {said}")


def test_files_that_cannot_be_read(refused: Refused, tmp_path: Path) -> None:
    path = tmp_path / "document"
    assert refused("apply", str(path)) == (
        f"vswitch: [Errno 2] No such file or directory: '{path}'\n"
    )
    path.write_bytes(b"\xff\xfe")
    assert refused("apply", str(path)).startswith(f"vswitch: {path}: no text: 'utf-8' codec")


def test_what_yaml_has_two_readings_of(vswitch: Vswitch) -> None:
    """Addresses of digits only, and words that are truths to some."""
    given = (
        "switches: [{alias: lab, ports: [{id: 010, alias: no,"
        " addresses: [{mac: 20:30:40:50:10:20, type: static}]},"
        " {id: 2026-11-22}, {id: 12e5}, {id: 089}, {id: 0o17}]}]"
    )
    assert vswitch("apply", "-", input=given).status == 0
    port = vswitch("show", "lab/010", "--json").json
    assert (port["alias"], port["addresses"][0]["mac"]) == ("no", "20:30:40:50:10:20")
    # Nor does what is written have two.
    written = vswitch("backup").stdout
    for id_ in ("010", "2026-11-22", "12e5", "089", "0o17"):
        assert f"id: '{id_}'\n" in written


def test_apply_is_rolled_back(lab: SharedHost, refused: Refused, document: str) -> None:
    lab.fault("DVSQEX_PortAdd", status="QEX_LIMIT_EXCEEDED")
    told = refused("apply", document)
    assert "DVSQEX_PortAdd" in told and told.endswith("; everything is as it was before\n")


def test_backup_is_the_state(vswitch: Vswitch, lab: SharedHost) -> None:
    text = vswitch("backup").stdout
    assert yaml.safe_load(text) == vswitch("backup", "--json").json
    aliases = [one["alias"] for one in yaml.safe_load(text)["switches"]]
    assert aliases == [one["alias"] for one in state(lab)["switches"]]
    assert vswitch("diff", "-", input=text).stdout == "no changes\n"
    assert vswitch("restore", "-", input=text).stdout == "no changes\n"


def described(host: SharedHost) -> Dict[str, Any]:
    """The switches by their aliases, as what no call sets is left out."""
    found = {}
    for switch in host.describe()["switches"]:
        for port in switch["ports"]:
            port.pop("observed", None)
            port.pop("counters", None)
            port.pop("addresses", None)
        found[switch["alias"]] = {**switch, "ports": {one["id"]: one for one in switch["ports"]}}
    return found


def test_restore_takes_away_what_came(vswitch: Vswitch, lab: SharedHost) -> None:
    before = described(lab)
    text = vswitch("backup").stdout
    for words in (
        ("set", "lab", "mtu=1500", "multicast=snooping"),
        ("set", "lab/web-1", "blocked=true", "vlan=9"),
        ("unset", "lab/web-1", "forbids"),
        ("add", "lab/web-3", "vlan=7"),
        ("add", "new"),
    ):
        assert vswitch(*words).status == 0
    lab.apply(
        {
            "switches": [
                {
                    "alias": "lab",
                    "properties": {"com.example.a": {"type": "config", "hex": "01"}},
                    "ports": [
                        {
                            "id": "web-2",
                            "addresses": [{"mac": "02:00:00:00:00:09", "type": "static"}],
                        }
                    ],
                }
            ]
        }
    )
    assert described(lab) != before
    told = vswitch("restore", "-", "--dry-run", input=text)
    assert described(lab) != before
    assert vswitch("restore", "-", input=text) == told
    assert "new: alias=new -> absent\n" in told.stdout
    assert "lab/web-2/macs/02:00:00:00:00:09" in told.stdout
    assert described(lab) == before
    assert vswitch("restore", "-", input=text).stdout == "no changes\n"


def test_restore_brings_back_what_went(vswitch: Vswitch, lab: SharedHost) -> None:
    before = described(lab)
    text = vswitch("backup", "--json").stdout
    assert vswitch("remove", "lab/web-1").status == 0
    assert vswitch("uplink", "vswitch0", "remove", "nic5").status == 0
    assert vswitch("restore", "-", input=text).status == 0
    assert described(lab)["lab"]["ports"] == before["lab"]["ports"]
    after = described(lab)["vswitch0"]
    assert after["uplink_ports"] == before["vswitch0"]["uplink_ports"]


def test_restore_that_cannot_be(lab: SharedHost, vswitch: Vswitch, refused: Refused) -> None:
    text = vswitch("backup").stdout
    assert vswitch("set", "lab", "mtu=1500").status == 0
    lab.fault("VSDVS_SetMTU", status="QEX_BUSY")
    assert refused("restore", "-", input=text).endswith("; everything is as it was before\n")
