"""What somebody does with the packages on a machine, however they were installed there."""

import json
import re
from typing import Any, Dict, List

from roots import Root

HOST = ("libvswitch.so", "libnebPublic.so")

DOCUMENT = "/tmp/document.json"

# Programs, and words that show that they got there.
EXAMPLES = {
    ("first_steps.py",): "Bad parameter",
    ("records.py",): "MaxRARPsPerInterval",
    ("tour.py",): "The host restarts",
    ("inventory.py",): "nic4 up, nic5 up",
    ("compliance.py", "--fix"): "vswitch0/web-1/forbids: absent -> mac_changes,forged_transmits",
    ("apply.py", DOCUMENT): "vswitch0/mtu: 1500 -> 9000",
    ("find_mac.py", "02:00:00:00:01:02"): "at web-1, VLAN 10",
    ("mirror.py", "vswitch0", "web-1", "web-2", "--for", "0"): "0 packets mirrored",
    ("failover_drill.py", "vswitch0"): "nic4 down: web-1 to nic5",
}

CALL = "import _libvswitch as vs; print(vs.VSDVS_SetMTU('no such switch', 9000))"

TYPED = """
import _libvswitch as flat
import libvswitch as vs

with vs.owned(vs.VSQEX_GetUplinks("a")) as (status, uplinks):
    first: str = uplinks[0]
answer: int = flat.VSDVS_SetMTU("a", 9000)
"""
WRONG = """
import _libvswitch as flat
import libvswitch as vs

flat.VSDVS_SetMTU("a", "9000")
vs.VSDVS_SetMTU("a", "9000")
"""

PLUGIN_TEST = """
import _libvswitch as vs
import pytest

def mtu(switch):
    info = vs.new_VSInfo()
    status = vs.VSQEX_GetVSInfo(switch, info)
    found = vs.VSInfo_mtu_get(info)
    vs.delete_VSInfo(info)
    return status, found

@pytest.mark.scenario({"switches": [{"alias": "lab", "mtu": 9000}]})
def test_the_host_is_what_the_mark_says(host):
    assert mtu("lab") == (0, 9000)

def test_each_test_has_its_own(host):
    assert mtu("lab")[0] != 0
    assert mtu("vswitch0") == (0, 1500)

def test_a_host_for_commands(shared_host):
    shared_host.link("nic4").down()
"""


class Machine:
    """A system with an interpreter that finds the module."""

    def __init__(self, root: Root, python: str, programs: str) -> None:
        self.root = root
        self.python = python
        self.programs = programs
        self.simhostctl = f"{programs}/simhostctl"
        self.vswitch = f"{programs}/vswitch"

    def program(self, text: str, **environment: str) -> str:
        return self.root.run(self.python, "-c", text, **environment)

    def answer_of_the_host(self, **environment: str) -> int:
        return int(self.program(CALL, **environment))

    def doctor(self, **environment: str) -> Dict[str, Any]:
        done = self.root.try_run(self.python, "-m", "libvswitch.doctor", "--json", **environment)
        assert done.stderr == ""
        found: Dict[str, Any] = json.loads(done.stdout)
        assert found["is_well"] == (done.returncode == 0)
        return found

    def finds_simulated_host(self, folder: str) -> None:
        found = self.doctor()
        assert found["is_well"], found
        assert found["simulated"] is True
        assert found["host"] == {name: f"{folder}/{name}" for name in HOST}
        said = self.root.run(self.python, "-m", "libvswitch.doctor")
        assert f"libvswitch.so: {folder}/libvswitch.so" in said
        assert "the host is simulated" in said

    def runs_the_examples(self, folder: str) -> None:
        installed = self.root.run("ls", folder).split()
        shared = "private_host.py"  # imported by the others
        programs = {one for one in installed if one.endswith(".py")} - {shared}
        assert shared in installed and {name for name, *_ in EXAMPLES} == programs
        path = f"{self.programs}:/usr/bin:/bin"
        self.root.write(DOCUMENT, '{"switches": [{"alias": "vswitch0", "mtu": 9000}]}')
        for (name, *arguments), expected in EXAMPLES.items():
            said = self.root.run(self.python, f"{folder}/{name}", *arguments, PATH=path)
            assert expected in said

    def controls_the_host(self) -> None:
        state = {"SIMHOST_STATE": "/tmp/host.db"}
        self.root.path("/tmp/host.db").unlink(missing_ok=True)
        self.program("import libvswitch as vs; vs.VSDVS_SetMTU('vswitch0', 9000)", **state)
        assert "MTU 9000" in self.root.run(self.simhostctl, "show", **state)
        done = self.root.try_run(self.simhostctl, "link", "nic9", "down", **state)
        why = "there is no uplink 'nic9' (QEX_NOT_FOUND)"
        assert (done.returncode, done.stderr) == (1, f"simhostctl: {why}\n")

    def runs_the_command(self) -> None:
        state = {"SIMHOST_STATE": "/tmp/command.db"}
        assert "\nCommands:\n  list " in self.root.run(self.vswitch, "--help")
        done = self.root.try_run(self.vswitch, "list", **state)
        assert (done.returncode, done.stderr) == (0, "# simulated host\n")
        assert "vswitch0  1500  3 of 128  nic4 up, nic5 up\n" in done.stdout
        self.root.run(self.vswitch, "set", "vswitch0", "mtu=9000", **state)
        backup = self.root.run(self.vswitch, "backup", **state)
        assert "\n  mtu: 9000\n" in backup
        done = self.root.try_run(self.vswitch, "show", "nope", **state)
        why = "no switch 'nope' (there are vswitch0)"
        assert (done.returncode, done.stderr) == (1, f"# simulated host\nvswitch: {why}\n")

    def records_and_plays(self) -> None:
        trace, tool = "/tmp/trace.jsonl", [self.vswitch, "list"]
        said = self.root.run(self.vswitch, "record", "-o", trace, "--", *tool)
        assert "vswitch0" in said
        done = self.root.try_run(self.vswitch, "play", trace, "--all-used", "--", *tool)
        assert (done.returncode, done.stdout) == (0, said), done.stderr
        # No host was asked.
        assert "simulated" not in done.stderr
        assert self.root.try_run(self.vswitch, "replay", trace).returncode == 0

    def runs_tests_with_the_plugin(self, **environment: str) -> None:
        self.root.write("/tmp/suite/test_plugin.py", PLUGIN_TEST)
        # pytest keeps byte code of plug-ins under a name that pip does not know.
        command = [self.python, "-B", "-m", "pytest", "-q", "--strict-markers", "/tmp/suite"]
        said = self.root.run(*command, **environment)
        assert "3 passed" in said

    def type_checks(self, *options: str) -> None:
        self.root.write("/tmp/typed.py", TYPED)
        self.root.write("/tmp/wrong.py", WRONG)
        mypy = ["/usr/bin/mypy", "--strict", "--cache-dir=/tmp/mypy", *options]
        self.root.run(*mypy, "/tmp/typed.py")
        done = self.root.try_run(*mypy, "/tmp/wrong.py")
        assert _lines_with_errors(done.stdout) == [5, 6], done.stdout


def _lines_with_errors(said: str) -> List[int]:
    return [int(line) for line in re.findall(r"wrong\.py:(\d+): error: Argument 2", said)]
