#!/usr/bin/env python3
"""Records that a tool builds itself: a mirror session table, runtime options, a packet header.

Needs no switch: everything here happens in the tool's own memory. Prints what it builds.
"""

import argparse
import ctypes
import os
import sys
from typing import Any, Dict, Iterator, Tuple, Union

import _libvswitch as vs


def heading(text: str) -> None:
    print(f"\n{text}\n{'-' * len(text)}")


# A mirror session table is one block: the sessions, then the entities of all sessions.


def set_entity(entity: Any, kind: int, text: str) -> Any:
    """Fills an entity and returns the next one; the kind must be set before the text."""
    vs.DVMirrorEntity_type_set(entity, kind)
    vs.DVMirrorEntity_set_entity(entity, text)
    return vs.DVMirrorEntity_next(entity)


def build_mirror_table() -> Any:
    """One session that mirrors what two ports receive to an address."""
    table = vs.alloc_dvmirror_session_table(1, 3)
    vs.DVMirrorSessionTable_version_set(table, vs.VS_DVMIRROR_VERSION_V3)

    session = vs.DVMirrorSessionTable___getitem__(table, 0)
    vs.DVMirrorSession_sid_set(session, "audit-1")
    vs.DVMirrorSession_dname_set(session, "audit of the web ports")
    vs.DVMirrorSession_type_set(session, vs.VS_DVMIRROR_SESSIONTYPE_ERMIRROR_SRC)
    vs.DVMirrorSession_snapLen_set(session, 128)
    vs.DVMirrorSession_numDstEntities_set(session, 1)
    vs.DVMirrorSession_numSrcInEntities_set(session, 2)
    vs.DVMirrorSession_startIdx_set(session, 0)

    entity = vs.DVMirrorSessionTable_get_first_session_entity(table, 0)
    entity = set_entity(entity, vs.MIRROR_ENTTYPE_IP, "192.0.2.17")
    entity = set_entity(entity, vs.MIRROR_ENTTYPE_DVPORT, "web-1")
    set_entity(entity, vs.MIRROR_ENTTYPE_DVPORT, "web-2")
    return table


def entities(table: Any, session: Any) -> Iterator[Tuple[str, str]]:
    """What a session mirrors from and to, in its order: destinations, received, sent."""
    start = vs.DVMirrorSession_startIdx_get(session)
    entity = vs.DVMirrorSessionTable_get_first_session_entity(table, start)
    for role, count in (
        ("to", vs.DVMirrorSession_numDstEntities_get(session)),
        ("received by", vs.DVMirrorSession_numSrcInEntities_get(session)),
        ("sent by", vs.DVMirrorSession_numSrcOutEntities_get(session)),
    ):
        for _ in range(count):
            yield role, vs.DVMirrorEntity_get_entity(entity)
            entity = vs.DVMirrorEntity_next(entity)


def show_mirror_table() -> None:
    heading("A mirror session table")
    table = build_mirror_table()
    for index in range(vs.DVMirrorSessionTable_numSessions_get(table)):
        session = vs.DVMirrorSessionTable___getitem__(table, index)
        name = vs.DVMirrorSession_dname_get(session)
        length = vs.DVMirrorSession_snapLen_get(session)
        print(f"{vs.DVMirrorSession_sid_get(session)}: {name}, {length} bytes of each frame")
        for role, what in entities(table, session):
            print(f"    {role:<12} {what}")
    vs.free_dvmirror_session_table(table)


# A runtime options list is a length and the trailing options, one after the other.

OPTIONS: Dict[str, Union[int, str]] = {
    "MaxRARPsPerInterval": 20,
    "AllowFastPath": 1,
    "IGMPRouterIP": "192.0.2.1",
}


def build_options() -> Any:
    """Writes each option where the one before it ended."""
    options = vs.new_VSRuntimeOptions(64)
    first = vs.VSRuntimeOptions_get_first_option(options)
    at: Any = first
    for name, value in OPTIONS.items():
        kind = vs.get_runtime_option_type_from_name(name)
        if isinstance(value, int):
            at = vs.VSRuntimeOptions_add_int_option(options, at, name, kind, value)
        else:
            at = vs.VSRuntimeOptions_add_str_option(options, at, name, kind, value)
        if at is None:
            raise ValueError(f"no room for {name}")
    vs.VSRuntimeOptions_set_options_length(options, int(at) - int(first))
    return options


def show_options() -> None:
    heading("A runtime options list")
    options = build_options()
    print(f"{vs.VSRuntimeOptions_totalLength_get(options)} bytes")
    option: Any = vs.VSRuntimeOptions_get_first_option(options)
    while option is not None:
        name = vs.VSRuntimeOptionHeader_get_option_name(option)
        value = vs.VSRuntimeOptionHeader_get_option_value(option)
        print(f"    {name:<20} {value!r}")
        option = vs.VSRuntimeOptions_get_next_option(options, option)
    vs.delete_VSRuntimeOptions(options)


# A header holds the bytes that are stored in it; nothing is swapped.


def show_vxlan_header() -> None:
    heading("A VXLAN header, byte by byte")
    header = vs.new_qex_VXLANHdr()

    def show(what: str) -> None:
        print(f"    {what:<22} {ctypes.string_at(int(header), 8).hex(' ')}")

    show("fresh")
    vs.qex_VXLANHdr_instanceID_set(header, 1)
    show("instanceID = 1")
    vs.qex_VXLANHdr_vxlanID_set(header, 0x123456)
    show("vxlanID = 0x123456")
    vs.qex_VXLANHdr_reserved2_set(header, 0xFF)
    show("reserved2 = 0xff")
    vs.qex_VXLANHdr_vxlanID_set(header, 0x1000000)
    show("vxlanID = 0x1000000")
    vs.delete_qex_VXLANHdr(header)


def main() -> None:
    argparse.ArgumentParser(
        description="Builds records in its own memory and prints them; touches no switch."
    ).parse_args()
    show_mirror_table()
    show_options()
    show_vxlan_header()


if __name__ == "__main__":
    try:
        try:
            main()
        finally:
            print(end="", flush=True)
    except OSError as error:  # nobody reads to the end, as in | head, or the disk is full
        os.dup2(os.open(os.devnull, os.O_WRONLY), sys.stdout.fileno())  # for what is left
        sys.exit(1 if isinstance(error, BrokenPipeError) else f"records: {error}")
