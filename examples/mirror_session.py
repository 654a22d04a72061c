#!/usr/bin/env python3
"""A mirror session from start to end: start it, see it run, say what it counted, remove it.

What a port receives and sends goes to another port as well, for as long as somebody looks at it
there. However that ends, Ctrl-C included, the session does not stay behind.
"""

import argparse
import contextlib
import os
import signal
import sys
import time
from typing import Iterator, Optional, Sequence

import libvswitch as vs

import private_host


class HostError(Exception):
    """A call did not succeed; the text has the library's own words for its status."""


def check(call: str, status: int) -> None:
    if status != vs.QEX_OK:
        raise HostError(f"{call}: {vs.QEX_ReturnStatusToString(status)}")


def check_port(switch: str, port: str) -> None:
    """A session may name ports that do not exist yet; here that would be a mistake in typing."""
    identifier = vs.DVS_SwitchId(vs.DVSState_SwitchFindByAlias(switch))
    if identifier is None:
        raise HostError(f"there is no switch {switch!r}")
    if not vs.DVPortExist(identifier, port):
        raise HostError(f"{switch} has no port {port!r}")


def add(switch: str, port: str, to: str, session_id: str, length: int) -> None:
    """The table is ours: one session, whose entities follow each other in a fixed order."""
    with vs.owned(vs.alloc_dvmirror_session_table(1, 3)) as table:
        table.version = vs.VS_DVMIRROR_VERSION_V3
        session = table[0]
        session.sid, session.dname = session_id, f"{port} to {to}"
        session.type = vs.VS_DVMIRROR_SESSIONTYPE_DVPORT
        session.snapLen = length
        session.numDstEntities = session.numSrcInEntities = session.numSrcOutEntities = 1
        for number, name in enumerate((to, port, port)):  # the destination, received by, sent by
            entity = table.get_first_session_entity(number)
            entity.type = vs.MIRROR_ENTTYPE_DVPORT  # before the text, which it gives a meaning
            entity.set_entity(name)
        status = vs.VSDVS_AppendDVMirrorSessions(switch, port, table)
    check(f"VSDVS_AppendDVMirrorSessions({switch!r}, {port!r})", status)


def remove(switch: str, port: str, session_id: str) -> None:
    status = vs.VSDVS_RemoveDVMirrorSession(switch, port, session_id)
    check(f"VSDVS_RemoveDVMirrorSession({switch!r}, {port!r}, {session_id!r})", status)


def is_running(switch: str, session_id: str) -> bool:
    with vs.owned(vs.VSQEX_GetDVMirrorSessionIDs(switch)) as (status, running):
        check(f"VSQEX_GetDVMirrorSessionIDs({switch!r})", status)
        return session_id in running.entries


@contextlib.contextmanager
def mirroring(switch: str, port: str, to: str, session_id: str, length: int = 0) -> Iterator[None]:
    """Mirrors a port for the time of a block."""
    add(switch, port, to, session_id, length)
    try:
        if not is_running(switch, session_id):
            raise HostError(f"the session {session_id!r} does not run")
        yield
    finally:
        remove(switch, port, session_id)


def counted(switch: str, session_id: str) -> str:
    stats = vs.VSDVMirrorSessionStats()
    status = vs.VSQEX_GetDVMirrorSessionStats(switch, session_id, stats)
    check(f"VSQEX_GetDVMirrorSessionStats({switch!r}, {session_id!r})", status)
    return (
        f"{stats.mirroredPkts} packets mirrored, {stats.discardedPkts} discarded,"
        f" {stats.failedPkts} failed"
    )


def wait(duration: Optional[float]) -> None:
    """Until the time is over, or somebody presses Ctrl-C."""
    with contextlib.suppress(KeyboardInterrupt):
        while duration is None:
            time.sleep(3600)
        time.sleep(duration)


def seconds(text: str) -> float:
    number = float(text)
    if not 0 <= number <= 1e9:
        raise argparse.ArgumentTypeError(f"{text} is no time to wait")
    return number


def snap_length(text: str) -> int:
    number = int(text)
    if not 0 <= number < 2**16:
        raise argparse.ArgumentTypeError(f"no frame has {number} bytes")
    return number


def name(text: str) -> str:
    """The libraries take UTF-8, and what is typed in a shell may be any bytes."""
    try:
        text.encode()
    except UnicodeEncodeError:
        raise argparse.ArgumentTypeError(f"{text!r} is no UTF-8") from None
    return text


def identifier(text: str) -> str:
    if not 0 < len(name(text).encode()) < 32:
        raise argparse.ArgumentTypeError(f"{text!r} does not have 1 to 31 bytes")
    return text


def parse(arguments: Optional[Sequence[str]]) -> argparse.Namespace:
    parser = argparse.ArgumentParser(
        description="Mirrors what a port receives and sends to another port until Ctrl-C.",
        epilog="The status is 0, 1 if the host refuses something or nothing can be written, 2 for a"
        " wrong command line.",
    )
    parser.add_argument("switch", type=name, help="alias of the switch")
    parser.add_argument("port", type=name, help="identifier of the port to look at")
    parser.add_argument("to", type=name, help="identifier of the port that gets the copies")
    parser.add_argument(
        "--id",
        type=identifier,
        dest="session_id",
        default="mirror_session",
        help="identifier of the session, up to 31 bytes; %(default)s unless given",
    )
    parser.add_argument(
        "--snap-length",
        type=snap_length,
        default=0,
        metavar="BYTES",
        help="so much of each frame; 0, all of it, unless given",
    )
    parser.add_argument("--for", type=seconds, metavar="SECONDS", dest="duration", help="then end")
    return parser.parse_args(arguments)


def main(arguments: Optional[Sequence[str]] = None) -> int:
    options = parse(arguments)
    private_host.tell("mirror_session")
    # A manager of services ends programs with this; it is as good a reason to remove the session.
    signal.signal(signal.SIGTERM, signal.default_int_handler)
    switch, port, to, session_id = options.switch, options.port, options.to, options.session_id
    try:
        check_port(switch, port)
        check_port(switch, to)
        with mirroring(switch, port, to, session_id, options.snap_length):
            print(f"{session_id} mirrors {port} to {to}", flush=True)
            wait(options.duration)
            print(counted(switch, session_id))
        print(f"{session_id} is removed")
    except (HostError, RuntimeError) as error:  # the last when a call traps
        print(f"mirror_session: {error}", file=sys.stderr)
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
        sys.exit(1 if isinstance(error, BrokenPipeError) else f"mirror_session: {error}")
