"""All there is to describe, put together: definitions, comments, layouts, types in Python."""

import json
import re
from pathlib import Path
from typing import Dict, Iterable, List, Tuple

import call_model
import comments
import definitions
import layout
import statuses
from call_entries import Call, Entries
from comments import Family, Header
from definitions import Field, Record
from segments import Shape
from shapes import Shapes

CLASSES, FLAT = "libvswitch", "_libvswitch"
TYPES = "C"  # where the names of C types have their places


class Catalogue:
    def __init__(self, root: Path, build: Path) -> None:
        self.known = definitions.read(build / "classes/made/tree.xml")
        self.modelled = {call.name: call for call in call_model.read(self.known)}
        self.layout = layout.read(build / "docs/layout.tsv")
        self.headers = _headers(root / "include")
        self.simulated = _simulated(build / "simhost/calls.json")
        self.types = {
            name: text for header in self.headers.values() for name, text in header.types.items()
        }
        self._refuse_other_comments()
        self._shapes = Shapes(self.known, self.layout)
        helpers = _headers(root / "helpers").values()
        self._entries = Entries(self.known, self.modelled, self.headers, helpers)
        self.calls: Dict[str, Call] = {
            name: self._entries.of_call(name, forms) for name, forms in self.known.forms().items()
        }
        self.methods: Dict[str, List[Call]] = {
            record.name: [self._entries.of_method(record, one) for one in record.methods]
            for record in self.known.records.values()
        }
        self._places: Dict[str, List[str]] = {}
        for place, text in self._commented():
            for word in dict.fromkeys(re.findall(r"\w+", text)):
                self._places.setdefault(word, []).append(place)

    def _refuse_other_comments(self) -> None:
        families = self.headers["qexapi/status.h"].families
        known = {name for family in families for name in family.names}
        refused = statuses.refused(self.headers.values(), self.modelled, known)
        if refused:
            raise ValueError("\n".join(["include/README.md asks for other comments", *refused]))

    def _commented(self) -> Iterable[Tuple[str, str]]:
        """Calls, records and fields, each with what is said of it."""
        for call in self.calls.values():
            comment = call.comment
            said = [comment.text, *comment.statuses.values(), *comment.parameters.values()]
            yield call.name, " ".join(said)
        for record in self.known.records.values():
            yield record.name, record.doc
            for one in record.fields:
                yield f"{record.name}.{one.name}", one.doc

    def places_of(self, constant: str) -> List[str]:
        """The calls, records and fields of which the comments name a constant."""
        return self._places.get(constant, [])

    def title_of(self, family: Family) -> str:
        """What a family is called: its name, if no other has the same, or its comment."""
        namesakes = [
            one
            for header in self.headers.values()
            for one in header.families
            if one.title == family.title
        ]
        if family.title and len(namesakes) == 1:
            return family.title
        return re.split(r"[.;:](?:\s|$)", family.text, maxsplit=1)[0].replace("\n", " ")

    def header_of(self, record: Record) -> str:
        return "/".join(Path(record.header).parts[-2:])

    def reads_as(self, one: Field) -> str:
        """What an attribute of a class reads as."""
        return self._entries.reads_as(one)

    def shapes(self, record: Record) -> List[Shape]:
        return self._shapes.of(record)


def _headers(folder: Path) -> Dict[str, Header]:
    found = {}
    for path in sorted(folder.rglob("*.h")):
        name = str(path.relative_to(folder))
        found[name] = comments.read(path, name)
    return found


def _simulated(table: Path) -> Dict[str, str]:
    """What the simulated host does with each call; nothing if none was built."""
    if not table.exists():
        return {}
    rows = json.loads(table.read_text(encoding="utf-8"))
    return {
        row["call"]: f"always returns {row['status']}" if "status" in row else row["answer"]
        for row in rows
    }
