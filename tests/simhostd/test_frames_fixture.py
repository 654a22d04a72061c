"""The plug-in's fixture for real frames."""

import doctest
import os
import signal
import socket
import subprocess
import sys
import time
from contextlib import ExitStack
from pathlib import Path
from typing import Any, Callable, Dict, Iterator, List, Set

import pytest
import simhost

from frame_lab import comes_sooner_or_later

EVERYBODY = "ff:ff:ff:ff:ff:ff"
PATIENCE = 60.0
ONE_VLAN: Dict[str, Any] = {
    "uplinks": [{"name": "nic0"}, {"name": "nic1"}],
    "switches": [
        {
            "alias": "lab",
            "uplinks": ["nic0", "nic1"],
            "teaming": {"balance": "explicit", "active": ["nic0"], "standby": ["nic1"]},
            "ports": [{"id": "a", "vlan": 7}, {"id": "b", "vlan": 7}, {"id": "c"}],
        }
    ],
}


@pytest.mark.scenario(ONE_VLAN)
def test_a_frame_comes_once_and_only_where_it_may(frames: simhost.Frames) -> None:
    one, other, third = (frames.client("lab", port) for port in "abc")
    sent = simhost.frame(EVERYBODY, one.mac, payload=b"once" * 20)
    one.send(sent)
    assert other.expect(lambda frame: frame.endswith(b"once")) == sent
    other.expect_none(timeout=0.1)
    third.expect_none(timeout=0)


@pytest.mark.scenario(ONE_VLAN)
def test_frames_beyond_uplinks_have_their_tag(frames: simhost.Frames) -> None:
    network, near = frames.network("nic0", "nic1"), frames.client("lab", "a")
    far = network.client()
    near.send(simhost.frame(EVERYBODY, near.mac))
    far.expect(simhost.frame(EVERYBODY, near.mac, vlan=7))
    network.pull("nic0")
    back = simhost.frame(near.mac, far.mac, vlan=7, priority=3)
    assert comes_sooner_or_later(far, near, back, simhost.frame(near.mac, far.mac))
    network.plug("nic0")
    far.expect_none(back, timeout=0)


@pytest.mark.scenario(ONE_VLAN)
def test_an_address_may_be_given(frames: simhost.Frames) -> None:
    client = frames.client("lab", "a", mac="02:00:00:00:00:07")
    assert client.mac == "02:00:00:00:00:07"
    (switch,) = frames.host.describe()["switches"]
    ports = [port for port in switch["ports"] if port["id"] == "a"]
    assert ports[0]["device"]["mac"] == "02:00:00:00:00:07"


@pytest.mark.scenario(ONE_VLAN)
def test_what_did_not_come_is_said_with_what_did(frames: simhost.Frames) -> None:
    one, other = frames.client("lab", "a"), frames.client("lab", "b")
    first, second, not_sent = (
        simhost.frame(EVERYBODY, one.mac, payload=text * 30) for text in (b"x", b"y", b"z")
    )
    with pytest.raises(AssertionError, match="did not come within 0 s, nor did anything else"):
        other.expect(not_sent, timeout=0)
    one.send(first)
    one.send(second)
    # The one before has come, too, by then.
    other.expect(second)
    with pytest.raises(AssertionError, match=f"{not_sent.hex()} did not come(.|\n)*{first.hex()}"):
        other.expect(not_sent, timeout=0.1)
    with pytest.raises(AssertionError, match=f"a frame came: {first.hex()}"):
        other.expect_none()


TWO_TESTS = """
    import pytest
    import simhost
    from frame_lab import comes_sooner_or_later

    LEARNS = {"id": "web-1", "mac_learning": {"learning": True}}

    @pytest.mark.parametrize("number", [1, 2])
    def test_fresh(frames, number):
        (switch,) = frames.host.describe()["switches"]
        assert switch["mtu"] == 1500
        frames.host.apply({"switches": [{"alias": "vswitch0", "mtu": 9000, "ports": [LEARNS]}]})
        one, other = frames.client("vswitch0", "web-1"), frames.client("vswitch0", "web-2")
        to_second = simhost.frame("02:00:00:00:00:02", other.mac)
        other.send(to_second)
        one.expect_none(to_second)
        told = simhost.frame("ff:ff:ff:ff:ff:ff", "02:00:00:00:00:02")
        one.send(told)
        other.expect(told)
        # What the data path remembers of the frame that was dropped goes a little later.
        assert comes_sooner_or_later(other, one, to_second)
"""


