"""Makes the list of the texts that headers of properties define, which are keys but for a few.

usage: make_property_constants.py OUTPUT FAMILY=HEADER...

One line per constant: PROPERTY_CONSTANT(family, name).
"""

import re
import sys

#: A macro that stands for something; guards of headers stand for nothing.
DEFINITION = re.compile(r"^#[ \t]*define[ \t]+(\w+)[ \t]+\S", re.MULTILINE)


def main() -> None:
    """Reads the headers and writes the list."""
    output_path, *headers = sys.argv[1:]
    with open(output_path, "w", encoding="utf-8") as output:
        for argument in headers:
            family, _, path = argument.partition("=")
            with open(path, encoding="utf-8") as header:
                for name in DEFINITION.findall(header.read()):
                    output.write(f"PROPERTY_CONSTANT({family}, {name})\n")


if __name__ == "__main__":
    main()
