"""The reference pages: directives that describe what the headers declare.

    .. calls:: vswitch/queries.h       every call of a header
    .. helpers::                       the module's own functions, and arrays
    .. records:: vswitch/lags.h        every record of headers, its bytes as a picture
    .. constants:: qexapi/links.h      the constants of headers, by family
    .. types::                         the other names of C types
    .. overview:: calls                a table of all calls, or of all records
    .. record-picture:: VSMACLearning  a picture alone
"""

import sys
from functools import lru_cache
from pathlib import Path
from typing import Any, Dict, Iterable, List, Sequence, Tuple, Union, cast

ROOT = Path(__file__).resolve().parents[2]
sys.path[:0] = [str(ROOT / "python"), str(ROOT / "simhost/libvswitch")]

# Only now are the modules found that read the definitions.
from docutils import nodes  # noqa: E402
from docutils.statemachine import StringList  # noqa: E402
from make_status_texts import readable  # noqa: E402
from sphinx.addnodes import desc_content, desc_signature, index  # noqa: E402
from sphinx.application import Sphinx  # noqa: E402
from sphinx.domains.python import PythonDomain  # noqa: E402
from sphinx.util.docutils import SphinxDirective  # noqa: E402

from catalogue import CLASSES, FLAT, TYPES, Argument, Call, Catalogue  # noqa: E402
from comments import Family, statuses_in  # noqa: E402
from definitions import Field, Record  # noqa: E402
from pictures import picture  # noqa: E402
from words import Words, family_label  # noqa: E402


@lru_cache(maxsize=None)
def read_catalogue(build_folder: str) -> Tuple[Catalogue, Words]:
    catalogue = Catalogue(ROOT, Path(build_folder))
    return catalogue, Words(catalogue)


def _sentence(text: str) -> str:
    """The first sentence of a comment."""
    head, dot, _ = text.replace("\n", " ").partition(". ")
    return head + "." if dot else head


class _Described(SphinxDirective):
    """A directive that knows the catalogue."""

    @property
    def catalogue(self) -> Catalogue:
        return read_catalogue(self.config.build_folder)[0]

    @property
    def words(self) -> Words:
        return read_catalogue(self.config.build_folder)[1]

    def note(self, name: str, kind: str, node_id: str) -> None:
        """Makes a name known to links and to the search."""
        self._python.note_object(name, kind, node_id, location=(self.env.docname, self.lineno))

    @property
    def _python(self) -> PythonDomain:
        return cast(PythonDomain, self.env.get_domain("py"))

    def described(self, kind: str, *signatures: str) -> nodes.Element:
        """What the Python domain makes of signatures; its content is still empty.

        The table of contents has the first one only: the others are the same in another module.
        """
        directive = f".. py:{kind}:: "
        lines = [
            (directive if not at else " " * len(directive)) + one
            for at, one in enumerate(signatures)
        ]
        parent = nodes.Element()
        self.state.nested_parse(StringList(lines, "reference"), self.content_offset, parent)
        for node, text in list(zip(parent.findall(desc_signature), signatures))[1:]:
            node["_toc_name"] = ""
            self._anchor(parent, node, text.partition("(")[0])
        return parent

    def _anchor(self, parent: nodes.Element, signature: nodes.Element, name: str) -> None:
        """Gives a function its name for an anchor. Sphinx, which takes no underscore in front,
        would make it the other module's."""
        given = signature["ids"][0]
        signature["ids"] = [name]
        self._python.objects[name] = self._python.objects[name]._replace(node_id=name)
        for entries in parent.findall(index):
            entries["entries"] = [
                tuple(name if part == given else part for part in one) for one in entries["entries"]
            ]

    def labelled(self, label: str, children: Iterable[nodes.Node]) -> nodes.Element:
        """A paragraph that opens with what it is about."""
        paragraph = nodes.paragraph("", "", nodes.strong(text=label), nodes.Text(" "))
        paragraph.extend(children)
        return paragraph