def test_each_test_has_a_fresh_host_and_all_have_one_daemon(
    pytester: pytest.Pytester, monkeypatch: pytest.MonkeyPatch
) -> None:
    monkeypatch.setenv("PYTHONPATH", str(Path(__file__).parent), prepend=os.pathsep)
    pytester.makepyfile(TWO_TESTS)
    done = pytester.runpytest_subprocess("-p", "no:cacheprovider", "--setup-show")
    done.assert_outcomes(passed=2)
    said = "\n".join(done.outlines)
    assert said.count("SETUP    S _frames_host") == 1


USES_FRAMES = """
    def test_it(frames):
        pass
"""


def test_a_command_that_is_missing_is_named(
    pytester: pytest.Pytester, monkeypatch: pytest.MonkeyPatch
) -> None:
    bare = pytester.mkdir("bare")
    for tool in ("ip", "nsenter", "setpriv", "unshare"):
        (bare / tool).symlink_to(f"/usr/bin/{tool}")
    monkeypatch.setenv("PATH", str(bare))
    said = ends_with_an_error(pytester)
    assert "frames need the command ethtool: install Debian's package ethtool" in said


def test_without_namespaces_it_says_so(
    pytester: pytest.Pytester, monkeypatch: pytest.MonkeyPatch
) -> None:
    tool = pytester.mkdir("forbidding") / "unshare"
    tool.write_text("#!/bin/sh\necho 'unshare: Operation not permitted' >&2\nexit 1\n")
    tool.chmod(0o755)
    monkeypatch.setenv("PATH", f"{tool.parent}:{os.environ['PATH']}")
    said = ends_with_an_error(pytester)
    assert (
        "no network namespace can be made here (unshare: Operation not permitted): be root, or have"
        " the system allow namespaces of users" in said
    )


def test_without_open_vswitch_it_says_which_package_to_install(pytester: pytest.Pytester) -> None:
    pytester.makepyfile(USES_FRAMES)
    hide = 'mount --bind /dev/null /usr/sbin/ovs-vswitchd && exec "$@"'
    run_pytest = [sys.executable, "-m", "pytest", "-p", "no:cacheprovider"]
    user = [] if os.geteuid() == 0 else ["--user", "--map-root-user"]
    done = pytester.run("unshare", *user, "--mount", "sh", "-c", hide, "sh", *run_pytest)
    assert done.parseoutcomes() == {"errors": 1}
    said = "\n".join(done.outlines)
    assert "simhostd does not start:\n" in said
    assert "a private Open vSwitch needs Debian's package openvswitch-switch" in said


def ends_with_an_error(pytester: pytest.Pytester) -> str:
    pytester.makepyfile(USES_FRAMES)
    done = pytester.runpytest_subprocess("-p", "no:cacheprovider")
    done.assert_outcomes(errors=1)
    return "\n".join(done.outlines)


WAITS = """
    import time

    def test_waits(frames):
        one, other = frames.client("vswitch0", "web-1"), frames.client("vswitch0", "web-2")
        network = frames.network("nic4", "nic5")
        network.client().start("sleep", "1000")
        assert one.comes_to_reach(other)
        with open("reached", "w"):
            pass
        time.sleep(1000)
"""


@pytest.fixture
def temporary(pytester: pytest.Pytester) -> Path:
    """Where a run has temporary files, but for those of pytest itself."""
    return pytester.mkdir("temporary")


Interrupted = Callable[..., "subprocess.Popen[bytes]"]


@pytest.fixture
def interrupted(pytester: pytest.Pytester, temporary: Path) -> Iterator[Interrupted]:
    """A run of pytest in the foreground of a terminal, whose test waits."""
    pytester.makepyfile(WAITS)
    environment = {**os.environ, "FRAMES_RUN": str(pytester.path), "TMPDIR": str(temporary)}
    with ExitStack() as stack:

        def start(*more: str) -> "subprocess.Popen[bytes]":
            words = [sys.executable, "-m", "pytest", "-q", "-p", "no:cacheprovider", *more]
            run = subprocess.Popen(
                words, env=environment, stdout=subprocess.DEVNULL, start_new_session=True
            )
            stack.callback(run.wait)
            stack.callback(run.kill)
            for _ in waiting_for(lambda: Path(pytester.path, "reached").exists()):
                assert run.poll() is None
            return run

        yield start


