"""examples/mirror.py: it counts, and whatever happens, no session stays behind unsaid."""

import signal
import subprocess
import sys
from typing import Any, Callable, Iterator, List

import pytest
from programs import EXAMPLES
from simhost import SharedHost

PORTS = ["vswitch0", "web-1", "web-2"]
NONE = "0 packets mirrored, 0 discarded, 0 failed"


def sessions(host: SharedHost) -> List[Any]:
    (switch,) = host.describe()["switches"]
    return [session for port in switch["ports"] for session in port.get("mirror_sessions", [])]


@pytest.fixture
def mirror(shared_host: SharedHost) -> Iterator["subprocess.Popen[str]"]:
    """The tool, which mirrors until it is ended."""
    with subprocess.Popen(
        [sys.executable, str(EXAMPLES / "mirror.py"), *PORTS, "--for", "1000"],
        env={**shared_host.environment, "SIMHOST_LEDGER": "1"},
        stdout=subprocess.PIPE,
        stderr=subprocess.PIPE,
        encoding="utf-8",
    ) as process:
        assert process.stdout is not None
        assert process.stdout.readline() == f"{NONE}\n"
        yield process
        process.kill()


@pytest.mark.parametrize("end", [signal.SIGINT, signal.SIGTERM])
def test_from_start_to_end(
    shared_host: SharedHost, mirror: "subprocess.Popen[str]", end: signal.Signals
) -> None:
    (session,) = sessions(shared_host)
    expected = {
        "type": "port",
        "to": [{"port": "web-2"}],
        "received_by": [{"port": "web-1"}],
        "sent_by": [{"port": "web-1"}],
    }
    assert {key: session[key] for key in expected} == expected
    for counter, value in [("mirroredPkts", 1000), ("discardedPkts", 20), ("failedPkts", 3)]:
        shared_host.set_counter("vswitch0", counter, value, session=session["sid"])
    assert mirror.stdout is not None
    counted = "1000 packets mirrored, 20 discarded, 3 failed\n"
    # Counters are set one by one, so a line may have some of them.
    assert counted in iter(mirror.stdout.readline, "")
    mirror.send_signal(end)
    printed, errors = mirror.communicate(timeout=60)
    assert set(printed.splitlines(True)) <= {counted}
    assert (errors, mirror.returncode) == ("mirror: interrupted\n", 130)
    assert sessions(shared_host) == []


def test_no_time_is_one_look(shared_host: SharedHost, example: Callable[..., Any]) -> None:
    assert example("mirror", *PORTS, "--for", "0") == (0, [NONE], "")
    assert sessions(shared_host) == []


@pytest.mark.parametrize(
    "fault, why",
    [
        ({"status": "QEX_BUSY"}, "QEX_BUSY, Busy"),
        ({"panic": (RuntimeError, "damaged")}, "the call trapped: damaged"),
    ],
)
def test_what_fails_on_the_way_leaves_no_session(
    shared_host: SharedHost, example: Callable[..., Any], fault: Any, why: str
) -> None:
    shared_host.fault("VSQEX_GetDVMirrorSessionStats", **fault)
    status, lines, errors = example("mirror", *PORTS, "--for", "0")
    assert (status, lines) == (1, [])
    assert errors.startswith("mirror: VSQEX_GetDVMirrorSessionStats(switchName='vswitch0', ")
    assert errors.endswith(f"): {why}\n")
    assert sessions(shared_host) == []


def test_a_session_that_stays_is_said(shared_host: SharedHost, example: Callable[..., Any]) -> None:
    shared_host.fault("VSDVS_RemoveDVMirrorSession", status="QEX_BUSY")
    status, lines, errors = example("mirror", *PORTS, "--for", "0")
    (session,) = sessions(shared_host)
    assert (status, lines) == (3, [NONE])
    said = f"mirror: vswitch0/web-1: mirror session {session['sid']} is still there: "
    assert errors.startswith(said)


def test_a_session_of_somebody_else_stays(
    shared_host: SharedHost, example: Callable[..., Any]
) -> None:
    theirs = {"sid": "theirs", "to": [{"port": "db-1"}], "received_by": [{"vlan": 5}]}
    port = {"id": "web-1", "mirror_sessions": [theirs]}
    shared_host.apply({"switches": [{"alias": "vswitch0", "ports": [port]}]})
    assert example("mirror", *PORTS, "--for", "0") == (0, [NONE], "")
    (session,) = sessions(shared_host)
    assert (session["sid"], session["to"]) == ("theirs", [{"port": "db-1"}])


@pytest.mark.parametrize(
    "ports, why",
    [
        (["nope", "web-1", "web-2"], "no switch 'nope' (there are vswitch0)"),
        (
            ["vswitch0", "nope", "web-2"],
            "no port 'nope' of switch 'vswitch0' (it has db-1, web-1, web-2)",
        ),
        (
            ["vswitch0", "web-1", "nope"],
            "no port 'nope' of switch 'vswitch0' (it has db-1, web-1, web-2)",
        ),
    ],
)
def test_an_unknown_switch_or_port(
    shared_host: SharedHost, example: Callable[..., Any], ports: List[str], why: str
) -> None:
    assert example("mirror", *ports) == (1, [], f"mirror: {why}\n")
    assert sessions(shared_host) == []


def test_what_is_no_time(example: Callable[..., Any]) -> None:
    status, lines, errors = example("mirror", *PORTS, "--for=nan")
    assert (status, lines) == (2, [])
    error = "mirror.py: error: argument --for: invalid int value: 'nan'"
    assert errors.splitlines()[-1] == error


def test_nothing_can_be_written(shared_host: SharedHost) -> None:
    command = [sys.executable, str(EXAMPLES / "mirror.py"), *PORTS]
    with open("/dev/full", "w", encoding="ascii") as full:
        done = subprocess.run(
            command, env=shared_host.environment, stdout=full, stderr=subprocess.PIPE, text=True
        )
    errors = "mirror: [Errno 28] No space left on device\n"
    assert (done.returncode, done.stderr) == (1, errors)
    assert sessions(shared_host) == []
