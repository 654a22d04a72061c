"""Comments as nodes of a document: paragraphs, code, and a link for every name that has a page."""

import re
from typing import Dict, Iterable, List, Optional, Tuple

from docutils import nodes
from sphinx.addnodes import pending_xref

from catalogue import CLASSES, FLAT, Catalogue

_WORDS = re.compile(r"`([^`]+)`|(?<![\w./])([A-Za-z_]\w*\w|[A-Z]\w*_)(\*?)(?!\w)")


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
        for one in catalogue.known.constants:
            self._targets[one.name] = ("py", "data", f"{FLAT}.{one.name}")
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

    def code(self, text: str) -> nodes.literal:
        """A C or Python type, its names being links."""
        inner: List[nodes.Node] = []
        for part in re.split(r"(\w+)", text):
            link = self._link(part) if part else None
            inner.append(link if link is not None else nodes.Text(part))
        return nodes.literal("", "", *_unquoted(inner))

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
