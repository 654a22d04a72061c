"""Says what is loaded from where, and what is wrong: python3 -m libvswitch.doctor [--json]

The status is 0 if all is well, 1 if something has to be done or the report cannot be written, 2 for
a wrong command line.
"""

import argparse
import dataclasses
import json
import os
import sys
from typing import List, Optional

from libvswitch._examination import Report, examine


def show(report: Report) -> str:
    lines = []
    for finding in report.findings:
        lines.append(f"{finding.level:<8} {finding.about:<12} {finding.text}")
        if finding.advice:
            lines.append(f"{'':<21} -> {finding.advice}")
    lines.append("All is well." if report.is_well else "Something has to be done.")
    return "\n".join(lines)


def main(arguments: Optional[List[str]] = None) -> int:
    parser = argparse.ArgumentParser(
        prog="python3 -m libvswitch.doctor",
        description="Says which interpreter, module and host are loaded, and what is wrong.",
    )
    parser.add_argument("--json", action="store_true", help="write the report as JSON")
    as_json = parser.parse_args(arguments).json
    report = examine()
    if as_json:
        print(json.dumps({**dataclasses.asdict(report), "is_well": report.is_well}, indent=2))
    else:
        print(show(report))
    return 0 if report.is_well else 1


def _run() -> None:
    try:
        try:
            sys.exit(main())
        finally:
            print(end="", flush=True)
    except OSError as error:  # nobody reads to the end, as in | head, or the disk is full
        os.dup2(os.open(os.devnull, os.O_WRONLY), sys.stdout.fileno())  # for what is left
        sys.exit(1 if isinstance(error, BrokenPipeError) else f"doctor: {error}")


if __name__ == "__main__":
    _run()
