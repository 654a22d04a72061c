"""Comments as nodes of a document: paragraphs, code, and a link for every name that has a page."""

import re
from typing import Dict, Iterable, List, Optional, Tuple

from docutils import nodes
from sphinx.addnodes import pending_xref

from catalogue import CLASSES, FLAT, TYPES, Catalogue

_NAME = r"[A-Za-z]\w+\.[A-Za-z]\w*|[A-Za-z_]\w*\w|[A-Z]\w*_"
_WORDS = re.compile(rf"`([^`]+)`|(?<![\w./])({_NAME})(\*?)(?!\w)")


class Words:
    def __init__(self, catalogue: Catalogue) -> None:
        self._targets: Dict[str, Tuple[str, str, str]] = {}
        for name in catalogue.calls:
            self._targets[name] = ("py", "func", f"{FLAT}.{name}")
        for methods in catalogue.methods.values():
            for method in methods:
                self._targets[method.name] = ("py", "func", f"{FLAT}.{method.name}")
        for record in catalogue.known.records.values():
            self._targets[record.name] = ("py", "class", f"{CLASSES}.{record.name}")
            for field in record.fields:
                name = f"{record.name}.{field.name}"
                self._targets[name] = ("py", "attr", f"{CLASSES}.{name}")
        for one in catalogue.known.constants:
            self._targets[one.name] = ("py", "data", f"{FLAT}.{one.name}")
        for name in catalogue.types:
            self._targets.setdefault(name, ("py", "data", f"{TYPES}.{name}"))
        for header in catalogue.headers.values():
            for family in header.families:
                title = catalogue.title_of(family)
                self._targets.setdefault(title, ("std", "ref", family_label(title)))

    def paragraphs(self, text: str) -> List[nodes.Node]:
        return [
            nodes.paragraph("", "", *self.inline(re.sub(r"\s*\n\s*", " ", part)))
            for part in re.split(r"\n\s*\n", text)
            if part.strip()
        ]

    def inline(self, text: str) -> List[nodes.Node]:
        """A text; what stands in backquotes, and what has a page, in the letters of code."""
        found: List[nodes.Node] = []
        last = 0
        for match in _WORDS.finditer(text):
            name = match[1] or match[2] + match[3]
            node = self._link(name) or self._link(name.rstrip("*"))
            if node is None and match[1] is None:
                continue
            found.append(nodes.Text(text[last : match.start()]))
            found.append(node or nodes.literal(text=name))
            last = match.end()
        found.append(nodes.Text(text[last:]))
        return found

    def code(self, text: str, but: str = "") -> nodes.literal:
        """A C or Python type, its names being links; `but` is the one whose page this is."""
        inner: List[nodes.Node] = []
        for part in re.split(r"(\w+)", text):
            link = self._link(part) if part != but else None
            inner.append(link if link is not None else nodes.Text(part))
        return nodes.literal("", "", *_unquoted(inner))

    def link_literals(self, document: nodes.document) -> None:
        """Makes links of names that stand as code in running text."""
        for literal in list(document.findall(nodes.literal)):
            link = self._link(literal.astext()) if literal.parent.tagname != "title" else None
            if link is not None and not list(literal.findall(pending_xref)):
                if not isinstance(literal.parent, (nodes.reference, pending_xref)):
                    literal.replace_self(link)

    def _link(self, name: str) -> Optional[nodes.Element]:
        target = self._targets.get(name)
        if target is None:
            return None
        domain, kind, reference = target
        xref = pending_xref(
            "",
            refdomain=domain,
            reftype=kind,
            reftarget=reference,
            refexplicit=True,
            refwarn=True,
        )
        xref += nodes.literal(text=name, classes=["xref"])
        return xref


def _unquoted(inner: Iterable[nodes.Node]) -> Iterable[nodes.Node]:
    """Links without a literal of their own, for the inside of one."""
    for node in inner:
        if isinstance(node, pending_xref):
            node.children = [nodes.inline("", node.astext(), classes=["xref"])]
        yield node


def family_label(title: str) -> str:
    return f"constants-{nodes.make_id(title.replace('*', 'all').replace('_', '-'))}"
