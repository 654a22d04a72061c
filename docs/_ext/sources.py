"""Describes classes that are written by hand in Python, from their source.

    .. classes-of:: python/libvswitch/cells.py Cell Callback
       :module: libvswitch

With `:given:`, objects of these classes are not the reader's to make. With `:inherited:`, what a
class has from bases of the same package is described with it, unless that is abstract. Nothing is
imported: what the modules need may be built for another interpreter.
"""

import ast
import inspect
import re
from functools import lru_cache
from pathlib import Path
from typing import Any, Dict, Iterable, Iterator, List, NamedTuple, Optional, Tuple, Union

from docutils import nodes
from docutils.parsers.rst import directives
from docutils.statemachine import StringList
from sphinx.addnodes import desc_content
from sphinx.application import Sphinx
from sphinx.util.docutils import SphinxDirective

from described import ROOT, read_catalogue


class Source(NamedTuple):
    """A file of Python, and the classes in it."""

    path: Path
    text: str
    tree: ast.Module

    @property
    def classes(self) -> Dict[str, ast.ClassDef]:
        return {node.name: node for node in self.tree.body if isinstance(node, ast.ClassDef)}

    def said(self, node: ast.expr) -> str:
        return " ".join((ast.get_source_segment(self.text, node) or "").split())


@lru_cache(maxsize=None)
def read_source(path: Path) -> Source:
    text = path.read_text(encoding="utf-8")
    return Source(path, text, ast.parse(text))


class Member(NamedTuple):
    """A part of a class: its name, its arguments in a signature, and what it says."""

    kind: str
    name: str
    signature: str
    text: str


class ClassesOf(SphinxDirective):
    required_arguments = 2
    optional_arguments = 20
    option_spec = {
        "module": directives.unchanged_required,
        "given": directives.flag,
        "inherited": directives.flag,
    }

    def run(self) -> List[nodes.Node]:
        named, *names = self.arguments
        source = read_source(ROOT / named)
        self.env.note_dependency(str(source.path))
        missing = [name for name in names if name not in source.classes]
        if missing:
            raise self.error(f"{named} has no class {missing[0]}")
        made: List[nodes.Node] = []
        for name in names:
            made += self._class(source, source.classes[name])
        return made

    def _class(self, source: Source, node: ast.ClassDef) -> List[nodes.Node]:
        name = f"{self.options['module']}.{node.name}"
        signature = "" if "given" in self.options else _construction(source, node)
        made, content = self._described("class", f"{name}{signature}")
        content.extend(self._text(ast.get_docstring(node)))
        having = [(source, node)]
        if "inherited" in self.options:
            having += _bases(source, node)
        for member in _first_of_each(having):
            inner, inside = self._described(member.kind, f"{name}.{member.name}{member.signature}")
            inside.extend(self._text(member.text))
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


def _construction(source: Source, node: ast.ClassDef) -> str:
    """The arguments with which an object is made: those of `__init__`, or the fields of a value."""
    for one in node.body:
        if isinstance(one, ast.FunctionDef) and one.name == "__init__":
            return f"({_arguments(source, one)})"
    fields = [
        _with_default(source, one.target.id, one.value)
        for one in node.body
        if isinstance(one, ast.AnnAssign)
        and isinstance(one.target, ast.Name)
        and not one.target.id.startswith("_")
    ]
    return f"({', '.join(fields)})" if _is_marked(node, "dataclass") else ""


def _first_of_each(having: Iterable[Tuple[Source, ast.ClassDef]]) -> Iterator[Member]:
    """What classes have, each member where its name comes first."""
    told = set()
    for source, node in having:
        for member in _members(source, node):
            if member.name not in told:
                told.add(member.name)
                yield member


def _bases(source: Source, node: ast.ClassDef) -> Iterator[Tuple[Source, ast.ClassDef]]:
    for base in node.bases:
        found = _find_class(source, base.id) if isinstance(base, ast.Name) else None
        if found is not None:
            yield found
            yield from _bases(*found)


def _find_class(source: Source, name: str) -> Optional[Tuple[Source, ast.ClassDef]]:
    """A class of this file, or of another one of the package from which it is taken."""
    if name in source.classes:
        return source, source.classes[name]
    package = source.path.parent
    for one in source.tree.body:
        if isinstance(one, ast.ImportFrom) and name in [taken.name for taken in one.names]:
            folder, _, module = (one.module or "").rpartition(".")
            if folder == package.name:
                other = read_source(package / f"{module}.py")
                return other, other.classes[name]
    return None


def _members(source: Source, node: ast.ClassDef) -> Iterator[Member]:
    for one in node.body:
        if isinstance(one, ast.AnnAssign):
            yield from _setting(source, one)
        elif isinstance(one, ast.FunctionDef) and _is_public(one.name):
            text = ast.get_docstring(one)
            if text is None or _is_marked(one, "abstractmethod"):
                continue
            if _is_marked(one, "property"):
                yield Member("property", one.name, "", text)
            else:
                yield Member("method", one.name, f"({_arguments(source, one)})", text)


def _setting(source: Source, node: ast.AnnAssign) -> Iterator[Member]:
    """A setting is declared with the types of what is read and of what is written."""
    kind = node.annotation
    if not (isinstance(kind, ast.Subscript) and source.said(kind.value) == "Setting"):
        return
    assert isinstance(node.target, ast.Name) and isinstance(kind.slice, ast.Tuple)
    read, written = (source.said(one) for one in kind.slice.elts)
    text = f"A setting, `{read}`"
    text += "." if read == written else f"; takes `{written}`."
    yield Member("attribute", node.target.id, "", text)


def _is_marked(node: Union[ast.ClassDef, ast.FunctionDef], mark: str) -> bool:
    """Whether a decorator of that name stands above a class or a function."""
    marks = [one.func if isinstance(one, ast.Call) else one for one in node.decorator_list]
    return mark in [
        one.attr if isinstance(one, ast.Attribute) else getattr(one, "id", "") for one in marks
    ]


def _arguments(source: Source, function: ast.FunctionDef) -> str:
    """The arguments without types, and without the one before the dot."""
    given = function.args
    first = [*given.posonlyargs, *given.args][1:]
    defaults = [None] * (len(first) - len(given.defaults)) + list(given.defaults)
    texts = [_with_default(source, one.arg, value) for one, value in zip(first, defaults)]
    if given.kwonlyargs:
        named = zip(given.kwonlyargs, given.kw_defaults)
        texts += ["*", *(_with_default(source, one.arg, value) for one, value in named)]
    if given.kwarg:
        texts.append(f"**{given.kwarg.arg}")
    return ", ".join(texts)


def _with_default(source: Source, name: str, default: Optional[ast.expr]) -> str:
    return name if default is None else f"{name}={source.said(default)}"


def _is_public(name: str) -> bool:
    return not name.startswith("_") or name.startswith("__") and name != "__init__"


def setup(app: Sphinx) -> Dict[str, bool]:
    app.add_directive("classes-of", ClassesOf)
    return {"parallel_read_safe": True, "parallel_write_safe": True}