def table(
    headings: Sequence[str],
    rows: Iterable[Tuple[Sequence[Sequence[nodes.Node]], Sequence[str]]],
    name: str,
) -> nodes.table:
    """A table of cells; each row comes with the anchors that lead to it."""
    body = nodes.tbody()
    for cells, anchors in rows:
        row = nodes.row()
        for number, cell in enumerate(cells):
            entry = nodes.entry()
            paragraph = nodes.paragraph("", "", *cell)
            if number == 0:
                paragraph[:0] = [nodes.target(ids=[anchor]) for anchor in anchors]
            entry += paragraph
            row += entry
        body += row
    head = nodes.thead("", nodes.row("", *[_heading(one) for one in headings]))
    columns = [nodes.colspec(colwidth=1) for _ in headings]
    group = nodes.tgroup("", *columns, head, body, cols=len(headings))
    return nodes.table("", group, classes=["reference", name])


def _heading(text: str) -> nodes.entry:
    return nodes.entry("", nodes.paragraph(text=text))


class _Functions(_Described):
    def function(self, call: Call) -> List[nodes.Node]:
        forms = [", ".join(form) for form in call.forms]
        owner = f"{CLASSES}.{call.method_of}" if call.method_of else CLASSES
        of_class = f"{owner}.{call.attribute}({forms[0]})"
        record = ["record"] if call.method_of else []
        flat = f"{FLAT}.{call.name}({', '.join([*record, *call.forms[0]])})"
        kind = "method" if call.method_of else "function"
        parent = self.described(kind, of_class, flat)
        content = next(iter(parent.findall(desc_content)))
        content.extend(self.words.paragraphs(call.comment.text))
        content.extend(self._details(call, forms))
        return list(parent.children)

    def _details(self, call: Call, forms: Sequence[str]) -> Iterable[nodes.Node]:
        for form in forms[1:]:
            text = f"{call.name}({form})"
            yield self.labelled("Also as", [nodes.literal(text=text), nodes.Text(", a status.")])
        if call.prototype:
            yield self.labelled("In C", [self.words.code(call.prototype.rstrip(";"), call.name)])
        if call.arguments:
            yield self._parameters(call)
        yield self.labelled("Answers", self._answer(call))
        if call.ownership:
            yield self.labelled("Ownership", self._joined(call.ownership))
        statuses = list(self._statuses(call))
        if statuses:
            yield nodes.paragraph("", "", nodes.strong(text="Statuses"))
            yield nodes.bullet_list("", *statuses, classes=["statuses"])
        if call.header:
            yield self.labelled("Simulated host", self._simulated(call))

    def _joined(self, sentences: Sequence[str]) -> Iterable[nodes.Node]:
        for number, sentence in enumerate(sentences):
            yield from self.words.inline((" " if number else "") + sentence)

    def _parameters(self, call: Call) -> nodes.table:
        rows = []
        for one in call.arguments:
            plain, flat = one.types
            types: List[nodes.Element] = [self.words.code(plain)]
            if plain.startswith("Cell"):
                types[0]["classes"].append("whole")
            if flat != plain:
                said = nodes.Text("flat: "), self.words.code(flat)
                types.append(nodes.inline("", "", *said, classes=["flat", "below"]))
            name = [nodes.literal(text=one.name)]
            meaning = self.words.inline(one.meaning or self._meaning(call, one))
            rows.append(((name, types, [self.words.code(one.c_type)], meaning), ()))
        return table(("Parameter", "Python", "C", ""), rows, "parameters")

    def _meaning(self, call: Call, argument: Argument) -> str:
        """What a name or a type means wherever it stands."""
        name = argument.name
        switch = "alias of the switch"
        said = {
            "switchName": switch,
            "switchId": "identifier of the switch",
            "port": "identifier of the port",
            "portsetName": "name of the set of ports",
            "uplink": "name of the uplink",
            "key": "key of the property",
            "length": "bytes",
            "index": "from 0 on",
            "sid": "identifier of the session, up to 31 bytes",
        }
        meaning = said.get(name, "")
        record = self.catalogue.known.records.get(argument.types[0].replace(" or None", ""))
        if record is not None:
            meaning = meaning or _sentence(record.doc).rstrip(".")
        said_of_type = self.catalogue.types.get(argument.c_type, "")
        if argument.c_type.startswith(("DVS", "NEB")):
            meaning = meaning or _sentence(said_of_type).rstrip(".")
        if name == "port" and not any(one.c_type == "char *" for one in call.arguments[1:]):
            meaning = "number of the port" if "PortID" in call.prototype else meaning
        return meaning

    def _answer(self, call: Call) -> Iterable[nodes.Node]:
        plain, flat = call.results
        if call.prototype.startswith("QEX_ReturnStatus ") and not call.shape:
            yield nodes.Text("a status, ")
        if call.shape:
            yield nodes.literal(text=f"({', '.join(call.shape)})")
            yield nodes.Text(", whatever the status: ")
        yield self.words.code(plain)
        if flat != plain:
            said = "; flat, a list: " if call.shape else "; flat: "
            yield nodes.inline(text=said, classes=["flat"])
            yield self.words.code(flat)
        if call.comment.returns:
            yield nodes.Text("; ")
            yield from self.words.inline(call.comment.returns)
        yield nodes.Text(".")

    def _statuses(self, call: Call) -> Iterable[nodes.Node]:
        if not call.prototype.startswith("QEX_ReturnStatus "):
            return
        for status, meaning in self._answered(call).items():
            text = nodes.paragraph("", "", *self.words.inline(f"{status}: {meaning}"))
            yield nodes.list_item("", text)

    def _answered(self, call: Call) -> Dict[str, str]:
        """Statuses and when they are answered, as the comments of the call and its file say."""
        found = {"QEX_OK": ["done"]}
        texts = [("", call.comment.text)]
        texts += [(f"`{name}`: ", text) for name, text in call.comment.parameters.items()]
        for prefix, text in texts:
            for status, said in statuses_in(text).items():
                found.setdefault(status, []).append(f"{prefix}{said}")
        for status, said in statuses_in(self.catalogue.headers[call.header].text.text).items():
            if _concerns(status, call):
                found.setdefault(status, []).append(said)
        known = self.catalogue.statuses
        told = {status: "; ".join(said) for status, said in found.items() if status in known}
        return {**told, "QEX_OK": found["QEX_OK"][0]}

    def _simulated(self, call: Call) -> Iterable[nodes.Node]:
        answer = self.catalogue.simulated.get(call.name)
        if answer is None:
            yield nodes.Text("not built beside this site, which is of another host.")
        else:
            yield from self.words.inline(f"{answer}.")


