"""What a type checker knows of the checked calls, and refuses."""

import os
import subprocess
from pathlib import Path

FOLDER = Path(os.environ["BUILD_DIR"], "python")
WRITTEN = ("checked", "values", "enums", "_status")

PRECISE = """
from typing import List, Optional, Tuple
from libvswitch import checked, enums
import libvswitch as vs

mtu: int = checked.VSDVS_GetMTU("a")
link: enums.LinkState = checked.VSQEX_GetUplinkLinkState("a", "b")
names: List[str] = [one.name for one in checked.VSQEX_GetUplinks("a")]
entries: Tuple[checked.VSPvlanMapEntry, ...] = checked.VSDVS_GetPrivateVLANMap("a")
policy: checked.VSPortVlanPolicy = checked.VSDVS_GetPortVLANPolicy("a", "b").policy
team: vs.VSTeamPolicy = checked.VSDVS_GetTeamingPolicy("a")
handle: Optional[checked.DVSwitchHandle] = checked.DVSState_SwitchFindByAlias("a")
data: bytes = checked.DVSQEX_GlobalPropGet("a", "b")
kind: checked.MacType = checked.VSQEX_GetTeamMACTable("a", checked.MacType.ALL)[0].macAddrType
checked.VSDVS_SetMACLearning("a", vs.VSMACLearning(agingTime=3))
error: checked.HostError = checked.NotFound()
status: Optional[enums.Status] = error.status
"""

REFUSED = {
    'checked.VSQEX_SetUplinkAdminLinkState("a", "b", checked.MacType.ALL)': "arg-type",
    'checked.VSQEX_GetTeamMACTable("a", checked.LinkState.UP)': "arg-type",
    'checked.VSDVS_SetMcastFilterMode("a", 1)': "arg-type",
    "checked.VSDVS_GetMTU(None)": "arg-type",
    'checked.VSDVS_SetMTU("a", "9000")': "arg-type",
    'checked.VSDVS_SetTxUplinkAlways("a", "b", "yes")': "arg-type",
    'checked.DVS_PortId(checked.DVSState_SwitchFindByAlias("a"))': "arg-type",
    'checked.DVS_SwitchName(checked.DVSState_SwitchFindByAlias("a"))': "arg-type",
    'checked.VSDVS_SetMTU("a", 1) + 1': "func-returns-value",
    "checked.VSMACEntry().vid = 3": "misc",
    'checked.VSDVS_GetMTUU("a")': "attr-defined",
    "vs.VSMACLearning(ageingTime=3)": "call-arg",
}


def check(tmp_path: Path, text: str) -> "subprocess.CompletedProcess[str]":
    program = tmp_path / "program.py"
    program.write_text(text, encoding="utf-8")
    return subprocess.run(
        ["/usr/bin/python3", "-m", "mypy", "--config-file=", "--strict", str(program)],
        cwd=tmp_path,
        env={**os.environ, "MYPYPATH": str(FOLDER)},
        capture_output=True,
        text=True,
        timeout=300,
    )


def test_what_is_written_is_typed(tmp_path: Path) -> None:
    files = [str(FOLDER / "libvswitch" / f"{one}.py") for one in WRITTEN]
    done = subprocess.run(
        ["/usr/bin/python3", "-m", "mypy", "--config-file=", "--strict", *files],
        cwd=tmp_path,
        env={**os.environ, "MYPYPATH": str(FOLDER)},
        capture_output=True,
        text=True,
        timeout=300,
    )
    assert done.returncode == 0, done.stdout + done.stderr


def test_types_are_precise(tmp_path: Path) -> None:
    done = check(tmp_path, PRECISE)
    assert done.returncode == 0, done.stdout + done.stderr


def test_what_cannot_be_meant_is_refused(tmp_path: Path) -> None:
    head = "from libvswitch import checked\nimport libvswitch as vs\n"
    done = check(tmp_path, head + "\n".join(REFUSED) + "\n")
    refused = {
        int(line.split(":")[1]): line.rsplit("[", 1)[1].rstrip("]")
        for line in done.stdout.splitlines()
        if ": error:" in line
    }
    assert refused == {at: kind for at, kind in enumerate(REFUSED.values(), 3)}, done.stdout


def test_no_signature_says_any() -> None:
    text = (FOLDER / "libvswitch/checked.py").read_text(encoding="utf-8")
    assert text.count("\ndef ") == 146 and "Any" not in text
