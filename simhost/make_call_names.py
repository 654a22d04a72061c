"""Makes the list of the host's calls from the headers that declare them.

usage: make_call_names.py OUTPUT HEADER...

One line per call: CALL(name, whether it answers a status).
"""

import sys

from make_unmodelled_calls import declarations


def main() -> None:
    """Reads the headers and writes the list."""
    output_path, *headers = sys.argv[1:]
    with open(output_path, "w", encoding="utf-8") as output:
        for path in headers:
            with open(path, encoding="utf-8") as header:
                for result, name, _ in declarations(header.read()):
                    answers_status = str(result == "QEX_ReturnStatus").lower()
                    output.write(f"CALL({name}, {answers_status})\n")


if __name__ == "__main__":
    main()
