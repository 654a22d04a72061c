"""Changes that are taken back unless they are confirmed."""

import hashlib
import os
import signal
import stat
import subprocess
import time
from pathlib import Path
from typing import Callable, Iterator, List, Set

import pytest
from command_line import PROGRAM, SIMULATED, Refused, Vswitch, state
from simhost import SharedHost

DOCUMENT = '{"switches": [{"alias": "lab", "mtu": 1500, "ports": [{"id": "web-1", "vlan": 8}]}]}'
CHANGES = "lab/mtu: 9000 -> 1500\nlab/web-1/vlan: id=7 trunk=10-12 -> 8\n"
FOLDER = Path("/tmp", f"vswitch-{os.getuid()}")
# Longer than any test, and how long a test that fails waits.
LONG = "600"
PATIENCE = 60


def until(what: Callable[[], bool]) -> None:
    end = time.monotonic() + PATIENCE
    while not what():
        assert time.monotonic() < end, "it has not happened"
        time.sleep(0.05)


def keepers(host: SharedHost) -> List[int]:
    """The processes that keep a change of this host: leaders of a session, with no terminal."""
    found = []
    mark = f"SIMHOST_STATE={host.state_file}".encode()
    for folder in Path("/proc").glob("[0-9]*"):
        try:
            words = (folder / "cmdline").read_bytes().split(b"\0")
            environment = (folder / "environ").read_bytes().split(b"\0")
        except OSError:
            continue
        if b"--confirm-within" in words and mark in environment:
            if os.getsid(int(folder.name)) == int(folder.name):
                found.append(int(folder.name))
    return found


@pytest.fixture(autouse=True)
def no_keeper_is_left(lab: SharedHost) -> Iterator[None]:
    yield
    for one in keepers(lab):
        os.kill(one, signal.SIGKILL)
    for path in files(lab):
        path.unlink()


def files(host: SharedHost) -> Set[Path]:
    """Those of this host: others may have theirs beside them."""
    name = hashlib.sha256(os.fsencode(host.state_file.resolve())).hexdigest()[:16]
    return set(FOLDER.glob(f"{name}.*"))


def test_confirmed(vswitch: Vswitch, lab: SharedHost) -> None:
    done = vswitch("apply", "-", "--confirm-within", LONG, input=DOCUMENT)
    said = "# taken back in 600 s, unless this confirms it: vswitch confirm\n"
    assert done == (0, CHANGES, SIMULATED + said)
    wanted = state(lab)
    assert vswitch("confirm") == (0, "confirmed\n", SIMULATED)
    until(lambda: not keepers(lab))
    assert state(lab) == wanted
    assert lab.describe()["switches"][1]["mtu"] == 1500
    done = vswitch("confirm")
    assert (done.status, done.stderr) == (
        1,
        SIMULATED + "vswitch: no change waits to be confirmed\n",
    )


def test_for_programs(vswitch: Vswitch, lab: SharedHost) -> None:
    done = vswitch("apply", "-", "--json", "--confirm-within", LONG, input=DOCUMENT)
    assert [one["path"] for one in done.json] == ["lab/mtu", "lab/web-1/vlan"]
    assert vswitch("confirm", "--json").json == {"confirmed": True}


def test_taken_back(vswitch: Vswitch, lab: SharedHost) -> None:
    before = state(lab)
    done = vswitch("apply", "-", "--confirm-within", "0.1", input=DOCUMENT)
    assert (done.status, done.stdout) == (0, CHANGES)
    until(lambda: not keepers(lab))
    assert state(lab) == before
    done = vswitch("confirm")
    told = "vswitch: no change waits to be confirmed; the last one was taken back\n"
    assert (done.status, done.stderr) == (1, SIMULATED + told)


def test_the_shell_is_gone(lab: SharedHost, tmp_path: Path) -> None:
    """The shell, and all that is of its session, is killed while the change waits."""
    before = state(lab)
    document = tmp_path / "document"
    document.write_text(DOCUMENT)
    script = f'"{PROGRAM}" apply "{document}" --confirm-within 3 && echo waits && sleep {LONG}'
    with subprocess.Popen(
        ["sh", "-c", script],
        env=lab.environment,
        stdout=subprocess.PIPE,
        stderr=subprocess.DEVNULL,
        text=True,
        start_new_session=True,
    ) as shell:
        assert shell.stdout is not None
        assert [shell.stdout.readline() for _ in range(3)][2] == "waits\n"
        assert state(lab) != before
        assert keepers(lab)
        os.killpg(shell.pid, signal.SIGHUP)
        os.killpg(shell.pid, signal.SIGKILL)
    until(lambda: not keepers(lab))
    assert state(lab) == before


def test_who_reads_its_output_need_not_wait(lab: SharedHost, tmp_path: Path) -> None:
    """Nor who holds a lock in the shell: the process that waits has nothing of either."""
    document = tmp_path / "document"
    document.write_text(DOCUMENT)
    script = (
        f'exec 9>"{tmp_path}/lock"; flock 9;'
        f' "{PROGRAM}" apply "{document}" --confirm-within {LONG} 2>&1 | cat'
    )
    subprocess.run(["sh", "-c", script], env=lab.environment, check=True, timeout=PATIENCE)
    assert keepers(lab)
    subprocess.run(["flock", "-n", str(tmp_path / "lock"), "true"], check=True)


