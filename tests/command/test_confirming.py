"""Changes that are taken back unless they are confirmed."""

import contextlib
import hashlib
import json
import os
import signal
import socket
import stat
import subprocess
from pathlib import Path
from typing import Iterator, List, Set

import pytest
from command_line import PATIENCE, PROGRAM, SIMULATED, Refused, Vswitch, started, state, until
from simhost import SharedHost

DOCUMENT = '{"switches": [{"alias": "lab", "mtu": 1500, "ports": [{"id": "web-1", "vlan": 8}]}]}'
CHANGES = "lab/mtu: 9000 -> 1500\nlab/web-1/vlan: id=7 trunk=10-12 -> 8\n"
FOLDER = Path("/var/tmp", f"vswitch-{os.getuid()}")
# Longer than any test.
LONG = "600"


def keepers(host: SharedHost) -> List[int]:
    """The processes that keep a change of this host: leaders of a session, with no terminal."""
    found = []
    mark = f"SIMHOST_STATE={host.state_file}".encode()
    for folder in Path("/proc").glob("[0-9]*"):
        number = int(folder.name)
        # Any of them may end meanwhile.
        with contextlib.suppress(OSError):
            words = (folder / "cmdline").read_bytes().split(b"\0")
            environment = (folder / "environ").read_bytes().split(b"\0")
            is_one = b"--confirm-within" in words and mark in environment
            if is_one and os.getsid(number) == number:
                found.append(number)
    return found


@pytest.fixture(autouse=True)
def no_keeper_is_left(lab: SharedHost) -> Iterator[None]:
    yield
    for one in keepers(lab):
        with contextlib.suppress(ProcessLookupError):
            os.kill(one, signal.SIGKILL)
    until(lambda: not keepers(lab))
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
    """The shell, and all that is of its session, is killed while the change waits: it goes on
    waiting, and whoever comes back can confirm it."""
    before = state(lab)
    document = tmp_path / "document"
    document.write_text(DOCUMENT)
    script = f'"{PROGRAM}" apply "{document}" --confirm-within {LONG} && echo waits && sleep {LONG}'
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
        os.killpg(shell.pid, signal.SIGHUP)
        os.killpg(shell.pid, signal.SIGKILL)
    (keeper,) = keepers(lab)
    assert state(lab) != before
    os.kill(keeper, signal.SIGTERM)
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


def test_a_host_that_restarts_meanwhile(vswitch: Vswitch, lab: SharedHost) -> None:
    """What outlasts the restart is taken back, and what does not is no obstacle."""
    lab.restart()
    before = state(lab)
    wanted = json.loads(DOCUMENT)
    wanted["switches"] += [{"alias": "new", "persistent": False, "ports": [{"id": "a"}]}]
    done = vswitch("apply", "-", "--confirm-within", LONG, input=json.dumps(wanted))
    assert done.status == 0
    lab.restart()
    assert [one["mtu"] for one in lab.describe()["switches"]] == [1500, 1500]
    (keeper,) = keepers(lab)
    os.kill(keeper, signal.SIGTERM)
    until(lambda: not keepers(lab))
    assert state(lab) == before
    assert "the last one was taken back" in vswitch("confirm").stderr


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


def test_who_is_gone_has_confirmed_nothing(vswitch: Vswitch, lab: SharedHost) -> None:
    """Nobody has heard that the change stays, so it is taken back unless somebody else confirms."""
    assert vswitch("apply", "-", "--confirm-within", LONG, input=DOCUMENT).status == 0
    (keeper,) = keepers(lab)
    (path,) = (one for one in files(lab) if one.suffix == ".socket")
    os.kill(keeper, signal.SIGSTOP)
    with socket.socket(socket.AF_UNIX) as who:
        who.connect(str(path))
        who.sendall(b"confirm")
    os.kill(keeper, signal.SIGCONT)
    assert vswitch("confirm") == (0, "confirmed\n", SIMULATED)


