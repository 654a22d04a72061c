"""The commands that go on for a time, and what they leave when they are ended."""

import contextlib
import json
import signal
import threading
from typing import Iterator, List

import pytest
from command_line import SIMULATED, Refused, Vswitch, started, state, until
from simhost import SharedHost


def sessions(host: SharedHost) -> List[str]:
    ports = host.describe()["switches"][1]["ports"]
    return [one["sid"] for port in ports for one in port.get("mirror_sessions", ())]


@contextlib.contextmanager
def flapping(host: SharedHost) -> Iterator[None]:
    """A link that goes down and up again and again: nobody says when a watch begins."""
    over = threading.Event()

    def flap() -> None:
        while not over.wait(0.3):
            host.link("nic0").down()
            over.wait(0.3)
            host.link("nic0").up()

    thread = threading.Thread(target=flap)
    thread.start()
    try:
        yield
    finally:
        over.set()
        thread.join()


def test_watch(lab: SharedHost) -> None:
    words = ("watch", "--every", "0.05", "--kind", "link", "--kind", "carrier")
    with flapping(lab), started(lab, *words) as (running, stdout):
        while not stdout.readline().endswith(" link lab/nic0/link: up -> down\n"):
            assert running.poll() is None
        assert stdout.readline().endswith(" carrier lab/web-1/carrier: nic0 -> nic1\n")
        assert stdout.readline().endswith(" carrier lab/web-2/carrier: nic0 -> nic1\n")
        running.send_signal(signal.SIGINT)
        assert running.communicate()[1] == SIMULATED
        assert running.returncode == 0


def test_watch_for_programs(lab: SharedHost) -> None:
    words = ("watch", "--every", "0.05", "--kind", "link", "--json")
    with flapping(lab), started(lab, *words) as (_, stdout):
        told = [json.loads(stdout.readline()) for _ in range(2)]
        assert all(isinstance(one.pop("at"), float) for one in told)
        for before, after in (("up", "down"), ("down", "up")):
            expected = {"kind": "link", "path": "lab/nic0/link", "before": before, "after": after}
            assert expected in told


def test_watch_for_a_time(vswitch: Vswitch) -> None:
    assert vswitch("watch", "--for", "0") == (0, "", SIMULATED)


def test_a_kind_that_is_none(refused: Refused) -> None:
    told = refused("watch", "--kind", "lnk", status=2)
    assert told.startswith("vswitch: --kind: 'lnk' is not one of switch, port, uplink, link")


@pytest.mark.parametrize(
    "words",
    [
        ["watch", "--for", "nan"],
        ["stats", "lab", "--watch", "--every", "inf"],
        ["mirror", "lab/web-1", "--to", "lab/web-2", "--for", "nan"],
        ["drill", "lab", "--timeout", "1e99"],
        ["apply", "-", "--confirm-within", "inf"],
    ],
)
def test_what_is_no_time(refused: Refused, words: List[str]) -> None:
    said = f"vswitch: Invalid value for '{words[-2]}': {float(words[-1])} is no time of up to"
    assert refused(*words, status=2).startswith(said)


@pytest.mark.parametrize("to", ["lab/web-2", "lab/nic1"])
def test_mirror(vswitch: Vswitch, lab: SharedHost, to: str) -> None:
    before = state(lab)
    done = vswitch("mirror", "lab/web-1", "--to", to, "--for", "0")
    assert done.lines[:2] == ["COUNTER           COUNT", "mirrorPktCnt          0"]
    assert (done.status, done.stderr) == (0, SIMULATED)
    assert state(lab) == before


def test_mirror_for_programs(vswitch: Vswitch) -> None:
    words = ("mirror", "lab/web-1", "--to", "lab/web-2", "--for", "0.1", "--every", "0.05")
    told = [json.loads(line) for line in vswitch(*words, "--json").lines]
    assert len(told) >= 2 and all(one["mirroredPkts"] == 0 for one in told)


@pytest.mark.parametrize("number", [signal.SIGINT, signal.SIGTERM, signal.SIGHUP])
def test_a_mirror_session_goes_whatever_ends_it(lab: SharedHost, number: signal.Signals) -> None:
    before = state(lab)
    words = ("mirror", "lab/web-1", "--to", "lab/web-2", "--for", "600")
    with started(lab, *words) as (running, _):
        until(lambda: len(sessions(lab)) == 1)
        running.send_signal(number)
        running.communicate()
        assert running.returncode == 128 + number
    assert state(lab) == before


