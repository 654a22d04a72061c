"""The commands that go on for a time: they watch the host, mirror a port, try a failover."""

import contextlib
import dataclasses
import datetime
import time
from typing import Any, Dict, List, Optional, Union

import typer

from libvswitch.enums import LinkState
from libvswitch.errors import HostError
from vswitch.command import completing, output, places
from vswitch.command.arguments import EVERY, SWITCH, seconds as seconds_of
from vswitch.command.session import from_words, host, is_json
from vswitch.port import Port
from vswitch.switch import Switch
from vswitch.uplink import Uplink
from vswitch.watch import KINDS
from vswitch.words import choice

__all__ = ["drill", "mirror", "watch"]

_FOR = seconds_of(None, "--for", least=0, words="End after so many seconds.")


def watch(
    seconds: Optional[float] = _FOR,
    kind: Optional[List[str]] = typer.Option(
        None,
        metavar="KIND",
        help=f"Only such: {', '.join(KINDS)}. Several may be given.",
        autocompletion=completing.kinds,
    ),
    every: float = EVERY,
) -> None:
    """Tell what changes on the host from now on, until interrupted.

    Programs get a line of JSON for each change.
    """
    with from_words("--kind"):
        kinds = [choice(one, "", KINDS) for one in kind or KINDS]
    with contextlib.suppress(KeyboardInterrupt):
        for event in host().watch(every=every, seconds=seconds, kinds=kinds):
            if is_json():
                output.write_json_line(dataclasses.asdict(event))
            else:
                at = datetime.datetime.fromtimestamp(event.at).strftime("%H:%M:%S")
                output.line(f"{at} {event.kind} {event}")


def mirror(
    place: str = typer.Argument(
        ...,
        metavar="SWITCH/PORT",
        help="The port that is mirrored.",
        autocompletion=completing.things,
    ),
    to: str = typer.Option(
        ...,
        metavar="SWITCH/PORT",
        help="Where its frames go, too: a port, or an uplink.",
        autocompletion=completing.things,
    ),
    seconds: float = seconds_of(..., "--for", least=0, words="For how many seconds."),
    every: float = EVERY,
) -> None:
    """Mirror a port for a time: what it receives and sends goes to another, too.

    The session is removed when the time is over, and when the command is interrupted. In the end it
    tells what the session counted; programs get a line of JSON each time.
    """
    port = places.find_port(host(), place)
    end = _end_of(port.switch, to)
    stats: Dict[str, int] = {}
    with port.mirrored(to=end) as mirroring, output.progress(f"mirroring {place}") as progress:
        until = time.monotonic() + seconds
        for sample in mirroring.sample(seconds, every):
            stats = dataclasses.asdict(sample)
            if is_json():
                output.write_json_line({"at": time.time(), **stats})
            progress(f"{max(until - time.monotonic(), 0):.0f} s left")
    if not is_json():
        output.table(("counter", "count"), stats.items())


def _end_of(switch: Switch, to: str) -> Union[Port, Uplink]:
    alias, name = places.split(switch.host, to)
    if alias != switch.alias and alias in switch.host.switches:
        raise HostError(f"{to!r} is not of switch {switch.alias!r}")
    if alias == switch.alias and name is not None and name in switch.uplinks:
        return switch.uplinks[name]
    return places.find_port(switch.host, to)


def drill(
    alias: str = SWITCH,
    timeout: float = seconds_of(
        5.0, least=0.1, words="How long a link may take to go down and to come up."
    ),
) -> None:
    """Try a failover: take each uplink of a switch down in turn, and up again.

    It tells which ports the uplink carried and what carried them meanwhile. The status is 1 when a
    port was left without an uplink, and 3 when a link does not come up again.
    """
    switch = host().switches[alias]
    uplinks = list(switch.uplinks.values())
    down = [uplink.name for uplink in uplinks if uplink.link is not LinkState.UP]
    if down or not uplinks:
        why = f"{', '.join(down)} is down already" if down else "it has no uplinks"
        raise HostError(f"no drill with switch {alias!r}: {why}")
    found = []
    with output.progress(f"drill of {alias}") as progress:
        for at, uplink in enumerate(uplinks, 1):
            progress(f"{uplink.name}, {at} of {len(uplinks)}")
            found += _drilled(switch, uplink, timeout)
    if is_json():
        output.write_json(found)
    else:
        rows = [(one["uplink"], one["port"], one["meanwhile"] or "none") for one in found]
        output.table(("down", "port", "carried by"), rows)
    lost = [f"{one['port']} without {one['uplink']}" for one in found if one["meanwhile"] is None]
    if lost:
        raise HostError(f"no uplink carried {', '.join(lost)}")


def _drilled(switch: Switch, uplink: Uplink, timeout: float) -> List[Dict[str, Any]]:
    """The ports that the uplink carried, and what carried them while it was down."""
    carried = [id_ for id_, carrier in switch.carriers().items() if carrier == uplink]
    with uplink.taken_down(timeout):
        meanwhile = switch.carriers()
    return [
        {"uplink": uplink.name, "port": id_, "meanwhile": _name(meanwhile.get(id_))}
        for id_ in carried
    ]


def _name(uplink: Optional[Uplink]) -> Optional[str]:
    return uplink.name if uplink is not None else None
