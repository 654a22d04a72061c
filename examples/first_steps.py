#!/usr/bin/env python3
"""First steps with a virtual switch: create one, configure it, ask the running switch about it.

Runs on any host; without a real one, it is the simulated host. Prints what it does. However it
ends, the switch does not stay behind.
"""

import argparse
import os
import sys

import _libvswitch as vs

import private_host

SWITCH = "demo-switch"


def status_text(status: int) -> str:
    """The library's own words for a status."""
    return str(vs.QEX_ReturnStatusToString(status))


def show(call: str, status: int) -> None:
    print(f"{call:<58} {status_text(status)}")


def create_switch() -> int:
    # Alias; identifier and portset name, which the host chooses; ports, persistence, version, MTU;
    # and how many of the host's uplinks to attach.
    return int(vs.VSDVS_CreateVSwitch(SWITCH, None, None, 64, 1, 0, 0, 2))


def set_mtu(mtu: int) -> None:
    show(f"VSDVS_SetMTU({SWITCH!r}, {mtu})", vs.VSDVS_SetMTU(SWITCH, mtu))


def read_back() -> None:
    """The caller makes the record, the query fills it, the caller deletes it."""
    info = vs.new_VSInfo()
    show(f"VSQEX_GetVSInfo({SWITCH!r}, info)", vs.VSQEX_GetVSInfo(SWITCH, info))
    print(f"    MTU {vs.VSInfo_mtu_get(info)}, at most {vs.VSInfo_maxPorts_get(info)} ports")
    vs.delete_VSInfo(info)


def list_uplinks() -> None:
    """The library makes this record; it is released to the library, and only once."""
    status, uplinks = vs.VSQEX_GetUplinks(SWITCH)
    show(f"VSQEX_GetUplinks({SWITCH!r})", status)
    names = [vs.VSUplinks___getitem__(uplinks, i) for i in range(vs.VSUplinks___len__(uplinks))]
    print(f"    {', '.join(names)}")

    vs.VSQEX_FreeMemory(uplinks)
    print("VSQEX_FreeMemory(uplinks), twice by mistake:")
    try:
        vs.VSQEX_FreeMemory(uplinks)
    except RuntimeError as error:
        print(f"    {type(error).__name__}: {error}")


def main() -> None:
    argparse.ArgumentParser(
        description="Creates a virtual switch, configures it, asks about it and removes it again."
    ).parse_args()
    private_host.tell("first_steps")
    status = create_switch()
    if status != vs.QEX_OK:  # a switch of that name would be somebody else's
        sys.exit(f"first_steps: no switch {SWITCH!r} could be made: {status_text(status)}")
    try:
        show(f"VSDVS_CreateVSwitch({SWITCH!r}, ...)", status)
        set_mtu(9000)
        read_back()
        set_mtu(1)
        list_uplinks()
    finally:
        show(f"VSDVS_DestroyVSwitch({SWITCH!r})", vs.VSDVS_DestroyVSwitch(SWITCH))
    show(f"VSDVS_DestroyVSwitch({SWITCH!r}) once more", vs.VSDVS_DestroyVSwitch(SWITCH))


if __name__ == "__main__":
    try:
        try:
            main()
        finally:
            print(end="", flush=True)
    except OSError as error:  # nobody reads to the end, as in | head, or the disk is full
        os.dup2(os.open(os.devnull, os.O_WRONLY), sys.stdout.fileno())  # for what is left
        sys.exit(1 if isinstance(error, BrokenPipeError) else f"first_steps: {error}")
