#!/usr/bin/env python3
"""Which switches this host has: their ports, their uplinks and the links of those."""

import argparse
import json

import vswitch

import private_host


def row(switch: vswitch.Switch) -> str:
    ports = f"{len(switch.ports)} of {switch.max_ports}"
    uplinks = "does not run"
    if switch.running:
        uplinks = ", ".join(f"{one} {one.link}" for one in switch.uplinks.values()) or "none"
    return f"{switch.alias:<12}{switch.mtu:<6}{ports:<12}{uplinks}"


def main() -> None:
    parser = argparse.ArgumentParser(description=__doc__)
    parser.add_argument("switch", nargs="*", help="alias of a switch; all of them unless given")
    parser.add_argument("--json", action="store_true", help="write JSON instead of a table")
    options = parser.parse_args()
    private_host.tell("inventory")
    switches = vswitch.Host().switches
    chosen = [switches[alias] for alias in options.switch or sorted(switches)]
    if options.json:
        print(json.dumps([switch.state() for switch in chosen], indent=2))
    else:
        print("SWITCH      MTU   PORTS       UPLINKS", *map(row, chosen), sep="\n")


if __name__ == "__main__":
    with vswitch.exits("inventory"):
        main()
