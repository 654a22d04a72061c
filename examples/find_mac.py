#!/usr/bin/env python3
"""Where a MAC address is: at which port of which switch, or beyond the uplinks of one."""

import argparse

import vswitch

import private_host


def main() -> None:
    parser = argparse.ArgumentParser(description=__doc__)
    parser.add_argument("mac", help="in any spelling, such as 0200.0000.0102")
    options = parser.parse_args()
    private_host.tell("find_mac")
    found = vswitch.Host().find_mac(options.mac)
    if not found:
        raise vswitch.NotFound(f"no switch knows {options.mac}")
    for entry in found:
        where = f"at {entry.port}" if entry.port else "beyond the uplinks"
        print(f"{entry.switch}: {where}, VLAN {entry.vlan}, {entry.type}")


if __name__ == "__main__":
    with vswitch.exits("find_mac"):
        main()
