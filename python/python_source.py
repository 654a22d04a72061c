"""Python source that is written out: documentation, functions, wrapped lists of arguments."""

from typing import Iterable, List, Sequence


def documentation(text: str, indent: str) -> List[str]:
    """The lines of a documentation text; none for none."""
    if not text:
        return []
    text = text.replace("\\", "\\\\").replace('"""', "'''")
    first, *more = text.splitlines()
    if not more:
        return [f'{indent}"""{first}"""']
    lines = [f'{indent}"""{first}', *(f"{indent}{line}".rstrip() for line in more)]
    return [*lines, f'{indent}"""']


def function(
    name: str, parameters: Sequence[str], text: str, body: Iterable[str], indent: str = ""
) -> List[str]:
    inner = f"{indent}    "
    return [
        f"{indent}def {name}({', '.join(parameters)}):",
        *documentation(text, inner),
        *(f"{inner}{line}" for line in body),
    ]
