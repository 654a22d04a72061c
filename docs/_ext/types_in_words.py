"""The types of the stubs as a reader wants them, in words."""

import ast
import re
from typing import Any, Collection, List


def in_words(hint: str, records: Collection[str]) -> str:
    """A type hint in words: `str or None`, `[int, VSInfo]`, `unsigned int * pointer`."""
    return _spelled(ast.parse(hint, mode="eval").body, records)


def _spelled(node: Any, records: Collection[str]) -> str:
    if isinstance(node, ast.Constant):
        return str(node.value)
    if isinstance(node, ast.Attribute):
        if getattr(node.value, "id", "") == "_numbers":
            # Of a family of constants; a type checker alone tells the numbers of two.
            return "int" if node.attr.endswith("Number") else f"{node.attr[1:]} or int"
        return _named(node.attr, records)
    if isinstance(node, ast.Name):
        return _named(node.id, records)
    if not isinstance(node, ast.Subscript):
        raise ValueError(f"not a type: {ast.dump(node)}")
    kind = _spelled(node.value, records)
    if kind == "Callable":
        return "function"
    index: Any = node.slice
    inside = index.elts if isinstance(index, ast.Tuple) else [index]
    parts = [_spelled(one, records) for one in inside]
    if kind == "Union":
        return _either(parts)
    if kind == "Optional":
        return _either([*parts, "None"])
    if kind == "Tuple":
        return f"[{', '.join(parts)}]"
    return f"{kind.lower()} of {parts[0]}"


def _either(parts: List[str]) -> str:
    """A choice. Any is a null that only comes with a failure; every text may be a pointer."""
    return " or ".join(
        one for one in parts if one != "Any" and not ("str" in parts and one == "char * pointer")
    )


def _named(name: str, records: Collection[str]) -> str:
    """A class of the stubs; those of pointers, which exist nowhere else, by what they point to."""
    if not name.startswith("_"):
        return name
    target = name[1:]
    if target == "Pointer":
        return "any pointer"
    if target in records:
        return f"{target} * pointer"
    if "Function" in target:
        return "function pointer"
    stars = len(re.findall("Pointer", target))
    target = re.sub(r"Pointer|Array\d+", "", target)
    if target not in records:
        target = re.sub(r"(?<=[a-z])(?=[A-Z])", " ", target).lower()
    return f"{target} {'*' * max(stars, 1)} pointer"
