"""How tools end: what they print where, and their status."""

import os
import subprocess
import sys
from pathlib import Path
from typing import Optional

import pytest
from simhost import Host
from vswitch import HostError, exits

PROGRAM = """
import sys
import vswitch
from vswitch import exits

def main():
{body}

if __name__ == "__main__":
    with exits("tool"):
        main()
"""


# What a tool has printed waits until it ends, as it does for those who use it.
ENVIRONMENT = {name: one for name, one in os.environ.items() if name != "PYTHONUNBUFFERED"}


def run(
    body: str, tmp_path: Path, stdout: Optional[int] = subprocess.PIPE
) -> "subprocess.CompletedProcess[str]":
    program = tmp_path / "tool.py"
    lines = "".join(f"    {line}\n" for line in body.splitlines())
    program.write_text(PROGRAM.format(body=lines))
    return subprocess.run(
        [sys.executable, str(program)],
        env=ENVIRONMENT,
        stdout=stdout,
        stderr=subprocess.PIPE,
        text=True,
    )


@pytest.mark.parametrize(
    "body, status, stderr",
    [
        ("print('done')", 0, ""),
        (
            "print('done'); vswitch.Host().switches['nope']",
            1,
            "tool: no switch 'nope' (there are vswitch0)\n",
        ),
        (
            "print('done'); vswitch.Host().plan({'x': 1})",
            1,
            "tool: x: unknown key; there are mac_learning, observed, options,"
            " runtime_options, switches, uplinks\n",
        ),
        (
            "print('done'); open('/nowhere/file')",
            1,
            "tool: [Errno 2] No such file or directory: '/nowhere/file'\n",
        ),
        (
            "print('done'); raise vswitch.NotRestored('the link is down', left=['lab/nic0'])",
            3,
            "tool: the link is down\n",
        ),
        (
            "print('done'); raise vswitch.HostError('no \\x1b[2J\\n\\ud800')",
            1,
            "tool: no \\x1b[2J\\n\\ud800\n",
        ),
        ("print('done'); raise KeyboardInterrupt", 130, "tool: interrupted\n"),
        ("print('done'); sys.exit(2)", 2, ""),
        ("print('done'); sys.exit('said already')", 1, "said already\n"),
    ],
)
def test_how_a_tool_ends(body: str, status: int, stderr: str, tmp_path: Path) -> None:
    done = run(body, tmp_path)
    assert (done.stderr, done.stdout, done.returncode) == (stderr, "done\n", status)


LAB = "lab = vswitch.Host().switches['vswitch0']; lab.mtu = 9000; print('done'); "
STAYS = "; what was changed stays changed\n"


@pytest.mark.parametrize(
    "then, status, stderr",
    [
        ("", 0, ""),
        ("lab.host.switches['nope']", 3, f"tool: no switch 'nope' (there are vswitch0){STAYS}"),
        ("open('/nowhere/file')", 3, "tool: [Errno 2] No such file or directory: '/nowhere/file'"),
        ("sys.exit('said already')", 1, "said already\n"),
        ("raise KeyboardInterrupt", 130, "tool: interrupted\n"),
    ],
)
def test_what_a_tool_had_changed_before(
    then: str, status: int, stderr: str, tmp_path: Path
) -> None:
    done = run(LAB + then, tmp_path)
    assert done.stderr.startswith(stderr)
    assert (done.stdout, done.returncode) == ("done\n", status)
    assert done.stderr.endswith(STAYS) is (status == 3)


@pytest.mark.parametrize(
    "body",
    [
        "host.switches['vswitch0'].add_uplink('nic99')",
        "host.switches['vswitch0'].mtu = 99",
        "with host.transaction():\n    host.switches['vswitch0'].mtu = 9000; host.switches['nope']",
        "host.add_switch('lab', uplinks=['nic0', 'nic99'])",
        "with host.switches['vswitch0'].uplinks['nic4'].taken_down():\n    host.switches['nope']",
        "with next(host.ports()).mirrored('web-2'):\n    host.switches['nope']",
    ],
    ids=["refused", "wrong", "rolled back", "whole or not", "an uplink", "a mirror"],
)
def test_what_leaves_nothing_changed(body: str, tmp_path: Path) -> None:
    done = run(f"host = vswitch.Host()\n{body}", tmp_path)
    assert done.returncode == 1, done.stderr
    assert "stays changed" not in done.stderr


