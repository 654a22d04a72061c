"""How people call switches and ports on a command line: SWITCH, or SWITCH/PORT."""

from typing import Tuple, Union

import click

from vswitch.host import Host
from vswitch.port import Port, UplinkPort
from vswitch.switch import Switch

__all__ = ["find", "find_port", "split"]


def split(host: Host, place: str) -> Tuple[str, str]:
    """The alias of a switch and what follows it, which is empty for the switch itself.

    An alias may have a slash in it: the longest one that the host has counts.
    """
    parts = place.split("/")
    for end in range(len(parts), 0, -1):
        alias = "/".join(parts[:end])
        if alias in host.switches:
            return alias, "/".join(parts[end:])
    return parts[0], "/".join(parts[1:])


def find(host: Host, place: str) -> Union[Switch, Port, UplinkPort]:
    """The switch or the port of that name."""
    alias, id_ = split(host, place)
    switch = host.switches[alias]
    if not id_:
        return switch
    if id_ in switch.uplink_ports:
        return switch.uplink_ports[id_]
    return switch.ports[id_]


def find_port(host: Host, place: str) -> Port:
    """The port for a client of that name."""
    alias, id_ = split(host, place)
    if not id_:
        raise click.UsageError(f"{place!r} is no port: SWITCH/PORT is expected")
    return host.switches[alias].ports[id_]
