"""Makes the table of the host's calls: which are modelled, and which answer a fixed status.

usage: make_call_table.py OUTPUT_JSON OUTPUT_MARKDOWN NM FIXED_ANSWERS LIBRARY...

A call is what a library exports. One that only the generated definition answers is a weak symbol:
it is not modelled, and answers QEX_NOT_IMPLEMENTED or gives up. One that FIXED_ANSWERS, a source
file, defines answers the status that it refuses with. Every other call is modelled.
"""

import json
import os
import re
import subprocess
import sys
from typing import Dict, List

FIXED = re.compile(r"QEX_ReturnStatus (\w+)\([^{]*\{(.*?)^\}", re.DOTALL | re.MULTILINE)
STATUS = re.compile(r"simhost::refuse\((QEX_\w+)\);\s*\}\);\s*$")

# The families in the order in which tables have them.
FAMILIES = ["VSDVS_", "VSQEX_", "DVS_", "DVSData_", "DVSState_", "DVSQEX_"]


def fixed_answers(source: str) -> Dict[str, str]:
    """The one status of each call that a source file defines."""
    answers = {}
    for name, body in FIXED.findall(source):
        status = STATUS.search(body)
        if status is None:
            raise SystemExit(f"{name} does not end by refusing with a status")
        answers[name] = status.group(1)
    return answers


def exported(program: str, library: str) -> Dict[str, str]:
    """The functions that a library exports, each with the letter of its kind."""
    lines = subprocess.run(
        [program, "-D", "--defined-only", library], check=True, stdout=subprocess.PIPE, text=True
    ).stdout
    return {name: kind for kind, name in re.findall(r" ([TW]) (\w+)$", lines, re.MULTILINE)}


def family(name: str) -> str:
    return next((prefix + "*" for prefix in FAMILIES if name.startswith(prefix)), "names and texts")


def row(name: str, kind: str, library: str, fixed: Dict[str, str]) -> Dict[str, str]:
    entry = {"call": name, "family": family(name), "library": os.path.basename(library)}
    if kind == "W":
        return {**entry, "answer": "not modelled"}
    if name in fixed:
        return {**entry, "answer": "fixed", "status": fixed[name]}
    return {**entry, "answer": "modelled"}


def markdown(rows: List[Dict[str, str]]) -> str:
    lines = ["| Call | Library | Answer |", "|---|---|---|"]
    for entry in rows:
        answer = entry["answer"] + (f": `{entry['status']}`" if "status" in entry else "")
        lines.append(f"| `{entry['call']}` | {entry['library']} | {answer} |")
    return "\n".join(lines) + "\n"


def main() -> None:
    """Reads the symbols and writes the table twice."""
    json_path, markdown_path, program, source_path, *libraries = sys.argv[1:]
    with open(source_path, encoding="utf-8") as source:
        fixed = fixed_answers(source.read())
    rows = [
        row(name, kind, library, fixed)
        for library in libraries
        for name, kind in exported(program, library).items()
    ]
    rows.sort(
        key=lambda entry: (entry["library"] != "libvswitch.so", entry["family"], entry["call"])
    )
    unknown = set(fixed) - {entry["call"] for entry in rows}
    if unknown:
        raise SystemExit(f"no library exports {', '.join(sorted(unknown))}")
    with open(json_path, "w", encoding="utf-8") as output:
        json.dump(rows, output, indent=2)
        output.write("\n")
    with open(markdown_path, "w", encoding="utf-8") as output:
        output.write(markdown(rows))


if __name__ == "__main__":
    main()
