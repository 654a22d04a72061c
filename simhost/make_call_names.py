"""Makes the list of the host's calls from the headers that declare them.

usage: make_call_names.py OUTPUT HEADER...

One line per call: CALL(name, whether it returns a status).
"""

import re
import sys
from typing import List, NamedTuple

DECLARATION = re.compile(r"^([a-zA-Z][\w \n]*?[ *])(\w+)\(([^(){};]*)\);", re.MULTILINE)


class Call(NamedTuple):
    """A call as a header of the host declares it."""

    name: str
    result: str
    parameters: str


def declared_calls(header: str) -> List[Call]:
    """The calls that the text of a header declares."""
    code = re.sub(r"/\*.*?\*/|//[^\n]*|^#[^\n]*", "", header, flags=re.DOTALL | re.MULTILINE)
    return [
        Call(name, result.strip(), " ".join(parameters.split()))
        for result, name, parameters in DECLARATION.findall(code)
        if not result.startswith("typedef")
    ]


def calls_in(path: str) -> List[Call]:
    """The calls that a header declares."""
    with open(path, encoding="utf-8") as header:
        return declared_calls(header.read())


def main() -> None:
    """Reads the headers and writes the list."""
    output_path, *headers = sys.argv[1:]
    with open(output_path, "w", encoding="utf-8") as output:
        for path in headers:
            for call in calls_in(path):
                returns_status = str(call.result == "QEX_ReturnStatus").lower()
                output.write(f"CALL({call.name}, {returns_status})\n")


if __name__ == "__main__":
    main()
