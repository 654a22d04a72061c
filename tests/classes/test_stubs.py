"""The stubs say what is there, and the examples satisfy them."""

import os
import re
import subprocess
import sys
from pathlib import Path
from typing import Dict, List

import libvswitch as vs
import pytest
from libvswitch import enums

ROOT = Path(__file__).resolve().parents[2]
FOLDER = Path(os.environ["BUILD_DIR"], "python")
# Where Debian keeps mypy, whatever interpreter the module is built for.
PYTHON = "/usr/bin/python3"
CLASSES = "libvswitch", "libvswitch._classes"
CONSTANTS = "libvswitch", "libvswitch._constants"


def run(arguments: List[str], tmp_path: Path) -> "subprocess.CompletedProcess[str]":
    environment = {**os.environ, "MYPYPATH": str(FOLDER), "PYTHONPATH": str(FOLDER)}
    return subprocess.run(
        arguments, cwd=tmp_path, env=environment, capture_output=True, text=True, timeout=300
    )


def check(program: str, tmp_path: Path) -> "subprocess.CompletedProcess[str]":
    file = tmp_path / "program.py"
    file.write_text(program, encoding="utf-8")
    return run([PYTHON, "-m", "mypy", "--config-file=", "--strict", str(file)], tmp_path)


def made_in_c() -> List[str]:
    """The classes whose constructor has no signature that can be looked at."""
    return [name for name in dir(vs) if "_new" in getattr(getattr(vs, name), "__dict__", {})]


def of_families() -> Dict[str, str]:
    """The families of constants whose type is one that only stubs know."""
    text = (FOLDER / "libvswitch" / "_constants.pyi").read_text(encoding="utf-8")
    return dict(re.findall(r"^(\w+): Final\[_(\w+)Number\]$", text, re.M))


def test_the_type_of_a_constant_is_that_of_its_family() -> None:
    found: Dict[str, List[int]] = {name: [] for name in enums.__all__ if name != "Status"}
    for name, family in of_families().items():
        assert type(getattr(vs, name)) is int
        found[family].append(getattr(vs, name))
    for family, numbers in found.items():
        assert sorted(numbers) == sorted(getattr(enums, family).__members__.values())


@pytest.mark.parametrize("module", ["_libvswitch", "libvswitch"])
def test_stubs_and_modules_have_no_difference(module: str, tmp_path: Path) -> None:
    # What is listed and has no difference is one, too.
    listed = []
    if module == "libvswitch":
        listed = [f"{place}.{name}.__init__" for place in CLASSES for name in made_in_c()]
        listed += [f"{place}.{name}" for place in CONSTANTS for name in of_families()]
    (tmp_path / "listed").write_text("\n".join(listed), encoding="ascii")
    command = [sys.executable, "-m", "mypy.stubtest", module, "--allowlist", "listed"]
    done = run(command, tmp_path)
    assert done.returncode == 0, done.stdout + done.stderr
    assert "Success: no issues found" in done.stdout


@pytest.mark.parametrize("name", made_in_c())
def test_a_constructor_takes_fields_by_name_only(name: str) -> None:
    make = getattr(vs, name)
    text = r"__init__\(\) takes 1 positional argument but 2 were given$"
    with pytest.raises(TypeError, match=text):
        make(None)
    with pytest.raises(TypeError, match=f"^{name} has no field 'not_there', but "):
        make(not_there=1)


def test_a_difference_would_be_found(tmp_path: Path) -> None:
    name = "_libvswitch.pyi"
    text = (FOLDER / name).read_text(encoding="utf-8")
    (tmp_path / name).write_text(f"{text}\ndef not_there() -> int: ...\n", encoding="utf-8")
    environment = {**os.environ, "MYPYPATH": str(tmp_path), "PYTHONPATH": str(FOLDER)}
    done = subprocess.run(
        [sys.executable, "-m", "mypy.stubtest", "_libvswitch"],
        cwd=tmp_path,
        env=environment,
        capture_output=True,
        text=True,
    )
    assert done.returncode == 1
    assert "_libvswitch.not_there is not present at runtime" in done.stdout


def test_the_examples_satisfy_the_stubs(tmp_path: Path) -> None:
    examples = sorted(map(str, (ROOT / "examples").glob("*.py")))
    assert examples
    done = run([PYTHON, "-m", "mypy", "--config-file=", "--strict", *examples], tmp_path)
    assert done.returncode == 0, done.stdout + done.stderr


