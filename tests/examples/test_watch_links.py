"""examples/watch_links.py, while things happen to the links."""

import re
import signal
import subprocess
import sys
from typing import Any, Callable, Iterator

import pytest
from programs import EXAMPLES
from simhost import SharedHost


@pytest.fixture
def watcher(shared_host: SharedHost) -> Iterator["subprocess.Popen[str]"]:
    """The tool, which watches until it is ended."""
    words = [sys.executable, str(EXAMPLES / "watch_links.py"), "vswitch0", "--every", "0.01"]
    with subprocess.Popen(
        words,
        env={**shared_host.environment, "SIMHOST_LEDGER": "1"},
        stdout=subprocess.PIPE,
        stderr=subprocess.PIPE,
        encoding="utf-8",
    ) as process:
        yield process
        process.kill()


def line(watcher: "subprocess.Popen[str]") -> str:
    assert watcher.stdout is not None
    return watcher.stdout.readline()


def change(watcher: "subprocess.Popen[str]") -> str:
    """The next change, without its time."""
    time, _, what = line(watcher).partition(" ")
    assert re.fullmatch(r"\d\d:\d\d:\d\d", time)
    return what


def test_says_each_change_and_nothing_else(
    shared_host: SharedHost, watcher: "subprocess.Popen[str]"
) -> None:
    assert line(watcher) == "vswitch0: nic4 up, nic5 up\n"
    shared_host.link("nic4").down()
    assert change(watcher) == "nic4 down\n"
    shared_host.link("nic5").up()  # as it is
    shared_host.link("nic4").up()
    assert change(watcher) == "nic4 up\n"
    shared_host.apply({"switches": [{"alias": "vswitch0", "uplinks": ["nic0"]}]})
    assert change(watcher) == "nic0 up\n"
    remove = "import _libvswitch as vs; vs.VSDVS_RemoveSwitchUplinkPort('vswitch0', 'nic0')"
    shared_host.run([sys.executable, "-c", remove])
    assert change(watcher) == "nic0 gone\n"

    watcher.send_signal(signal.SIGINT)
    assert watcher.communicate(timeout=60) == ("", "")
    assert watcher.returncode == 0


def test_says_when_it_is_refused(shared_host: SharedHost, watcher: "subprocess.Popen[str]") -> None:
    assert line(watcher) == "vswitch0: nic4 up, nic5 up\n"
    shared_host.fault("VSQEX_GetUplinkLinkState", status="QEX_BUSY")
    out, errors = watcher.communicate()
    assert out == ""
    assert errors == "watch_links: VSQEX_GetUplinkLinkState('vswitch0', 'nic4'): Busy\n"
    assert watcher.returncode == 1


def test_ends_after_a_while(example: Callable[..., Any]) -> None:
    said = ["vswitch0: nic4 up, nic5 up"]
    assert example("watch_links", "vswitch0", "--for", "0.02", "--every", "10") == (0, said, "")


@pytest.mark.scenario({"switches": [{"alias": "lab"}]})
def test_a_switch_without_uplinks(example: Callable[..., Any]) -> None:
    assert example("watch_links", "lab", "--for", "0") == (0, ["lab: no uplinks"], "")


def test_an_unknown_switch(example: Callable[..., Any]) -> None:
    errors = "watch_links: VSQEX_GetUplinks('nope'): Not found\n"
    assert example("watch_links", "nope") == (1, [], errors)


@pytest.mark.parametrize("time", ["-1", "nan", "1e10"])
def test_what_is_no_time(example: Callable[..., Any], time: str) -> None:
    status, lines, errors = example("watch_links", "vswitch0", f"--for={time}")
    assert (status, lines) == (2, [])
    error = f"watch_links.py: error: argument --for: {time} is no time to wait"
    assert errors.splitlines()[-1] == error