def test_confirmed_as_it_is_ended(vswitch: Vswitch, lab: SharedHost) -> None:
    """Whichever comes first, who confirms is told what is so."""
    before = state(lab)
    assert vswitch("apply", "-", "--confirm-within", LONG, input=DOCUMENT).status == 0
    (keeper,) = keepers(lab)
    os.kill(keeper, signal.SIGSTOP)
    with started(lab, "confirm") as (confirming, _):
        os.kill(keeper, signal.SIGTERM)
        os.kill(keeper, signal.SIGCONT)
        confirming.communicate()
    until(lambda: not keepers(lab))
    assert (confirming.returncode, state(lab) == before) in ((0, False), (1, True))


PATCHED = """
import os, signal, time
from vswitch.command import keeping, main
from vswitch.command.meeting import Meeting
from vswitch.plan import Plan

is_confirmed, tell, apply = Meeting.is_confirmed, keeping._Keeper._tell, Plan.apply
{patch}
main()
"""


def patched(lab: SharedHost, patch: str) -> "subprocess.CompletedProcess[str]":
    program = PATCHED.format(patch=patch)
    words = ["apply", "-", "--confirm-within", LONG]
    return lab.run(["/usr/bin/python3", "-c", program, *words], input=DOCUMENT)


def test_what_is_confirmed_stays(vswitch: Vswitch, lab: SharedHost) -> None:
    """Who ends the process right after it said so does not take the change back."""
    patch = """
def ended(listening):
    found = is_confirmed(listening)
    os.kill(os.getpid(), signal.SIGTERM)
    return found

Meeting.is_confirmed = staticmethod(ended)
"""
    assert patched(lab, patch).returncode == 0
    wanted = state(lab)
    assert vswitch("confirm").status == 0
    until(lambda: not keepers(lab))
    assert state(lab) == wanted


WHILE_IT_IS_MADE = """
def interrupted(plan):
    changes = apply(plan)
    os.kill(os.getppid(), signal.SIGINT)
    time.sleep(600)
    return changes

Plan.apply = interrupted
"""
WHILE_IT_IS_TOLD = """
class Interrupted:
    def __init__(self, pipe, *_, **__):
        self._pipe = pipe

    def __enter__(self):
        return self

    def __exit__(self, *_):
        os.close(self._pipe)

    def write(self, said):
        whole = said.encode() if isinstance(said, str) else said
        os.write(self._pipe, whole[:1])
        os.kill(os.getppid(), signal.SIGINT)
        time.sleep(1)
        os.write(self._pipe, whole[1:])

keeping.open = Interrupted
"""
WHEN_IT_IS_TOLD = """
def interrupted(keeper, what):
    held = None if keeper._pipe is None else os.dup(keeper._pipe)
    tell(keeper, what)
    if held is not None:
        os.kill(os.getppid(), signal.SIGINT)
        os.close(held)

tell = keeping._Keeper._tell
keeping._Keeper._tell = interrupted
"""


@pytest.mark.parametrize(
    "patch",
    [WHILE_IT_IS_MADE, WHILE_IT_IS_TOLD, WHEN_IT_IS_TOLD],
    ids=["made", "being told", "told"],
)
def test_interrupted_it_is_taken_back_at_once(lab: SharedHost, patch: str) -> None:
    before = state(lab)
    done = patched(lab, patch)
    assert (done.returncode, done.stdout) == (130, ""), done
    assert done.stderr == SIMULATED + "vswitch: interrupted\n"
    assert state(lab) == before


@pytest.mark.parametrize("kind", ["open to others", "a link"])
def test_a_folder_that_may_be_somebody_elses(lab: SharedHost, tmp_path: Path, kind: str) -> None:
    folder = tmp_path / "folder"
    if kind == "a link":
        (tmp_path / "there").mkdir(mode=0o700)
        folder.symlink_to(tmp_path / "there")
    else:
        folder.mkdir()
        folder.chmod(0o750)
    program = (
        "from pathlib import Path; from vswitch.command import main, meeting;"
        f"meeting.folder = lambda: Path({str(folder)!r}); main()"
    )
    done = lab.run(["/usr/bin/python3", "-c", program, "confirm"])
    said = f"vswitch: {folder} is not a folder of this user alone\n"
    assert (done.returncode, done.stdout, done.stderr) == (1, "", SIMULATED + said)


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