def test_only_one_waits(vswitch: Vswitch, lab: SharedHost, refused: Refused) -> None:
    assert vswitch("apply", "-", "--confirm-within", LONG, input=DOCUMENT).status == 0
    again = DOCUMENT.replace("1500", "2000")
    assert refused("apply", "-", "--confirm-within", LONG, input=again) == (
        "vswitch: another change waits to be confirmed\n"
    )
    assert vswitch("confirm").status == 0


def test_ended_early_it_is_taken_back(vswitch: Vswitch, lab: SharedHost) -> None:
    before = state(lab)
    assert vswitch("apply", "-", "--confirm-within", LONG, input=DOCUMENT).status == 0
    (keeper,) = keepers(lab)
    os.kill(keeper, signal.SIGHUP)
    os.kill(keeper, signal.SIGTERM)
    until(lambda: not keepers(lab))
    assert state(lab) == before


def test_killed_somebody_must_look(vswitch: Vswitch, lab: SharedHost) -> None:
    assert vswitch("apply", "-", "--confirm-within", LONG, input=DOCUMENT).status == 0
    (keeper,) = keepers(lab)
    os.kill(keeper, signal.SIGKILL)
    until(lambda: not keepers(lab))
    done = vswitch("confirm")
    told = "what would have taken the last one back is gone"
    assert (done.status, done.stdout) == (3, "") and told in done.stderr
    # It is no obstacle to the next one.
    after = DOCUMENT.replace("1500", "2000")
    assert vswitch("apply", "-", "--confirm-within", LONG, input=after).status == 0
    assert vswitch("confirm").status == 0


def test_what_cannot_be_taken_back(vswitch: Vswitch, lab: SharedHost) -> None:
    assert vswitch("apply", "-", "--confirm-within", LONG, input=DOCUMENT).status == 0
    for call in ("VSDVS_SetMTU", "DVSQEX_GlobalPropSet"):
        lab.fault(call, status="QEX_BUSY", times=99)
    (keeper,) = keepers(lab)
    os.kill(keeper, signal.SIGTERM)
    until(lambda: not keepers(lab))
    done = vswitch("confirm")
    assert (done.status, done.stdout) == (3, "")
    assert "the last one was not taken back: " in done.stderr
    assert done.stderr.endswith("not as it was: lab: mtu\n")


def test_nothing_changes_nothing_waits(vswitch: Vswitch, lab: SharedHost) -> None:
    assert vswitch("apply", "-", input=DOCUMENT).status == 0
    done = vswitch("apply", "-", "--confirm-within", LONG, input=DOCUMENT)
    assert done == (0, "no changes\n", SIMULATED)
    until(lambda: not keepers(lab))
    assert vswitch("confirm").status == 1


def test_a_change_that_fails(lab: SharedHost, refused: Refused) -> None:
    lab.fault("VSDVS_SetPortVLANPolicy", status="QEX_BUSY")
    told = refused("apply", "-", "--confirm-within", LONG, input=DOCUMENT)
    assert told.startswith("vswitch: VSDVS_SetPortVLANPolicy")
    assert told.endswith("; everything is as it was before\n")
    until(lambda: not keepers(lab))


def test_a_document_that_is_wrong(refused: Refused) -> None:
    told = refused("apply", "-", "--confirm-within", LONG, input='{"switches": 1}')
    assert told == "vswitch: -: switches: 1 is not a list\n"


def test_a_host_that_ends_with_the_command(lab: SharedHost, tmp_path: Path) -> None:
    document = tmp_path / "document"
    document.write_text('{"switches": [{"alias": "vswitch0", "mtu": 9000}]}')
    environment = dict(lab.environment)
    del environment["SIMHOST_STATE"]
    done = subprocess.run(
        [PROGRAM, "apply", str(document), "--confirm-within", LONG],
        env=environment,
        capture_output=True,
        text=True,
    )
    told = "vswitch: this simulated host ends with the command: SIMHOST_STATE names a lasting one\n"
    assert (done.returncode, done.stderr) == (1, SIMULATED + told)


def test_it_is_of_one_user(vswitch: Vswitch, lab: SharedHost) -> None:
    assert vswitch("apply", "-", "--confirm-within", LONG, input=DOCUMENT).status == 0
    made = files(lab)
    assert {path.suffix for path in made} == {".lock", ".note", ".socket"}
    assert stat.S_IMODE(FOLDER.stat().st_mode) == 0o700
    assert {stat.S_IMODE(path.stat().st_mode) for path in made} == {0o600}
    assert vswitch("confirm").status == 0


def test_a_time_that_is_none(refused: Refused) -> None:
    told = refused("apply", "-", "--confirm-within", "0", status=2)
    assert told.startswith("vswitch: Invalid value for '--confirm-within': 0")