def test_a_write_of_which_nobody_knows_whether_it_is_done(host: Host) -> None:
    host.fault("VSDVS_SetMTU", panic=(OSError, "the device is gone"))
    with pytest.raises(SystemExit) as raised, exits("tool"):
        host.objects.switches["vswitch0"].mtu = 9000
    assert raised.value.code == 3


def test_what_was_changed_before_the_tool(host: Host) -> None:
    host.objects.switches["vswitch0"].mtu = 9000
    with pytest.raises(SystemExit) as raised, exits("tool"):
        host.objects.switches["nope"]
    assert raised.value.code == 1


def test_a_mistake_in_the_tool_keeps_its_traceback(tmp_path: Path) -> None:
    done = run("None.name", tmp_path)
    assert done.returncode == 1 and done.stderr.startswith("Traceback")
    assert "AttributeError: 'NoneType' object has no attribute 'name'" in done.stderr


@pytest.mark.parametrize(
    "body, status",
    [
        ("print('x' * 2**20)", 0),
        ("print('x')", 0),
        ("print('x'); sys.exit()", 0),
        ("print('x'); sys.exit(3)", 3),
    ],
)
def test_a_closed_pipe_is_no_error(body: str, status: int, tmp_path: Path) -> None:
    """Whether the pipe is found closed while the tool writes, or when it ends."""
    program = tmp_path / "tool.py"
    program.write_text(PROGRAM.format(body=f"    {body}\n"))
    # The reader is gone before the tool begins.
    shell = f'"{sys.executable}" "{program}" 2>"{tmp_path}/stderr"; echo $? >"{tmp_path}/status"'
    subprocess.run(["sh", "-c", f"({shell}) | true"], env=ENVIRONMENT, check=True)
    assert (tmp_path / "stderr").read_text() == ""
    assert (tmp_path / "status").read_text() == f"{status}\n"


@pytest.mark.parametrize(
    "body, status, more",
    [
        ("print('x' * 2**20)", 1, "\n"),
        ("print('x')", 1, "\n"),
        ("print('x'); sys.exit()", 1, "\n"),
        ("print('x'); sys.exit(3)", 3, "\n"),
        (LAB, 3, STAYS),
        (f"{LAB}print('x' * 2**20)", 3, STAYS),
    ],
)
def test_what_cannot_be_written_is_an_error(
    body: str, status: int, more: str, tmp_path: Path
) -> None:
    with open("/dev/full", "w") as full:
        done = run(body, tmp_path, full.fileno())
    said = f"tool: [Errno 28] No space left on device{more}"
    assert (done.stderr, done.returncode) == (said, status)


@pytest.mark.parametrize(
    "closed, stdout, stderr",
    [("<&-", "done\n", "tool: no\n"), (">&-", "", "tool: no\n"), ("2>&-", "done\n", "")],
)
def test_a_closed_stream_leads_nowhere(
    closed: str, stdout: str, stderr: str, tmp_path: Path
) -> None:
    program = tmp_path / "tool.py"
    body = "print(sys.stdin.read() + 'done'); raise vswitch.HostError('no')"
    program.write_text(PROGRAM.format(body=f"    {body}\n"))
    done = subprocess.run(
        ["sh", "-c", f'"$0" "$1" {closed}', sys.executable, str(program)],
        env=ENVIRONMENT,
        stdin=subprocess.DEVNULL,
        stdout=subprocess.PIPE,
        stderr=subprocess.PIPE,
        text=True,
    )
    assert (done.returncode, done.stdout, done.stderr) == (1, stdout, stderr)


def test_as_a_decorator() -> None:
    @exits("tool")
    def main() -> None:
        raise HostError("no")

    with pytest.raises(SystemExit) as raised:
        main()
    assert raised.value.code == 1
