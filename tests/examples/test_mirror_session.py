"""examples/mirror_session.py: whatever happens, no session stays behind."""

import signal
import subprocess
import sys
from typing import Any, Callable, Iterator, List

import pytest
from programs import EXAMPLES
from simhost import SharedHost

PORTS = ["vswitch0", "web-1", "web-2"]


def sessions(host: SharedHost) -> List[Any]:
    (switch,) = host.describe()["switches"]
    return [session for port in switch["ports"] for session in port.get("mirror_sessions", [])]


@pytest.fixture
def mirror(shared_host: SharedHost) -> Iterator["subprocess.Popen[str]"]:
    """The tool, which mirrors until it is ended."""
    with subprocess.Popen(
        [sys.executable, str(EXAMPLES / "mirror_session.py"), *PORTS],
        env={**shared_host.environment, "SIMHOST_LEDGER": "1"},
        stdout=subprocess.PIPE,
        stderr=subprocess.PIPE,
        encoding="utf-8",
    ) as process:
        assert process.stdout is not None
        assert process.stdout.readline() == "mirror_session mirrors web-1 to web-2\n"
        yield process
        process.kill()


@pytest.mark.parametrize("end", [signal.SIGINT, signal.SIGTERM])
def test_from_start_to_end(
    shared_host: SharedHost, mirror: "subprocess.Popen[str]", end: signal.Signals
) -> None:
    (session,) = sessions(shared_host)
    expected = {
        "sid": "mirror_session",
        "name": "web-1 to web-2",
        "type": "port",
        "to": [{"port": "web-2"}],
        "received_by": [{"port": "web-1"}],
        "sent_by": [{"port": "web-1"}],
    }
    assert {key: session[key] for key in expected} == expected
    for counter, value in [("mirroredPkts", 1000), ("discardedPkts", 20), ("failedPkts", 3)]:
        shared_host.set_counter("vswitch0", counter, value, session="mirror_session")
    mirror.send_signal(end)
    assert mirror.communicate(timeout=60) == (
        "1000 packets mirrored, 20 discarded, 3 failed\nmirror_session is removed\n",
        "",
    )
    assert mirror.returncode == 0
    assert sessions(shared_host) == []


def test_a_session_of_another_length(shared_host: SharedHost, example: Callable[..., Any]) -> None:
    options = ["--id", "i" * 31, "--snap-length", "65535", "--for", "0"]
    assert example("mirror_session", *PORTS, *options) == (
        0,
        [
            f"{'i' * 31} mirrors web-1 to web-2",
            "0 packets mirrored, 0 discarded, 0 failed",
            f"{'i' * 31} is removed",
        ],
        "",
    )


@pytest.mark.parametrize(
    "fault, why",
    [
        (
            {"call": "VSQEX_GetDVMirrorSessionStats", "status": "QEX_IS_DISABLED"},
            "VSQEX_GetDVMirrorSessionStats('vswitch0', 'mirror_session'): Is disabled",
        ),
        (
            {"call": "VSQEX_GetDVMirrorSessionIDs", "status": "QEX_BUSY"},
            "VSQEX_GetDVMirrorSessionIDs('vswitch0'): Busy",
        ),
        (
            {"call": "VSQEX_GetDVMirrorSessionStats", "panic": (RuntimeError, "damaged")},
            "damaged",
        ),
    ],
)
def test_what_fails_on_the_way_leaves_no_session(
    shared_host: SharedHost, example: Callable[..., Any], fault: Any, why: str
) -> None:
    shared_host.fault(**fault)
    status, _, errors = example("mirror_session", *PORTS, "--for", "0")
    assert (status, errors) == (1, f"mirror_session: {why}\n")
    assert sessions(shared_host) == []


def test_a_session_of_somebody_else_stays(
    shared_host: SharedHost, example: Callable[..., Any]
) -> None:
    theirs = {"sid": "mirror_session", "to": [{"port": "db-1"}], "received_by": [{"vlan": 5}]}
    port = {"id": "web-1", "mirror_sessions": [theirs]}
    shared_host.apply({"switches": [{"alias": "vswitch0", "ports": [port]}]})
    assert example("mirror_session", *PORTS) == (
        1,
        [],
        "mirror_session: VSDVS_AppendDVMirrorSessions('vswitch0', 'web-1'): Exists\n",
    )
    (session,) = sessions(shared_host)
    assert session["to"] == [{"port": "db-1"}]


@pytest.mark.parametrize(
    "ports, why",
    [
        (["nope", "web-1", "web-2"], "there is no switch 'nope'"),
        (["vswitch0", "nope", "web-2"], "vswitch0 has no port 'nope'"),
        (["vswitch0", "web-1", "nope"], "vswitch0 has no port 'nope'"),
    ],
)
def test_an_unknown_switch_or_port(
    shared_host: SharedHost, example: Callable[..., Any], ports: List[str], why: str
) -> None:
    assert example("mirror_session", *ports) == (1, [], f"mirror_session: {why}\n")
    assert sessions(shared_host) == []


@pytest.mark.parametrize(
    "option, why",
    [
        ("--id=", "argument --id: '' does not have 1 to 31 bytes"),
        (f"--id={'i' * 32}", f"argument --id: '{'i' * 32}' does not have 1 to 31 bytes"),
        ("--snap-length=-1", "argument --snap-length: no frame has -1 bytes"),
        ("--snap-length=65536", "argument --snap-length: no frame has 65536 bytes"),
        ("--for=-1", "argument --for: -1 is no time to wait"),
    ],
)
def test_a_wrong_option(example: Callable[..., Any], option: str, why: str) -> None:
    status, lines, errors = example("mirror_session", *PORTS, option)
    assert (status, lines) == (2, [])
    assert errors.splitlines()[-1] == f"mirror_session.py: error: {why}"


def test_nothing_can_be_written(shared_host: SharedHost) -> None:
    command = [sys.executable, str(EXAMPLES / "mirror_session.py"), *PORTS]
    with open("/dev/full", "w", encoding="ascii") as full:
        done = subprocess.run(
            command, env=shared_host.environment, stdout=full, stderr=subprocess.PIPE, text=True
        )
    errors = "mirror_session: [Errno 28] No space left on device\n"
    assert (done.returncode, done.stderr) == (1, errors)
    assert sessions(shared_host) == []
