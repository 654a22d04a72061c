"""What is loaded when: not before somebody needs it, and in time for a program of `python3 -m`."""

import subprocess
import sys
from pathlib import Path

PROGRAM = """
import sys
import vswitch
from libvswitch import checked, enums
assert [str(one) for one in vswitch.LinkState] == ["down", "up"]
for name in enums.__all__:
    assert len(getattr(enums, name).__members__) >= 2, name
host = vswitch.Host(simulated=True)
port = host.switches["vswitch0"].ports["web-1"]
port.vlan = vswitch.Vlan(7, "10-12", 3)
assert port.vlan.priority == 3 and checked.VSQEX_GetVSInfo("vswitch0").mtu == 1500
print(port.teaming.balance, host.state()["switches"][0]["ports"][0]["vlan"])
"""


def test_a_program_that_is_a_package(tmp_path: Path) -> None:
    """Python looks for the program with the argument -m, and then loads nothing of the classes."""
    package = tmp_path / "late"
    package.mkdir()
    (package / "__init__.py").write_text("import sys, vswitch\nFIRST = sys.argv[0]\n")
    (package / "__main__.py").write_text(f"import late\nassert late.FIRST == '-m'\n{PROGRAM}")
    done = subprocess.run(
        [sys.executable, "-m", "late"], cwd=tmp_path, capture_output=True, text=True
    )
    expected = "explicit {'id': 7, 'trunk': ['10-12'], 'priority': 3}\n"
    assert (done.stderr, done.stdout) == ("", expected)


LATE = (
    "asyncio",
    "contextlib",
    "ipaddress",
    "socket",
    "threading",
    "libvswitch.values",
    "libvswitch._reasons",
    "vswitch.documents",
    "vswitch.mirroring",
    "vswitch.plan",
    "vswitch.told",
    "vswitch.watch",
)


def test_what_few_need_is_loaded_late() -> None:
    loaded = f"import sys, vswitch\nprint([one for one in {LATE} if one in sys.modules])"
    told = subprocess.run([sys.executable, "-c", loaded], stdout=subprocess.PIPE, check=True)
    # The one that is there shows that the others are looked for.
    assert told.stdout == b"['contextlib']\n"
