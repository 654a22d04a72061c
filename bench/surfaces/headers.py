"""What the generators take from C itself: prototypes, integer types, and the bodies of methods."""

import re
from dataclasses import dataclass
from pathlib import Path
from typing import Dict, Iterator, List, Tuple

ROOT = Path(__file__).resolve().parents[2]

_INTEGERS = {
    "char",
    "signed char",
    "unsigned char",
    "short",
    "unsigned short",
    "int",
    "unsigned int",
    "long long",
    "unsigned long long",
}


@dataclass(frozen=True)
class Prototype:
    """A C function: what it returns, and the type and name of each parameter."""

    result: str
    name: str
    parameters: Tuple[Tuple[str, str], ...]


@dataclass(frozen=True)
class Method(Prototype):
    """A function that the binding definitions attach to a record, with its body."""

    body: str


def _sources(*folders: str) -> Iterator[Tuple[Path, str]]:
    for folder in folders:
        for path in sorted((ROOT / folder).rglob("*.h")):
            text = path.read_text(encoding="utf-8")
            text = re.sub(
                r"/\*.*?\*/|//[^\n]*|^#(?:[^\n]*\\\n)*[^\n]*", "", text, flags=re.S | re.M
            )
            yield path.relative_to(ROOT), text


def includes(*folders: str) -> List[str]:
    """The headers of these folders, as C includes them with the root and include/ searched."""
    return [str(path).replace("include/", "", 1) for path, _ in _sources(*folders)]


def parameter(text: str) -> Tuple[str, str]:
    """The type and the name of a parameter; an array's dimension belongs to the type."""
    match = re.fullmatch(r"(.*?)(\w+)((?:\[\d*\])?)", text.strip(), flags=re.S)
    if match is None or not match[1].strip():
        return text.strip(), ""
    return " ".join(f"{match[1]} {match[3]}".split()), match[2]


def _parameters(text: str) -> Tuple[Tuple[str, str], ...]:
    text = " ".join(text.split())
    return () if text in ("", "void") else tuple(parameter(part) for part in text.split(","))


def prototypes() -> Dict[str, Prototype]:
    """The functions that the host and the helpers declare, by name."""
    pattern = re.compile(r"^([A-Za-z][\w ]*?[ *]+)(\w+)\(([^()]*)\);", flags=re.M)
    return {
        name: Prototype(" ".join(result.split()), name, _parameters(parameters))
        for _, text in _sources("include", "helpers")
        for result, name, parameters in pattern.findall(text)
        if not result.startswith(("typedef", "return"))
    }


def integers() -> Dict[str, str]:
    """The C type of each integer type by name, of enumerations too."""
    known = {name: name for name in _INTEGERS}
    known.update({"size_t": "unsigned long", "unsigned long": "unsigned long"})
    for _, text in _sources("include"):
        known.update({name: "int" for name in re.findall(r"enum (\w+) \{", text)})
        known.update({f"enum {name}": "int" for name in re.findall(r"enum (\w+) \{", text)})
    known["QEX_ReturnStatus"] = "int"
    found = True
    while found:
        found = False
        for _, text in _sources("include"):
            for base, name in re.findall(r"^typedef ([\w ]+) (\w+);", text, flags=re.M):
                if name not in known and base in known:
                    known[name] = known[base]
                    found = True
    return known


def methods() -> Dict[str, Method]:
    """The methods of records, by the name of their flat function; `self` is the record."""
    found = {}
    for path in sorted((ROOT / "interface" / "records").glob("*.i")):
        text = path.read_text(encoding="utf-8")
        for record, block in re.findall(r"^%extend (\w+) \{\n(.*?)^\}", text, flags=re.S | re.M):
            for result, name, parameters, body in re.findall(
                r"^  ([\w ]+?[ *]+)(\w+)\(([^()]*)\) (\{.*?\})$(?=\n  \S|\n\Z)",
                block,
                flags=re.S | re.M,
            ):
                flat = f"{record}_{name}"
                found[flat] = Method(
                    " ".join(result.split()),
                    flat,
                    ((f"struct {record} *", "self"), *_parameters(parameters)),
                    body.replace("$self", "self"),
                )
    return found