def _concerns(status: str, call: Call) -> bool:
    """Whether a call can come to what the comment of its header says of all calls."""
    if status == "QEX_NOT_FOUND":
        makes = any("of the new switch" in text for text in call.comment.parameters.values())
        return "char const *" in call.prototype and not makes
    return "*" in call.prototype


class Calls(_Functions):
    required_arguments = 1

    def run(self) -> List[nodes.Node]:
        header = self.catalogue.headers.get(self.arguments[0])
        if header is None or not header.prototypes:
            raise self.error(f"no header with calls: {self.arguments[0]}")
        # The first paragraph says what the page's own heading does.
        _, _, text = header.text.text.partition("\n\n")
        found = self.words.paragraphs(text)
        for call in self.catalogue.calls.values():
            if call.header == header.name:
                found += self.function(call)
        return found


class Helpers(_Functions):
    def run(self) -> List[nodes.Node]:
        found: List[nodes.Node] = []
        for call in self.catalogue.calls.values():
            if not call.header:
                found += self.function(call)
        return found


class Records(_Functions):
    required_arguments = 1
    optional_arguments = 20

    def run(self) -> List[nodes.Node]:
        found: List[nodes.Node] = []
        for header in self.arguments:
            if header not in self.catalogue.headers:
                raise self.error(f"no such header: {header}")
            for record in self.catalogue.known.records.values():
                if self.catalogue.header_of(record) == header:
                    found.append(self._record(record))
        return found

    def _record(self, record: Record) -> nodes.section:
        name = record.name
        size = self.catalogue.layout.sizes[name]
        section = nodes.section(ids=[f"{CLASSES}.{name}"], names=[name.lower()])
        self.state.document.note_explicit_target(section)
        section += nodes.title(text=name)
        self.note(f"{CLASSES}.{name}", "class", f"{CLASSES}.{name}")
        section.extend(self.words.paragraphs(record.doc))
        facts = f"{size:,} bytes, declared in {self.catalogue.header_of(record)}"
        section += nodes.paragraph("", "", nodes.inline(text=facts, classes=["facts"]))
        drawn = picture(name, self.catalogue.shapes(record), size)
        section += nodes.raw("", f'<div class="picture">{drawn}</div>', format="html")
        section += self._fields(record)
        section += self._life(record)
        for method in self.catalogue.methods[name]:
            section.extend(self.function(method))
        return section

    def _fields(self, record: Record) -> nodes.table:
        rows = []
        for one in record.fields:
            place = self.catalogue.layout.places[record.name][one.name]
            offset = str(place.offset)
            size = f"{place.size:,}"
            if place.bits:
                last = place.first_bit + place.bits - 1
                size = f"bit {last}" if place.bits == 1 else f"bits {place.first_bit} to {last}"
            elif one.type.is_array and one.type.count is None:
                size = "behind"
            attribute = f"{CLASSES}.{record.name}.{one.name}"
            self.note(attribute, "attribute", attribute)
            cells = (
                [nodes.literal(text=one.name)],
                self._type(one),
                [nodes.Text(offset)],
                [nodes.Text(size)],
                self.words.inline(one.doc),
                self._accessors(record, one),
            )
            rows.append((cells, (attribute, *self._accessor_names(record, one))))
        headings = ("Field", "Type", "Offset", "Bytes", "", "Flat functions")
        return table(headings, rows, "fields")

    def _type(self, one: Field) -> List[nodes.Node]:
        """The type in C, and what it reads as where that is no number."""
        found: List[nodes.Node] = [self.words.code(one.type.spelled())]
        reads_as = self.catalogue.reads_as(one)
        if reads_as not in ("int", one.type.spelled()):
            remark = nodes.Text("reads as "), self.words.code(reads_as)
            found.append(nodes.inline("", "", *remark, classes=["flat", "below"]))
        return found

    def _accessor_names(self, record: Record, one: Field) -> Sequence[str]:
        """The anchors of a field's reader and writer."""
        if record.is_inner:
            return ()
        names = [f"{FLAT}.{record.name}_{one.name}_get"]
        if one.is_writable:
            names.append(f"{FLAT}.{record.name}_{one.name}_set")
        for name in names:
            self.note(name, "function", name)
        return names

    def _accessors(self, record: Record, one: Field) -> List[nodes.Node]:
        if record.is_inner:
            return [nodes.inline(text="through its parent only", classes=["remark"])]
        found: List[nodes.Node] = [nodes.literal(text=f"{record.name}_{one.name}_get")]
        if one.is_writable:
            found += [nodes.Text(" "), nodes.literal(text=f"{record.name}_{one.name}_set")]
        else:
            found.append(nodes.inline(text=" read only", classes=["remark"]))
        return found

    def _life(self, record: Record) -> nodes.Element:
        """How a record is made and freed."""
        if record.is_inner:
            text = "A part of its parent, which makes and frees it; it has no class of its own."
            return nodes.paragraph(text=text)
        name = record.name
        inner = ", ".join(one.name for one in record.constructor)
        return self.labelled(
            "Made and freed",
            self.words.inline(
                f"by `{CLASSES}.{name}({inner})`, which frees itself; flat: `new_{name}({inner})` "
                f"and `delete_{name}(record)`, and `{name}_swigregister(cls)` for a class."
            ),
        )


