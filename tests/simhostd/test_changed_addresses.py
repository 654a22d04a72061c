"""A client that changes the address of its device: it is reached at the new one, or cut off until
it has its own again."""

import json
from pathlib import Path
from typing import Any, Dict

import pytest

from simhost import Client, frame

from frame_lab import TOOLS, Lab, comes_sooner_or_later, comes_true

OWN, OTHER, CHANGED = (f"02:00:00:00:00:{number}" for number in ("01", "02", "99"))
BROADCAST = "ff:ff:ff:ff:ff:ff"
ALLOWED: Dict[str, Any] = {"forbids": [], "mac_learning": {"mac_change": True}}
FORBIDDEN: Dict[str, Any] = {"forbids": ["mac_changes"], "mac_learning": {"mac_change": False}}


def change(client: Client, address: str) -> None:
    client.namespace.run("ip", "link", "set", "eth0", "address", address)


def dropped(lab: Lab) -> Any:
    """The setting for which what the client sends goes nowhere, if it does not."""
    sent = frame(BROADCAST, CHANGED).hex()
    last = json.loads(lab.ctl("trace", "lab/a", sent, "--json"))[-1]
    return last["text"] == "is dropped: the client has changed its address" and last["setting"]


def test_what_becomes_of_a_client_that_changes_its_address(lab: Lab) -> None:
    one, other = (lab.frames.client("lab", port, mac=mac) for port, mac in zip("ab", (OWN, OTHER)))
    lab.set_port("lab", "c", mac_learning={"flooding": True})
    everything = lab.client("lab", "c")
    is_reached_as_it_is_now(lab, one, other, everything)
    for setting, forbidden in FORBIDDEN.items():
        lab.set_port("lab", "a", **{**ALLOWED, setting: forbidden})
        is_cut_off(lab, one, other, everything)
        assert dropped(lab)["name"] == setting
        change(one, OWN)
        assert one.comes_to_reach(other)
    change(one, CHANGED)
    assert comes_true(lambda: dropped(lab))
    lab.set_port("lab", "a", **ALLOWED)
    other.send(frame(CHANGED, OTHER, payload=b"it may now"))
    one.expect(frame(CHANGED, OTHER, payload=b"it may now"))


# Without the right to hear what other namespaces tell, which nothing else takes.
DEAF = """#!/bin/sh
exec setpriv --bounding-set=-net_broadcast --inh-caps=-net_broadcast {} "$@"
"""
NET_BROADCAST = 1 << 11


def test_a_client_is_reached_that_changes_its_address_where_the_kernel_does_not_tell(
    idle: Lab, tmp_path: Path, monkeypatch: pytest.MonkeyPatch
) -> None:
    deaf = tmp_path / "simhostd"
    deaf.write_text(DEAF.format(TOOLS / "simhostd"), encoding="utf-8")
    deaf.chmod(0o755)
    monkeypatch.setattr("simhost._loaded.program", lambda *_, **__: deaf)
    idle.start()
    assert idle.daemon is not None and not rights_of(idle.daemon.pid) & NET_BROADCAST
    one, other = (idle.frames.client("lab", port, mac=mac) for port, mac in zip("ab", (OWN, OTHER)))
    idle.set_port("lab", "a", **ALLOWED)
    for number in range(2):
        address = f"02:00:00:00:00:9{number}"
        change(one, address)
        assert comes_sooner_or_later(other, one, frame(address, OTHER, payload=b"at last"))


def rights_of(process: int) -> int:
    status = Path(f"/proc/{process}/status").read_text(encoding="utf-8")
    (rights,) = (line for line in status.splitlines() if line.startswith("CapEff:"))
    return int(rights.split()[1], 16)


def is_reached_as_it_is_now(lab: Lab, one: Client, other: Client, everything: Client) -> None:
    change(one, CHANGED)
    assert comes_sooner_or_later(other, one, frame(CHANGED, OTHER, payload=b"at last"))
    # What went before goes as it does now: whom the daemon replies to, sees what is in force.
    assert not dropped(lab)
    one.send(frame(BROADCAST, CHANGED))
    other.expect(frame(BROADCAST, CHANGED))
    now, no_more = (frame(to, OTHER, payload=b"now") for to in (CHANGED, OWN))
    for sent in (now, no_more):
        other.send(sent)
    one.expect(now)
    everything.expect(no_more)
    one.expect_none(no_more, timeout=0)
    everything.expect_none(now, timeout=0)


def is_cut_off(lab: Lab, one: Client, other: Client, everything: Client) -> None:
    change(one, CHANGED)
    assert comes_true(lambda: dropped(lab))
    assert dropped(lab)
    for source in (OWN, CHANGED):
        one.send(frame(BROADCAST, source, payload=b"goes nowhere"))
    for to in (OWN, CHANGED, BROADCAST):
        other.send(frame(to, OTHER, payload=b"not for it"))
    everything.expect(frame(BROADCAST, OTHER, payload=b"not for it"))
    one.expect_none(lambda came: b"not for it" in came)
    other.expect_none(lambda came: b"goes nowhere" in came, timeout=0)
