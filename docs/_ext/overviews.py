"""What is listed on one page: the other names of C types, all calls, all records."""

from typing import List

from docutils import nodes

from catalogue import TYPES
from comments import first_sentence
from described import Described, table


class Types(Described):
    def run(self) -> List[nodes.Node]:
        rows = []
        for name, text in self.catalogue.types.items():
            anchor = f"{TYPES}.{name}"
            self.note(anchor, "data", anchor)
            original = self.catalogue.known.typedefs.get(name)
            spelled = original.spelled() if original else ""
            if "f(" in "".join(original.layers if original else ()):
                spelled = "a function"
            cells = (
                [nodes.literal(text=name)],
                [self.words.code(spelled)],
                self.words.inline(text.replace("\n", " ")),
            )
            rows.append((cells, (anchor,)))
        return [table(("Type", "In C", ""), rows, "types")]


class Overview(Described):
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
                text = self.words.inline(first_sentence(record.doc))
                rows.append((([self.words.code(record.name)], [nodes.Text(size)], text), ()))
        return table(("Record", "Bytes", ""), rows, "overview")

    def _calls(self) -> nodes.table:
        rows = []
        for call in self.catalogue.calls.values():
            if call.header:
                text = self.words.inline(first_sentence(call.comment.text))
                rows.append((([self.words.code(call.name)], text), ()))
        return table(("Call", ""), rows, "overview")
