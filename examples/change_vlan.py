#!/usr/bin/env python3
"""Change the VLANs of a port safely: read them back, and undo the change if it did not arrive.

A port without its network is a machine that nobody reaches any more. So the policy that the port
had is kept until the new one has been read back.
"""

import argparse
import dataclasses
import os
import sys
from typing import Optional, Sequence, Tuple

import libvswitch as vs

import private_host

NO_PRIORITY = -1


class HostError(Exception):
    """A call did not succeed; the text has the library's own words for its status."""


class NotChanged(Exception):
    """The port has the policy that it had."""


class NotRestored(Exception):
    """The port may have neither the policy that it had nor the one that it was to get."""


# The last two are what a call raises that traps.
FAILURES = (HostError, RuntimeError, OSError)


def check(call: str, status: int) -> None:
    if status != vs.QEX_OK:
        raise HostError(f"{call}: {vs.QEX_ReturnStatusToString(status)}")


@dataclasses.dataclass(frozen=True)
class VlanPolicy:
    """The VLANs of a port, and the priority of its frames."""

    vlan: int
    ranges: Tuple[Tuple[int, int], ...] = ()
    guest_tagging: bool = False
    private: bool = False
    priority: int = NO_PRIORITY

    def __str__(self) -> str:
        parts = [f"{'private ' if self.private else ''}VLAN {self.vlan}"]
        if self.guest_tagging:
            shown = (f"{low}-{high}" if low < high else f"{low}" for low, high in self.ranges)
            parts.append(f"trunk {','.join(shown) or 'of none'}")
        if self.priority != NO_PRIORITY:
            parts.append(f"priority {self.priority}")
        return ", ".join(parts)


def read(switch: str, port: str) -> VlanPolicy:
    with vs.owned(vs.VSDVS_GetPortVLANPolicy(switch, port)) as (status, policy, priority):
        check(f"VSDVS_GetPortVLANPolicy({switch!r}, {port!r})", status)
        return VlanPolicy(
            vlan=policy.vlanID,
            ranges=tuple((one.minVID, one.maxVID) for one in policy.vidRanges),
            guest_tagging=bool(policy.flags & vs.VSPORT_VLAN_GUEST_TAGGING),
            private=bool(policy.flags & vs.VSPORT_VLAN_PVLAN_ENABLED),
            priority=priority,
        )


def write(switch: str, port: str, policy: VlanPolicy) -> None:
    count = len(policy.ranges)
    ranges = vs.new_vidrangeArray(count) if count else None
    for one, (low, high) in zip(ranges or (), policy.ranges):
        one.minVID, one.maxVID = low, high
    status = vs.VSDVS_SetPortVLANPolicy(
        switch,
        port,
        policy.vlan,
        policy.priority,
        policy.guest_tagging,
        policy.private,
        ranges,
        count,
    )
    check(f"VSDVS_SetPortVLANPolicy({switch!r}, {port!r})", status)


def change(switch: str, port: str, before: VlanPolicy, wanted: VlanPolicy) -> None:
    """Gives the port the policy; if that does not arrive, the port keeps the one that it had."""
    try:
        write(switch, port, wanted)
        found = read(switch, port)
        if found != wanted:
            raise HostError(f"the port has {found}, not {wanted}")
    except (*FAILURES, KeyboardInterrupt) as error:
        why = str(error) or "interrupted"
        restore(switch, port, before, why)
        raise NotChanged(f"{why}; the port has {before} as before") from error


def restore(switch: str, port: str, before: VlanPolicy, why: str) -> None:
    try:
        write(switch, port, before)
        found = read(switch, port)
    except FAILURES as error:
        raise NotRestored(f"{why}; then the port was to get {before} back: {error}") from error
    if found != before:
        raise NotRestored(f"{why}; then the port was to get {before} back and has {found}")


def name(text: str) -> str:
    """The libraries take UTF-8, and what is typed in a shell may be any bytes."""
    try:
        text.encode()
    except UnicodeEncodeError:
        raise argparse.ArgumentTypeError(f"{text!r} is no UTF-8") from None
    return text


def vlan(text: str) -> int:
    number = int(text)
    if not 0 <= number <= 4094:
        raise argparse.ArgumentTypeError(f"{number} is not within 0 to 4094")
    return number


def vlan_ranges(text: str) -> Tuple[Tuple[int, int], ...]:
    """`10-12,20` as pairs of numbers."""
    pairs = []
    for part in text.split(","):
        low, _, high = part.partition("-")
        pairs.append((vlan(low), vlan(high or low)))
    return tuple(pairs)


def parse(arguments: Optional[Sequence[str]]) -> argparse.Namespace:
    parser = argparse.ArgumentParser(
        description="Changes the VLANs of a port and reads them back; if they are not what they"
        " were to be, the port gets back those that it had.",
        epilog="The status is 0, 1 if the port has the VLANs that it had, 2 for a wrong command"
        " line, 3 if somebody has to look at the port, 4 if what was done cannot be written.",
    )
    parser.add_argument("switch", type=name, help="alias of the switch")
    parser.add_argument("port", type=name, help="identifier of the port")
    parser.add_argument("vlan", type=vlan, help="VLAN of untagged frames; 0 is none")
    parser.add_argument(
        "--trunk",
        type=vlan_ranges,
        metavar="RANGES",
        help="the client tags frames itself, with these VLANs, such as 10-12,20",
    )
    parser.add_argument("--dry-run", action="store_true", help="only say what would be done")
    return parser.parse_args(arguments)


def main(arguments: Optional[Sequence[str]] = None) -> int:
    options = parse(arguments)
    private_host.tell("change_vlan")
    switch, port = options.switch, options.port
    try:
        before = read(switch, port)
        wanted = VlanPolicy(
            vlan=options.vlan,
            ranges=options.trunk or (),
            guest_tagging=options.trunk is not None,
            priority=before.priority,
        )
        if not options.dry_run:
            change(switch, port, before, wanted)
    except (*FAILURES, NotChanged, NotRestored) as error:
        print(f"change_vlan: {error}", file=sys.stderr)
        return 3 if isinstance(error, NotRestored) else 1
    print(f"{port} of {switch}: {before} {'would become' if options.dry_run else '->'} {wanted}")
    return 0


if __name__ == "__main__":
    try:
        try:
            sys.exit(main())
        finally:
            print(end="", flush=True)
    except OSError as error:  # nobody reads to the end, as in | head, or the disk is full
        os.dup2(os.open(os.devnull, os.O_WRONLY), sys.stdout.fileno())  # for what is left
        if not isinstance(error, BrokenPipeError):
            print(f"change_vlan: {error}", file=sys.stderr)
        sys.exit(4)
