"""How people call switches and ports on a command line: SWITCH, or SWITCH/PORT."""

from typing import Container, Optional, Tuple, Union

import click

from vswitch.host import Host
from vswitch.port import Port, UplinkPort
from vswitch.switch import Switch

__all__ = ["find", "find_port", "split", "split_by"]


def split(host: Host, place: str) -> Tuple[str, Optional[str]]:
    """The alias of a switch and the port that follows it, None for the switch itself.

    An alias may have a slash in it: the longest one that the host has counts. After a slash there
    is a port: a script that has no name for it does not mean the whole switch.
    """
    return split_by(host.switches, place)


def split_by(aliases: Container[str], place: str) -> Tuple[str, Optional[str]]:
    """Likewise, by the aliases that there are."""
    parts = place.split("/")
    there = (end for end in range(len(parts), 0, -1) if "/".join(parts[:end]) in aliases)
    end = next(there, 1)
    return "/".join(parts[:end]), "/".join(parts[end:]) if end < len(parts) else None


def find(host: Host, place: str) -> Union[Switch, Port, UplinkPort]:
    """The switch or the port of that name."""
    alias, id_ = split(host, place)
    switch = host.switches[alias]
    if id_ is None:
        return switch
    if id_ in switch.uplink_ports:
        return switch.uplink_ports[id_]
    return switch.ports[id_]


def find_port(host: Host, place: str) -> Port:
    """The port for a client of that name."""
    alias, id_ = split(host, place)
    if id_ is None:
        raise click.UsageError(f"{place!r} is no port: SWITCH/PORT is expected")
    return host.switches[alias].ports[id_]
