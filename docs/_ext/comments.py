"""What the headers say in words: of files, functions, families of constants.

How a comment has to be written for that, include/README.md says. Of what is declared, only names
are looked at here, to know what a comment is about; the rest is in the definitions.
"""

import re
from dataclasses import dataclass, field
from pathlib import Path
from typing import Dict, List, Tuple

from definitions import undecorated


@dataclass(frozen=True)
class Comment:
    """A comment, parted at its commands and at the list of statuses."""

    text: str
    statuses: Dict[str, str]
    parameters: Dict[str, str]
    returns: str


@dataclass(frozen=True)
class Family:
    """Constants under one comment: an enumeration, or definitions in a row."""

    title: str  # the enumeration's name; what the names share, with a star; or nothing
    text: str
    names: Tuple[str, ...]
    remarks: Dict[str, str]  # what is said of single ones


@dataclass
class Header:
    name: str
    text: Comment
    families: List[Family] = field(default_factory=list)
    prototypes: Dict[str, str] = field(default_factory=dict)
    comments: Dict[str, Comment] = field(default_factory=dict)  # of functions
    types: Dict[str, str] = field(default_factory=dict)  # what is said of each


_COMMENT = r"/\*\*(?!<)(?P<comment>(?:[^*]|\*(?!/))*)\*/"
_ITEM = re.compile(
    r"(?:/\*\*(?P<above>[^<](?:[^*]|\*(?!/))*)\*/\s*)?"
    r"(?P<name>\b\w+)\s*(?:=\s*[^,}/]+?)?\s*(?:,|$)[ \t]*"
    r"(?:/\*\*<(?P<trailing>(?:[^*]|\*(?!/))*)\*/)?",
    re.MULTILINE,
)
_LISTED = re.compile(r"^- (?P<status>\w*) ?(?P<when>.*(?:\n(?!- ).+)*)\n?", re.MULTILINE)


def parted(comment: str) -> Comment:
    """Takes an undecorated comment apart."""
    first, *commands = re.split(r"^@(\w+)\s*", comment, flags=re.MULTILINE)
    parameters: Dict[str, str] = {}
    text, returns = first.strip(), ""
    for kind, rest in zip(commands[::2], commands[1::2]):
        line = re.sub(r"\s*\n\s*", " ", rest.strip())
        if kind == "file":
            text = f"{text}\n\n{rest.strip()}".strip()
        elif kind == "param":
            name, _, meaning = line.partition(" ")
            parameters[name] = meaning
        elif kind == "return":
            returns = line
        else:
            raise ValueError(f"unknown command @{kind} in a comment")
    return Comment(_LISTED.sub("", text).strip(), _listed(text), parameters, returns)


def first_sentence(text: str) -> str:
    head, dot, _ = text.replace("\n", " ").partition(". ")
    return head + "." if dot else head


def _listed(text: str) -> Dict[str, str]:
    """The statuses of a list, each with when it is returned."""
    found: Dict[str, str] = {}
    for item in _LISTED.finditer(text):
        if item["status"] in found:
            raise ValueError(f"{item['status']} is listed twice in a comment")
        found[item["status"]] = re.sub(r"\s*\n\s*", " ", item["when"])
    return found


def read(path: Path, name: str) -> Header:
    source = path.read_text(encoding="ascii")
    file = re.search(_COMMENT.replace("(?P<comment>", r"(?P<comment>\s*\*?\s*@file"), source)
    if file is None:  # the helpers open with a comment about themselves
        file = re.match(_COMMENT, source)
    header = Header(name, parted(undecorated(file["comment"]) if file else ""))
    _read_families(source, header)
    _read_functions(source, header)
    _read_types(source, header)
    return header


def _read_families(source: str, header: Header) -> None:
    enumeration = (
        rf"{_COMMENT}\s*(?:typedef )?enum\s*\w*\s*\{{(?P<items>[^}}]*)\}}\s*(?P<title>\w*);"
    )
    definitions = rf"{_COMMENT}\n(?P<lines>(?:#define \w+ .*\n)+)"
    remark = r"^#define (\w+) .*?/\*\*<(.*?)\*/$"
    found = []
    for match in re.finditer(enumeration, source):
        items = list(_ITEM.finditer(match["items"]))
        remarks = {
            item["name"]: undecorated(item["above"] or item["trailing"])
            for item in items
            if item["above"] or item["trailing"]
        }
        names = tuple(item["name"] for item in items)
        title = match["title"] or common_start(names)
        text = undecorated(match["comment"])
        found.append((match.start(), Family(title, text, names, remarks)))
    for match in re.finditer(definitions, source):
        names = tuple(re.findall(r"#define (\w+)", match["lines"]))
        remarks = {
            name: undecorated(said)
            for name, said in re.findall(remark, match["lines"], re.MULTILINE)
        }
        text = undecorated(match["comment"])
        found.append((match.start(), Family(common_start(names), text, names, remarks)))
    header.families = [family for _, family in sorted(found, key=lambda one: one[0])]


def common_start(names: Tuple[str, ...]) -> str:
    """What names share up to an underscore, with a star; of a single one, itself."""
    if len(names) == 1:
        return names[0]
    parts = [name.split("_") for name in names]
    shared: List[str] = []
    for column in zip(*parts):
        if len(set(column)) > 1:
            break
        shared.append(column[0])
    return "_".join([*shared, "*"]) if shared else ""


def _read_types(source: str, header: Header) -> None:
    """Other names of types, which a comment may say of several in a row."""
    definition = r"typedef [^;{}]*;\n"
    for match in re.finditer(rf"{_COMMENT}\n(?P<lines>(?:{definition})+)", source):
        for one in re.findall(definition, match["lines"]):
            name = re.search(r"\(\*(\w+)\)|(\w+)(?:\[\w+\])?;", one)
            if name:
                header.types[name[1] or name[2]] = undecorated(match["comment"])


def _read_functions(source: str, header: Header) -> None:
    declaration = r"(?:[A-Za-z_][\w \n*]*?\b\w+\([^;{]*\);\n?)"
    for match in re.finditer(rf"{_COMMENT}\n(?P<declarations>{declaration}+)", source):
        for one in re.findall(declaration, match["declarations"]):
            prototype = re.sub(r"\s+", " ", one.strip())
            name = re.search(r"(\w+)\(", prototype)
            if name and not prototype.startswith("typedef"):
                header.prototypes[name[1]] = prototype
                header.comments[name[1]] = parted(undecorated(match["comment"]))