PRECISE = """
from typing import List, Optional, Tuple
import _libvswitch as flat
import libvswitch as vs
from libvswitch import enums

status, uplinks = vs.VSQEX_GetUplinks("a")
names: List[str] = [*uplinks]
entry: vs.VSUplinks_entries = uplinks.entries[0]
both: Tuple[int, int] = vs.VSDVS_GetMcastFilterMode("a")
mtu = vs.Cell("qex_uint32")
value: int = mtu.value
ok: int = vs.VSDVS_GetMTU("a", mtu.pointer)
lags = vs.Cell("VSLAGTable *")
table: Optional[vs.VSLAGTable] = lags.value
learned = vs.VSQEX_GetTeamMACTable("a", vs.VS_MAC_ADDR_TYPE_LEARNED)[1]
entries: List[str] = [one.macAddress for one in learned]
several = vs.Cell("VSLAGTable *", [vs.VSLAGTable(), None])
one: Optional[vs.VSLAGTable] = several[0]
bits: List[int] = vs.VSVLANBitmap().bits[0:3]
truth: bool = vs.VSMACEntry().aging
with vs.owned(vs.VSQEX_GetUplinks("a")) as (_, found):
    first: str = found[0]
flat.VSInfo_mtu_set(vs.VSInfo(), 9000)
vs.DVSState_SwitchForEach(lambda handle, context: True, None)

vs.VSQEX_SetUplinkAdminLinkState("a", "b", vs.QEX_LINK_STATE_DOWN)
vs.VSQEX_SetUplinkAdminLinkState("a", "b", enums.LinkState.DOWN)
vs.VSQEX_SetUplinkAdminLinkState("a", "b", vs.VSQEX_GetUplinkLinkState("a", "b")[1])
vs.VSDVS_SetMcastFilterMode("a", vs.VSDVS_GetMcastFilterMode("b")[1])
policy = vs.VSTeamPolicy(loadBalance=enums.Balance.IP, flags=vs.TEAM_FRP_FLAG_REVERSE)
policy.flags = policy.flags | enums.TeamFlags.ROLLING & ~vs.TEAM_FRP_FLAG_REVERSE
policy.flags |= vs.TEAM_FRP_FLAG_BEST_EFFORT
policy.loadBalance = enums.Balance(7)
policy.linkCriteria = vs.VSTeamPolicy().linkCriteria
balance: enums.Balance = enums.Balance(policy.loadBalance)
number: int = policy.loadBalance
text: Optional[str] = vs.QEX_ReturnStatusToString(enums.Status.BUSY)
"""


def test_what_is_right_passes(tmp_path: Path) -> None:
    done = check(PRECISE, tmp_path)
    assert done.returncode == 0, done.stdout


WRONG = [
    'vs.VSDVS_SetMTU("a", "9000")',
    "vs.VSDVS_SetMTU(7, 9000)",
    'vs.VSQEX_GetVSInfo("a", vs.VSStats())',
    'vs.VSDVS_GetMTU("a", vs.Cell("qex_uint64").pointer)',
    'vs.VSQEX_GetLAGTable("a", vs.Cell("DVPortList *").pointer)',
    "vs.VSInfo().mut",
    'vs.VSInfo().mtu = "9000"',
    'x: str = vs.VSQEX_GetVSInfo("a", vs.VSInfo())',
    'vs.Cell("nothing")',
    "vs.DVSState_SwitchForEach(None, None)",
    "for entry in vs.VSMACEntry(): pass",
    "flat.VSInfo_mtu_get(flat.new_VSStats())",
    "flat.VSInfo_mtu_get(None)",
    'a, b, c = flat.VSQEX_GetUplinks("a")',
    "vs.QEX_OK = 1",
    'vs.VSVLANBitmap().bits[0] = "1"',
    'vs.Cell("VSLAGTable *", vs.VSInfo())',
    'vs.Cell("VSLAGTable *", [vs.VSInfo()])',
    'vs.VSDVS_SetTxUplinkAlways("a", "b", "yes")',
    "vs.VSMACEntry().nonsense = 3",
    "vs.VSUplinks(1).nonsense = 3",
    "vs.VSVLANBitmap().bits.nonsense = 3",
    "vs.Cell('int').nonsense = 3",
    'vs.VSQEX_SetUplinkAdminLinkState("a", "b", vs.VS_MAC_ADDR_TYPE_USER)',
    'vs.VSQEX_SetUplinkAdminLinkState("a", "b", enums.MacType.USER)',
    'vs.VSQEX_SetUplinkAdminLinkState("a", "b", vs.QEX_TRUE)',
    'vs.VSQEX_SetUplinkAdminLinkState("a", "b", vs.VSDVS_GetMcastFilterMode("a")[1])',
    "vs.VSTeamPolicy(loadBalance=vs.TEAM_FRP_FLAG_REVERSE)",
    "vs.VSTeamPolicy().linkCriteria = vs.VSTeamPolicy().flags",
    "vs.VSPropSecurity().flags = enums.EthernetFilter.PROMISCUOUS",
    "vs.VSPropSecurity().flags |= 'promiscuous'",
    "vs.VSTeamPolicy().loadBalance.name",
    "vs.QEX_LINK_STATE_UP.name",
]

HEAD = "import _libvswitch as flat, libvswitch as vs; from libvswitch import enums"


def test_what_is_wrong_is_found(tmp_path: Path) -> None:
    done = check("\n".join([HEAD, *WRONG, ""]), tmp_path)
    found = {int(number) for number in re.findall(r"program\.py:(\d+): error: ", done.stdout)}
    assert found == set(range(2, len(WRONG) + 2)), done.stdout


def test_the_stubs_carry_the_documentation() -> None:
    text = (FOLDER / "libvswitch" / "_calls.pyi").read_text(encoding="utf-8")
    assert "Sets the MTU of a switch." in text
    assert "- QEX_BAD_PARAM for an MTU out of its bounds" in text
    assert "how many ranges" in text
    assert (FOLDER / "libvswitch" / "py.typed").exists()
