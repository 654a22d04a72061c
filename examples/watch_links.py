#!/usr/bin/env python3
"""Watch the links of a switch's uplinks: say what they are, then each change, until Ctrl-C.

The library announces no changes, so this asks for them again and again.
"""

import argparse
import os
import sys
import time
from typing import Dict, Iterator, Optional, Sequence

import libvswitch as vs

import private_host

UP, DOWN, GONE = "up", "down", "gone"


class HostError(Exception):
    """A call did not succeed; the text has the library's own words for its status."""


def check(call: str, status: int) -> None:
    if status != vs.QEX_OK:
        raise HostError(f"{call}: {vs.QEX_ReturnStatusToString(status)}")


def links(switch: str) -> Dict[str, str]:
    """Each uplink of the switch, and its link."""
    with vs.owned(vs.VSQEX_GetUplinks(switch)) as (status, uplinks):
        check(f"VSQEX_GetUplinks({switch!r})", status)
        names = list(uplinks)
    return {name: link(switch, name) for name in names}


def link(switch: str, uplink: str) -> str:
    status, state = vs.VSQEX_GetUplinkLinkState(switch, uplink)
    if status == vs.QEX_NOT_FOUND:
        return GONE  # since the list was made
    check(f"VSQEX_GetUplinkLinkState({switch!r}, {uplink!r})", status)
    return UP if state == vs.QEX_LINK_STATE_UP else DOWN


def changes(before: Dict[str, str], now: Dict[str, str]) -> Dict[str, str]:
    """What became of the uplinks whose links are not as they were, those that are gone included."""
    return {
        name: now.get(name, GONE)
        for name in sorted({*before, *now})
        if before.get(name, GONE) != now.get(name, GONE)
    }


def ticks(every: float, duration: Optional[float]) -> Iterator[None]:
    """Something to do each so many seconds, the last time when the duration is over."""
    end = None if duration is None else time.monotonic() + duration
    while end is None or time.monotonic() < end:
        left = every if end is None else end - time.monotonic()
        time.sleep(max(0, min(every, left)))
        yield


def watch(switch: str, every: float, duration: Optional[float]) -> None:
    before = links(switch)
    shown = ", ".join(f"{name} {state}" for name, state in before.items())
    print(f"{switch}: {shown or 'no uplinks'}", flush=True)
    for _ in ticks(every, duration):
        now = links(switch)
        for name, state in changes(before, now).items():
            print(f"{time.strftime('%H:%M:%S')} {name} {state}", flush=True)
        before = now


def name(text: str) -> str:
    """The libraries take UTF-8, and what is typed in a shell may be any bytes."""
    try:
        text.encode()
    except UnicodeEncodeError:
        raise argparse.ArgumentTypeError(f"{text!r} is no UTF-8") from None
    return text


def seconds(text: str) -> float:
    number = float(text)
    if not 0 <= number <= 1e9:
        raise argparse.ArgumentTypeError(f"{text} is no time to wait")
    return number


def main(arguments: Optional[Sequence[str]] = None) -> int:
    parser = argparse.ArgumentParser(
        description="Says which links of a switch are up, then each change of one, until Ctrl-C.",
        epilog="The status is 0, 1 if the host refuses a query or nothing can be written, 2 for a"
        " wrong command line.",
    )
    parser.add_argument("switch", type=name, help="alias of the switch")
    parser.add_argument(
        "--every",
        type=seconds,
        default=1,
        metavar="SECONDS",
        help="how often to look; %(default)s unless given",
    )
    parser.add_argument("--for", type=seconds, metavar="SECONDS", dest="duration", help="then end")
    options = parser.parse_args(arguments)
    private_host.tell("watch_links")
    try:
        watch(options.switch, options.every, options.duration)
    except KeyboardInterrupt:
        pass
    except (HostError, RuntimeError) as error:  # the last when a call traps
        print(f"watch_links: {error}", file=sys.stderr)
        return 1
    return 0


if __name__ == "__main__":
    try:
        try:
            sys.exit(main())
        finally:
            print(end="", flush=True)
    except OSError as error:  # a call traps, nobody reads to the end, or the disk is full
        os.dup2(os.open(os.devnull, os.O_WRONLY), sys.stdout.fileno())  # for what is left
        sys.exit(1 if isinstance(error, BrokenPipeError) else f"watch_links: {error}")
