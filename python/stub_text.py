"""The text of stubs: functions, constants, and what documents them."""

import textwrap
from typing import Iterable, Mapping, Tuple

from definitions import Definitions


def doc(text: str, indent: str) -> str:
    """A documentation text, or nothing."""
    if not text:
        return ""
    text = text.replace("\\", "\\\\").replace('"""', "'''")
    lines = text.splitlines()
    if len(lines) == 1:
        return f'{indent}"""{lines[0]}"""\n'
    return textwrap.indent(f'"""{lines[0]}\n' + "\n".join(lines[1:]) + '\n"""', indent) + "\n"


def function(
    name: str,
    arguments: Iterable[Tuple[str, str]],
    result: str,
    text: str = "",
    indent: str = "",
    hidden: bool = False,
) -> str:
    """A function; with `hidden`, its arguments have no names for the caller."""
    listed = ", ".join(f"{'__' if hidden else ''}{one}: {type_}" for one, type_ in arguments)
    head = f"{indent}def {name}({listed}) -> {result}:"
    body = doc(text, f"{indent}    ")
    return f"{head}\n{body}" if body else f"{head} ...\n"


def constants(known: Definitions, types: Mapping[str, str] = {}) -> str:
    """All constants; `types` has those that are more than a number, by name."""
    lines = []
    for one in known.constants:
        type_ = types.get(one.name, "str" if one.is_text else "int")
        lines.append(f"{one.name}: Final[{type_}]\n")
        lines.append(doc(one.doc, ""))
    return "".join(lines)