class RecordPicture(_Described):
    required_arguments = 1

    def run(self) -> List[nodes.Node]:
        name = self.arguments[0]
        shapes = self.catalogue.shapes(self.catalogue.known.records[name])
        drawn = picture(name, shapes, self.catalogue.layout.sizes[name])
        return [nodes.raw("", f'<div class="picture">{drawn}</div>', format="html")]


class Constants(_Described):
    required_arguments = 1
    optional_arguments = 30

    def run(self) -> List[nodes.Node]:
        found: List[nodes.Node] = []
        for name in self.arguments:
            header = self.catalogue.headers.get(name)
            if header is None or not header.families:
                raise self.error(f"no header with constants: {name}")
            for family in header.families:
                found.append(self._family(name, family))
        return found

    def _family(self, header: str, family: Family) -> nodes.section:
        title = self.catalogue.title_of(family)
        label = family_label(title)
        section = nodes.section(ids=[label], names=[label])
        self.state.document.note_explicit_target(section)
        standard: Any = self.env.get_domain("std")
        standard.anonlabels[label] = self.env.docname, label
        section += nodes.title("", "", nodes.Text(title))
        section.extend(self.words.paragraphs(family.text))
        meanings = [self._meaning(family, name) for name in family.names]
        rows = []
        for name, meaning in zip(family.names, meanings):
            value = self.catalogue.layout.values[name]
            anchor = f"{FLAT}.{name}"
            self.note(anchor, "data", anchor)
            cells = [[nodes.literal(text=name)], self._value(value)]
            if any(meanings):
                cells.append(self.words.inline(meaning))
            rows.append((cells, (anchor,)))
        headings = ("Constant", "Value", "") if any(meanings) else ("Constant", "Value")
        section += table(headings, rows, "constants")
        return section

    def _value(self, value: Union[int, str]) -> List[nodes.Node]:
        if isinstance(value, str):
            return [nodes.literal(text=f'"{value}"')]
        found: List[nodes.Node] = [nodes.literal(text=str(value))]
        if abs(value) > 9:
            # What is negative here was unsigned in the header.
            bits = value if value >= 0 else value + 2**32
            found += [nodes.Text(" "), nodes.inline(text=f"{bits:#x}", classes=["remark"])]
        return found

    def _meaning(self, family: Family, name: str) -> str:
        if name in family.remarks:
            return family.remarks[name]
        if family.title == "QEX_ReturnStatus":
            return str(readable(name))
        return ""


