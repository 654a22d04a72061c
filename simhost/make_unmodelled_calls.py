"""Makes a weak definition of every call that headers of the host declare.

usage: make_unmodelled_calls.py OUTPUT INCLUDE_FOLDER HEADER...

A library is loaded only if it has every call, so the calls that are not modelled need an answer
too.
A modelled call's own definition takes the place of the weak one when the library is linked: which
calls are modelled is written down nowhere but in their code, and in the library's symbol table.
"""

import os
import re
import sys
from typing import List, Tuple

DECLARATION = re.compile(r"^([a-zA-Z][\w \n]*?[ *])(\w+)\(([^(){};]*)\);", re.MULTILINE)


def declarations(header: str) -> List[Tuple[str, str, str]]:
    """The result, name and parameters of each function that a header declares."""
    code = re.sub(r"/\*.*?\*/|//[^\n]*|^#[^\n]*", "", header, flags=re.DOTALL | re.MULTILINE)
    return [
        (result.strip(), name, " ".join(parameters.split()))
        for result, name, parameters in DECLARATION.findall(code)
        if not result.startswith("typedef")
    ]


def definition(result: str, name: str, parameters: str) -> str:
    """A definition that another one replaces."""
    if result == "QEX_ReturnStatus":
        body = "  return simhost::stateless(__func__, [](Call &) { simhost::refuse_unmodelled(); });\n"
    else:
        body = "  simhost::stateless_or_trap(__func__, [](Call &) { simhost::give_up_unmodelled(); });\n"
        if result != "void":
            body += "  return {};\n"
    return f"__attribute__((weak)) {result} {name}({parameters}) {{\n{body}}}\n"


def main() -> None:
    """Reads the headers and writes the definitions."""
    output_path, include_folder, *headers = sys.argv[1:]
    functions = []
    for header in headers:
        with open(os.path.join(include_folder, header), encoding="utf-8") as file:
            functions += declarations(file.read())
    with open(output_path, "w", encoding="utf-8") as output:
        for header in headers:
            output.write(f'#include "{header}"\n')
        output.write('\n#include "abi/boundary.h"\n#include "abi/unmodelled.h"\n\n')
        output.write('using simhost::Call;\n\nextern "C" {\n')
        for function in functions:
            output.write("\n" + definition(*function))
        output.write('\n}  // extern "C"\n')


if __name__ == "__main__":
    main()
