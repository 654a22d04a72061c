#!/usr/bin/env python3
"""Make the host what a document says, all of it or nothing."""

import argparse
import json

import vswitch

import private_host


def main() -> None:
    parser = argparse.ArgumentParser(description=__doc__)
    parser.add_argument("document", help="JSON file; what it does not name stays as it is")
    parser.add_argument("--dry-run", action="store_true", help="only say what would change")
    options = parser.parse_args()
    private_host.tell("apply")
    with open(options.document, encoding="utf-8") as file:
        try:
            document = json.load(file)
        except ValueError as error:
            raise vswitch.DocumentError(options.document, str(error)) from None
    plan = vswitch.Host().plan(document)
    for change in plan.changes if options.dry_run else plan.apply():
        print(change)


if __name__ == "__main__":
    with vswitch.exits("apply"):
        main()