class Types(_Described):
    def run(self) -> List[nodes.Node]:
        rows = []
        for name, text in self.catalogue.types.items():
            anchor = f"{TYPES}.{name}"
            self.note(anchor, "data", anchor)
            behind = self.catalogue.known.typedefs.get(name)
            spelled = behind.spelled() if behind else ""
            if "f(" in "".join(behind.layers if behind else ()):
                spelled = "a function"
            cells = (
                [nodes.literal(text=name)],
                [self.words.code(spelled)],
                self.words.inline(text.replace("\n", " ")),
            )
            rows.append((cells, (anchor,)))
        return [table(("Type", "In C", ""), rows, "types")]


class Overview(_Described):
    required_arguments = 1

    def run(self) -> List[nodes.Node]:
        if self.arguments[0] == "records":
            return [self._records()]
        if self.arguments[0] == "calls":
            return [self._calls()]
        raise self.error("an overview of calls or of records")

    def _records(self) -> nodes.table:
        rows = []
        for record in self.catalogue.known.records.values():
            if not record.is_inner:
                size = f"{self.catalogue.layout.sizes[record.name]:,}"
                text = self.words.inline(_sentence(record.doc))
                rows.append((([self.words.code(record.name)], [nodes.Text(size)], text), ()))
        return table(("Record", "Bytes", ""), rows, "overview")

    def _calls(self) -> nodes.table:
        rows = []
        for call in self.catalogue.calls.values():
            if call.header:
                text = self.words.inline(_sentence(call.comment.text))
                rows.append((([self.words.code(call.name)], text), ()))
        return table(("Call", ""), rows, "overview")


def _link_literals(app: Sphinx, document: nodes.document) -> None:
    # The reference's own pages have a link where they mean one.
    if not app.env.docname.startswith("reference/"):
        read_catalogue(app.config.build_folder)[1].link_literals(document)


def setup(app: Sphinx) -> Dict[str, bool]:
    app.add_config_value("build_folder", "", "env")
    app.connect("doctree-read", _link_literals)
    app.add_directive("calls", Calls)
    app.add_directive("helpers", Helpers)
    app.add_directive("records", Records)
    app.add_directive("constants", Constants)
    app.add_directive("types", Types)
    app.add_directive("overview", Overview)
    app.add_directive("record-picture", RecordPicture)
    return {"parallel_read_safe": True, "parallel_write_safe": True}
