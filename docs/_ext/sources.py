"""Describes classes that are written by hand in Python, from their source.

    .. classes-of:: python/libvswitch/cells.py Cell Callback
       :module: libvswitch

With `:given:`, objects of these classes are not the reader's to make. Nothing is imported: what the
modules need may be built for another interpreter.
"""

import ast
import inspect
import re
from typing import Any, Dict, Iterator, List, Optional, Tuple

from docutils import nodes
from docutils.parsers.rst import directives
from docutils.statemachine import StringList
from sphinx.addnodes import desc_content
from sphinx.application import Sphinx
from sphinx.util.docutils import SphinxDirective

from described import ROOT, read_catalogue


class ClassesOf(SphinxDirective):
    required_arguments = 2
    optional_arguments = 10
    option_spec = {"module": directives.unchanged_required, "given": directives.flag}

    def run(self) -> List[nodes.Node]:
        source, *names = self.arguments
        path = ROOT / source
        self.env.note_dependency(str(path))
        self._source = path.read_text(encoding="utf-8")
        tree = ast.parse(self._source)
        found = {node.name: node for node in tree.body if isinstance(node, ast.ClassDef)}
        missing = [name for name in names if name not in found]
        if missing:
            raise self.error(f"{source} has no class {missing[0]}")
        made: List[nodes.Node] = []
        for name in names:
            made += self._class(found[name])
        return made

    def _class(self, node: ast.ClassDef) -> List[nodes.Node]:
        name = f"{self.options['module']}.{node.name}"
        members = [one for one in node.body if isinstance(one, ast.FunctionDef)]
        init = next((one for one in members if one.name == "__init__"), None)
        is_made = init is not None and "given" not in self.options
        signature = f"({self._arguments(init)})" if init is not None and is_made else ""
        made, content = self._described("class", f"{name}{signature}")
        content.extend(self._text(ast.get_docstring(node)))
        for one in members:
            if ast.get_docstring(one) and _is_public(one.name):
                is_property = any(
                    isinstance(mark, ast.Name) and mark.id == "property"
                    for mark in one.decorator_list
                )
                kind = "property" if is_property else "method"
                call = "" if is_property else f"({self._arguments(one)})"
                inner, inside = self._described(kind, f"{name}.{one.name}{call}")
                inside.extend(self._text(ast.get_docstring(one)))
                content.extend(inner)
        return made

    def _described(self, kind: str, signature: str) -> Tuple[List[nodes.Node], Any]:
        parent = nodes.Element()
        lines = StringList([f".. py:{kind}:: {signature}"], "sources")
        self.state.nested_parse(lines, self.content_offset, parent)
        return list(parent.children), next(iter(parent.findall(desc_content)))

    def _text(self, text: Optional[str]) -> Iterator[nodes.Node]:
        words = read_catalogue(self.config.build_folder)[1]
        for part in re.split(r"\n\s*\n", inspect.cleandoc(text or "")):
            if part.startswith(">>>"):
                yield nodes.literal_block(part, part, language="pycon")
            else:
                yield from words.paragraphs(part)

    def _arguments(self, function: ast.FunctionDef) -> str:
        """The arguments without types, and without the one before the dot."""
        given = function.args
        first = [*given.posonlyargs, *given.args][1:]
        defaults = [None] * (len(first) - len(given.defaults)) + list(given.defaults)
        texts = [self._one(one.arg, default) for one, default in zip(first, defaults)]
        if given.kwonlyargs:
            named = zip(given.kwonlyargs, given.kw_defaults)
            texts += ["*", *(self._one(one.arg, default) for one, default in named)]
        return ", ".join(texts)

    def _one(self, name: str, default: Optional[ast.expr]) -> str:
        if default is None:
            return name
        return f"{name}={ast.get_source_segment(self._source, default)}"


def _is_public(name: str) -> bool:
    return not name.startswith("_") or name.startswith("__") and name != "__init__"


def setup(app: Sphinx) -> Dict[str, bool]:
    app.add_directive("classes-of", ClassesOf)
    return {"parallel_read_safe": True, "parallel_write_safe": True}
