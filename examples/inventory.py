#!/usr/bin/env python3
"""Which switches this host has: their ports, their uplinks and the links of those.

As a table for people, or as JSON for programs. Changes nothing.
"""

import argparse
import dataclasses
import json
import os
import sys
from typing import Any, List, Optional, Sequence, Tuple

import libvswitch as vs

import private_host


class HostError(Exception):
    """A call did not succeed; the text has the library's own words for its status."""


def check(call: str, status: int) -> None:
    if status != vs.QEX_OK:
        raise HostError(f"{call}: {vs.QEX_ReturnStatusToString(status)}")


@dataclasses.dataclass(frozen=True)
class Uplink:
    name: str
    link: str


@dataclasses.dataclass(frozen=True)
class Switch:
    alias: str
    identifier: str
    mtu: int
    max_ports: int
    ports: List[str]
    running: bool
    uplinks: List[Uplink]


def names_of_switches() -> List[Tuple[str, str]]:
    """Alias and identifier of each switch, in the order of the aliases."""
    found: List[Tuple[str, str]] = []

    def visit(switch: Any, _: Any) -> None:
        found.append((vs.DVS_SwitchName(switch) or "", vs.DVS_SwitchId(switch) or ""))

    vs.DVSState_SwitchForEach(visit, None)
    return sorted(found)


def mtu_of(alias: str) -> int:
    mtu = vs.Cell("qex_uint32")
    check(f"VSDVS_GetMTU({alias!r})", vs.VSDVS_GetMTU(alias, mtu.pointer))
    return int(mtu.value)


def ports_of(alias: str) -> List[str]:
    """The identifiers of the ports for clients: all but the uplinks'."""
    with vs.owned(vs.VSDVS_GetSwitchUplinkPorts(alias)) as (status, _, identifiers):
        check(f"VSDVS_GetSwitchUplinkPorts({alias!r})", status)
        uplink_ports = set(identifiers)
    found: List[str] = []
    vs.DVSState_PortForEach(
        vs.DVSState_SwitchFindByAlias(alias),
        lambda port, _: found.append(vs.DVS_PortId(port) or ""),
        None,
    )
    return sorted(set(found) - uplink_ports)


def is_running(alias: str) -> bool:
    """Whether the queries know the switch; one that is only configured they do not."""
    status = vs.VSQEX_GetVSInfo(alias, vs.VSInfo())
    if status != vs.QEX_NOT_FOUND:
        check(f"VSQEX_GetVSInfo({alias!r})", status)
    return status == vs.QEX_OK


def uplinks_of(alias: str) -> List[Uplink]:
    with vs.owned(vs.VSQEX_GetUplinks(alias)) as (status, uplinks):
        check(f"VSQEX_GetUplinks({alias!r})", status)
        names = list(uplinks)
    return [Uplink(name, link_of(alias, name)) for name in names]


def link_of(alias: str, uplink: str) -> str:
    status, state = vs.VSQEX_GetUplinkLinkState(alias, uplink)
    check(f"VSQEX_GetUplinkLinkState({alias!r}, {uplink!r})", status)
    return "up" if state == vs.QEX_LINK_STATE_UP else "down"


def examine(alias: str, identifier: str) -> Switch:
    running = is_running(alias)
    return Switch(
        alias=alias,
        identifier=identifier,
        mtu=mtu_of(alias),
        max_ports=vs.DVS_GetMaxPorts(vs.DVSState_SwitchFindByAlias(alias)),
        ports=ports_of(alias),
        running=running,
        uplinks=uplinks_of(alias) if running else [],
    )


def table(switches: Sequence[Switch]) -> str:
    """A line for each switch; each column as wide as its widest cell."""
    rows = [("SWITCH", "MTU", "PORTS", "UPLINKS")]
    for switch in switches:
        uplinks = ", ".join(f"{uplink.name} {uplink.link}" for uplink in switch.uplinks)
        rows.append(
            (
                switch.alias,
                str(switch.mtu),
                f"{len(switch.ports)} of {switch.max_ports}",
                (uplinks or "none") if switch.running else "does not run",
            )
        )
    widths = [max(map(len, column)) for column in zip(*rows)]
    lines = ("  ".join(cell.ljust(width) for cell, width in zip(row, widths)) for row in rows)
    return "\n".join(line.rstrip() for line in lines)


def name(text: str) -> str:
    """The libraries take UTF-8, and what is typed in a shell may be any bytes."""
    try:
        text.encode()
    except UnicodeEncodeError:
        raise argparse.ArgumentTypeError(f"{text!r} is no UTF-8") from None
    return text


def main(arguments: Optional[Sequence[str]] = None) -> int:
    parser = argparse.ArgumentParser(
        description="Lists the switches of this host, their ports, uplinks and links.",
        epilog="The status is 0, 1 if the host refuses a query or nothing can be written, 2 for a"
        " wrong command line.",
    )
    parser.add_argument(
        "switch", nargs="*", type=name, help="alias of a switch; all of them unless given"
    )
    parser.add_argument("--json", action="store_true", help="write JSON instead of a table")
    options = parser.parse_args(arguments)
    private_host.tell("inventory")
    try:
        known = names_of_switches()
        for alias in set(options.switch) - {alias for alias, _ in known}:
            raise HostError(f"there is no switch {alias!r}")
        wanted = [names for names in known if not options.switch or names[0] in options.switch]
        switches = [examine(*names) for names in wanted]
    except (HostError, RuntimeError, OSError) as error:  # the last two when a call traps
        print(f"inventory: {error}", file=sys.stderr)
        return 1
    if options.json:
        print(json.dumps([dataclasses.asdict(switch) for switch in switches], indent=2))
    else:
        print(table(switches))
    return 0


if __name__ == "__main__":
    try:
        try:
            sys.exit(main())
        finally:
            print(end="", flush=True)
    except OSError as error:  # nobody reads to the end, as in | head, or the disk is full
        os.dup2(os.open(os.devnull, os.O_WRONLY), sys.stdout.fileno())  # for what is left
        sys.exit(1 if isinstance(error, BrokenPipeError) else f"inventory: {error}")
