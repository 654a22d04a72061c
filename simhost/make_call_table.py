"""Makes the table of the host's calls, and checks that each is exported where it is declared.

usage: make_call_table.py --json OUTPUT --markdown OUTPUT --nm PROGRAM --fixed FILE
                          --library LIBRARY HEADER... [--library ...]

A library is loaded only if it has every call, so the calls that its headers declare and the
functions that it exports are to be the same. FILE names the calls that model nothing, each with the
one status that it returns; every other call is modelled.
"""

import argparse
import json
import os
import re
import subprocess
from typing import Dict, List, Set

from make_call_names import calls_in

# The families in the order in which tables have them.
FAMILIES = ["VSDVS_", "VSQEX_", "DVS_", "DVSData_", "DVSState_", "DVSQEX_"]

Row = Dict[str, str]


def exported(program: str, library: str) -> Set[str]:
    """The functions that a library exports."""
    lines = subprocess.run(
        [program, "-D", "--defined-only", library], check=True, stdout=subprocess.PIPE, text=True
    ).stdout
    return set(re.findall(r" T (\w+)$", lines, re.MULTILINE))


def declared(headers: List[str]) -> Set[str]:
    return {call.name for header in headers for call in calls_in(header)}


def require_same(library: str, calls: Set[str], functions: Set[str]) -> None:
    """Ends the program unless a library exports what its headers declare."""
    name = os.path.basename(library)
    if calls - functions:
        raise SystemExit(f"{name} does not export {', '.join(sorted(calls - functions))}")
    if functions - calls:
        raise SystemExit(
            f"{name} exports {', '.join(sorted(functions - calls))}, which no header declares"
        )


def family(name: str) -> str:
    return next((prefix + "*" for prefix in FAMILIES if name.startswith(prefix)), "names and texts")


def row(name: str, library: str, fixed: Dict[str, str]) -> Row:
    entry = {"call": name, "family": family(name), "library": os.path.basename(library)}
    if name in fixed:
        return {**entry, "answer": "fixed", "status": fixed[name]}
    return {**entry, "answer": "modelled"}


def markdown(rows: List[Row]) -> str:
    lines = ["| Call | Library | Answer |", "|---|---|---|"]
    for entry in rows:
        told = entry["answer"] + (f": `{entry['status']}`" if "status" in entry else "")
        lines.append(f"| `{entry['call']}` | {entry['library']} | {told} |")
    return "\n".join(lines) + "\n"


def parsed() -> argparse.Namespace:
    parser = argparse.ArgumentParser()
    parser.add_argument("--json", required=True)
    parser.add_argument("--markdown", required=True)
    parser.add_argument("--nm", required=True)
    parser.add_argument("--fixed", required=True)
    parser.add_argument("--library", required=True, nargs="+", action="append")
    return parser.parse_args()


def main() -> None:
    """Checks the libraries and writes the table twice."""
    given = parsed()
    with open(given.fixed, encoding="utf-8") as file:
        fixed: Dict[str, str] = json.load(file)
    rows: List[Row] = []
    for library, *headers in given.library:
        calls = declared(headers)
        require_same(library, calls, exported(given.nm, library))
        rows += [row(name, library, fixed) for name in calls]
    unknown = set(fixed) - {entry["call"] for entry in rows}
    if unknown:
        raise SystemExit(f"{given.fixed}: no header declares {', '.join(sorted(unknown))}")
    rows.sort(
        key=lambda entry: (entry["library"] != "libvswitch.so", entry["family"], entry["call"])
    )
    with open(given.json, "w", encoding="utf-8") as output:
        json.dump(rows, output, indent=2)
        output.write("\n")
    with open(given.markdown, "w", encoding="utf-8") as output:
        output.write(markdown(rows))


if __name__ == "__main__":
    main()