@pytest.mark.parametrize(
    ("number", "workers"), [(signal.SIGINT, "1"), (signal.SIGTERM, "0"), (signal.SIGKILL, "0")]
)
def test_nothing_is_left_of_a_run_that_is_interrupted(
    pytester: pytest.Pytester,
    temporary: Path,
    interrupted: Interrupted,
    number: signal.Signals,
    workers: str,
) -> None:
    before = surroundings()
    run = interrupted("-n", workers)
    mark = f"FRAMES_RUN={pytester.path}"
    processes = processes_with(mark)
    assert {"simhostd", "ovsdb-server", "ovs-vswitchd", "sleep"} <= set(processes.values())
    with ExitStack() as stack:
        # Whoever holds a namespace open keeps its number from another one.
        for process in processes:
            stack.enter_context(open(f"/proc/{process}/ns/net", "rb"))
        namespaces = {of(process) for process in processes} - {of(os.getpid())}
        # The host, the network, and three clients.
        assert len(namespaces) == 5
        os.killpg(run.pid, number)
        run.wait(timeout=PATIENCE)
        for _ in waiting_for(lambda: not processes_with(mark)):
            pass
        # Some are still being taken down, and have no environment any more.
        for _ in waiting_for(lambda: not namespaces & {of(int(entry.name)) for entry in entries()}):
            pass
    # Others may run tests meanwhile, and are done with what they made sooner or later.
    for _ in waiting_for(lambda: surroundings() <= before):
        pass
    assert not list(temporary.iterdir())


def surroundings() -> Set[str]:
    """The devices, the named namespaces and the mounts of who runs tests."""
    devices = sorted(name for _, name in socket.if_nameindex())
    named = sorted(str(entry) for entry in Path("/run/netns").glob("*"))
    mounts = Path("/proc/self/mountinfo").read_text(encoding="utf-8").splitlines()
    return {*devices, *named, *mounts}


def waiting_for(done: Callable[[], bool]) -> Iterator[None]:
    deadline = time.monotonic() + PATIENCE
    while not done():
        assert time.monotonic() < deadline
        yield
        time.sleep(0.02)


def entries() -> Iterator[Path]:
    return (entry for entry in Path("/proc").iterdir() if entry.name.isdigit())


def processes_with(mark: str) -> Dict[int, str]:
    """The programs of all that have it in their environment."""
    found = {}
    for entry in entries():
        try:
            if mark.encode() in (entry / "environ").read_bytes().split(b"\0"):
                found[int(entry.name)] = (entry / "comm").read_text(encoding="utf-8").strip()
        except OSError:
            continue
    return found


def of(process: int) -> str:
    """The network namespace that a process is in; nothing if it is gone."""
    try:
        return os.readlink(f"/proc/{process}/ns/net")
    except OSError:
        return ""


def test_the_guide_shows_what_happens(pytester: pytest.Pytester) -> None:
    guide = Path(__file__).parents[2] / "docs/guides/test_frames.py"
    pytester.makepyfile(guide.read_text(encoding="utf-8"))
    pytester.runpytest_subprocess("-p", "no:cacheprovider").assert_outcomes(passed=2)


# The classes' own words, as one session: each of them needs what is there before.
SESSION = (
    (simhost.Frames, "client"),
    (simhost.Client, "send"),
    (simhost.Client, "expect"),
    (simhost.Client, "expect_none"),
    (simhost.Client, "run"),
    (simhost.Client, "reaches"),
    (simhost.Frames, "network"),
    (simhost.Network, "pull"),
    (simhost.Network, "plug"),
)


@pytest.mark.scenario(ONE_VLAN)
def test_the_documentation_shows_what_happens(frames: simhost.Frames) -> None:
    shown: List[str] = []
    given: Dict[str, Any] = {"frames": frames, "simhost": simhost}
    for kind, name in SESSION:
        finder = doctest.DocTestFinder()
        (example,) = finder.find(getattr(kind, name), f"{kind.__name__}.{name}")
        example.globs = given
        result = doctest.DocTestRunner(verbose=False).run(
            example, out=shown.append, clear_globs=False
        )
        assert result.attempted
    assert not shown, "".join(shown)
