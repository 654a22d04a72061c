"""What the directives of the reference have in common: the catalogue, entries, tables."""

from functools import lru_cache
from pathlib import Path
from typing import Iterable, List, Sequence, Tuple, cast

from docutils import nodes
from docutils.statemachine import StringList
from sphinx.addnodes import desc_signature, index
from sphinx.domains.python import PythonDomain
from sphinx.util.docutils import SphinxDirective

from catalogue import Catalogue
from words import Words

ROOT = Path(__file__).resolve().parents[2]


@lru_cache(maxsize=None)
def read_catalogue(build_folder: str) -> Tuple[Catalogue, Words]:
    catalogue = Catalogue(ROOT, Path(build_folder))
    return catalogue, Words(catalogue)


class Described(SphinxDirective):
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

    def more_of(self, header: str) -> List[nodes.Node]:
        """What a header says of itself, but for its first paragraph: that is the page's heading."""
        return self.words.paragraphs(self.catalogue.headers[header].text.text.partition("\n\n")[2])

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
