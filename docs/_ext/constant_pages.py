"""The pages of constants: families with their values, and what is said of single ones."""

from typing import Any, List, Union

from docutils import nodes
from make_status_texts import readable

from catalogue import FLAT
from comments import Family
from described import Described, table
from words import family_label


class Constants(Described):
    required_arguments = 1
    optional_arguments = 30

    def run(self) -> List[nodes.Node]:
        found: List[nodes.Node] = []
        for name in self.arguments:
            header = self.catalogue.headers.get(name)
            if header is None or not header.families:
                raise self.error(f"no header with constants: {name}")
            if name not in map(self.catalogue.header_of, self.catalogue.known.records.values()):
                found += self.more_of(name)
            for family in header.families:
                found.append(self._family(family))
        return found

    def _family(self, family: Family) -> nodes.section:
        title = self.catalogue.title_of(family)
        label = family_label(title)
        section = nodes.section(ids=[label], names=[label])
        self.state.document.note_explicit_target(section)
        standard: Any = self.env.get_domain("std")
        standard.anonlabels[label] = self.env.docname, label
        section += nodes.title("", "", nodes.Text(title))
        # A comment of one sentence may be the title of what it says.
        if family.text.rstrip(".").replace("\n", " ") != title:
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
        remark = family.remarks.get(name, "")
        if family.title == "QEX_ReturnStatus":
            return remark or str(readable(name[len("QEX_") :]))
        places = ", ".join(f"`{place}`" for place in self.catalogue.places_of(name))
        return "; ".join(filter(None, [remark, places and f"see {places}"]))
