"""The pages of calls: what each takes and returns, and with which statuses."""

from typing import Iterable, List, Sequence

from docutils import nodes
from sphinx.addnodes import desc_content

from call_entries import Call
from catalogue import CLASSES, FLAT
from described import Described, table


class Functions(Described):
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
        yield self.labelled("Returns", self._returns(call))
        if call.ownership:
            yield self.labelled("Ownership", self._joined(call.ownership))
        if call.between_hosts:
            yield self.labelled("Between hosts", self._joined(call.between_hosts))
        if call.statuses:
            yield nodes.paragraph("", "", nodes.strong(text="Statuses"))
            yield nodes.bullet_list("", *self._statuses(call), classes=["statuses"])
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
            meaning = self.words.inline(one.meaning)
            rows.append(((name, types, [self.words.code(one.c_type)], meaning), ()))
        return table(("Parameter", "Python", "C", ""), rows, "parameters")

    def _returns(self, call: Call) -> Iterable[nodes.Node]:
        plain, flat = call.results
        if call.statuses and not call.shape:
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

    def _statuses(self, call: Call) -> Iterable[nodes.list_item]:
        for status, when in call.statuses.items():
            text = nodes.paragraph("", "", *self.words.inline(f"{status}: {when}"))
            yield nodes.list_item("", text)

    def _simulated(self, call: Call) -> Iterable[nodes.Node]:
        told = self.catalogue.simulated.get(call.name)
        if told is None:
            yield nodes.Text("not built beside this site, which is of another host.")
        else:
            yield from self.words.inline(f"{told}.")


class Calls(Functions):
    required_arguments = 1

    def run(self) -> List[nodes.Node]:
        header = self.catalogue.headers.get(self.arguments[0])
        if header is None or not header.prototypes:
            raise self.error(f"no header with calls: {self.arguments[0]}")
        found = self.more_of(header.name)
        for call in self.catalogue.calls.values():
            if call.header == header.name:
                found += self.function(call)
        return found


class Helpers(Functions):
    def run(self) -> List[nodes.Node]:
        found: List[nodes.Node] = []
        for call in self.catalogue.calls.values():
            if not call.header:
                found += self.function(call)
        return found
