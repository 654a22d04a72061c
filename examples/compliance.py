#!/usr/bin/env python3
"""Which settings break the rules of the house; with --fix, all of them are mended, or none."""

import argparse
import sys

import vswitch

import private_host


def main() -> None:
    parser = argparse.ArgumentParser(description=__doc__)
    parser.add_argument("--mtu", type=int, default=1500, help="of each switch; %(default)s")
    forbids = "mac_changes,forged_transmits"
    parser.add_argument("--forbids", default=forbids, help="of each port; %(default)s")
    parser.add_argument("--fix", action="store_true", help="set all of it, or nothing")
    options = parser.parse_args()
    private_host.tell("compliance")
    host, rules = vswitch.Host(), []
    for switch in host.switches.values():
        ports = [{"id": port, "forbids": options.forbids} for port in switch.ports]
        rules.append({"alias": switch.alias, "mtu": options.mtu, "ports": ports})
    plan = host.plan({"switches": rules})
    changes = plan.apply() if options.fix else plan.changes
    print(*changes, sep="\n", end="\n" if changes else "")
    if changes and not options.fix:
        sys.exit(f"compliance: {len(changes)} settings break the rules")


if __name__ == "__main__":
    with vswitch.exits("compliance"):
        main()
