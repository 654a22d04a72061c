"""The pages of records: their bytes as a picture, their fields, how they are made and freed."""

from typing import List, Sequence

from docutils import nodes

import likeness
from call_pages import Functions
from catalogue import CLASSES, FLAT
from definitions import Field, Record
from described import Described, table
from pictures import picture


class Records(Functions):
    required_arguments = 1
    optional_arguments = 20

    def run(self) -> List[nodes.Node]:
        found: List[nodes.Node] = []
        for header in self.arguments:
            if header not in self.catalogue.headers:
                raise self.error(f"no such header: {header}")
            said = [one.astext() for one in found]
            found += [one for one in self.more_of(header) if one.astext() not in said]
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
                size = "trailing"
            attribute = f"{CLASSES}.{record.name}.{one.name}"
            self.note(attribute, "attribute", attribute)
            cells = (
                [nodes.literal(text=one.name)],
                self._type(one),
                [nodes.Text(offset)],
                [nodes.Text(size)],
                self.words.inline("; ".join(filter(None, (one.doc, likeness.of_field(one))))),
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


class RecordPicture(Described):
    required_arguments = 1

    def run(self) -> List[nodes.Node]:
        name = self.arguments[0]
        shapes = self.catalogue.shapes(self.catalogue.known.records[name])
        drawn = picture(name, shapes, self.catalogue.layout.sizes[name])
        return [nodes.raw("", f'<div class="picture">{drawn}</div>', format="html")]