def test_what_is_not_mirrored(refused: Refused) -> None:
    more = ("--for", "1")
    assert refused("mirror", "lab/web-1", "--to", "lab/x", *more) == (
        "vswitch: no port 'x' of switch 'lab' (it has web-1, web-2)\n"
    )
    assert refused("mirror", "lab/web-1", "--to", "vswitch0/web-1", *more) == (
        "vswitch: 'vswitch0/web-1' is not of switch 'lab'\n"
    )
    assert refused("mirror", "lab", "--to", "lab/web-2", *more, status=2).startswith(
        "vswitch: 'lab' is no port: SWITCH/PORT is expected\n"
    )


def test_drill(vswitch: Vswitch, lab: SharedHost) -> None:
    before = state(lab)["uplinks"]
    done = vswitch("drill", "lab")
    assert done.lines == [
        "DOWN  PORT   CARRIED BY",
        "nic0  web-1  nic1",
        "nic0  web-2  nic1",
    ]
    assert (done.status, done.stderr) == (0, SIMULATED)
    assert state(lab)["uplinks"] == before
    expected = {"uplink": "nic0", "port": "web-1", "meanwhile": "nic1"}
    assert vswitch("drill", "lab", "--json").json[0] == expected


def test_a_drill_that_finds_something(vswitch: Vswitch, lab: SharedHost) -> None:
    assert vswitch("set", "lab/web-2", "active=left", "standby=").status == 0
    before = state(lab)["uplinks"]
    done = vswitch("drill", "lab")
    assert done.lines[1:] == ["nic0  web-1  nic1", "nic0  web-2  none"]
    assert (done.status, done.stderr) == (
        1,
        SIMULATED + "vswitch: no uplink carried web-2 without nic0\n",
    )
    assert state(lab)["uplinks"] == before


SIGNALLED = """
import os
import signal
import sys

from vswitch import LinkState, Switch, Uplink
from vswitch.command import main

number = getattr(signal, sys.argv.pop(1))
carriers, set_ = Switch.carriers, Uplink._set


def meanwhile(switch):
    if any(uplink.link is LinkState.DOWN for uplink in switch.uplinks.values()):
        os.kill(os.getpid(), number)
    return carriers(switch)


def once_more(uplink, state):
    if state is LinkState.UP:
        for one in (signal.SIGINT, signal.SIGTERM, signal.SIGHUP):
            os.kill(os.getpid(), one)
    set_(uplink, state)


Switch.carriers, Uplink._set = meanwhile, once_more
main()
"""


@pytest.mark.parametrize("number", [signal.SIGINT, signal.SIGTERM, signal.SIGHUP])
def test_a_link_comes_up_whatever_ends_a_drill(lab: SharedHost, number: signal.Signals) -> None:
    """The signal comes while it is down, and all of them once more when it is to come up."""
    before = state(lab)["uplinks"]
    done = lab.run(["/usr/bin/python3", "-c", SIGNALLED, number.name, "drill", "lab"])
    said = "vswitch: interrupted\n" if number is signal.SIGINT else ""
    assert (done.returncode, done.stdout, done.stderr) == (128 + number, "", SIMULATED + said)
    assert state(lab)["uplinks"] == before


def test_a_signal_that_is_ignored_from_the_beginning(lab: SharedHost) -> None:
    """As nohup has it."""
    done = lab.run(["nohup", "/usr/bin/python3", "-c", SIGNALLED, "SIGHUP", "drill", "lab"])
    assert done.returncode == 130, done


def test_no_drill(lab: SharedHost, refused: Refused) -> None:
    lab.link("nic1").down()
    assert refused("drill", "lab") == (
        "vswitch: no drill with switch 'lab': nic1 is down already\n"
    )
    lab.apply({"switches": [{"alias": "bare"}]})
    assert refused("drill", "bare") == ("vswitch: no drill with switch 'bare': it has no uplinks\n")


def test_a_link_that_does_not_come_up_again(lab: SharedHost, vswitch: Vswitch) -> None:
    lab.fault("VSQEX_SetUplinkAdminLinkState", nth=2, times=99, status="QEX_BUSY")
    done = vswitch("drill", "lab")
    assert (done.status, done.stdout) == (3, "")
    assert done.stderr.startswith(SIMULATED + "vswitch: lab/nic0 is not up again: ")
