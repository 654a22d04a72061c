"""Writes a manual page from what a program says of itself: make_manual_page.py PAGE PROGRAM

PAGE is a page in which @DESCRIPTION@, @COMMANDS@ and @OPTIONS@, or another title, stand alone on a
line for what --help says under it. PROGRAM is a file, or MODULE:FUNCTION, which makes commands of
click and is asked without a process for each of them.
"""

import importlib
import re
import subprocess
import sys
import textwrap
from pathlib import Path
from typing import Callable, Dict, Iterable, Iterator, List, NamedTuple, Sequence, Tuple

import click

Entry = Tuple[str, str]
Texts = Callable[[Sequence[str]], str]
"""What --help says of the command that these words name."""

# The programs have different libraries for their words, which have different titles.
ARGUMENTS = ("Positionals", "Arguments")
OPTIONS = "Options"
COMMANDS = ("Subcommands", "Commands")
EXIT_STATUS = "Exit status"

# So wide that nothing is wrapped.
WIDE = 10_000


class Help(NamedTuple):
    description: List[str]
    usage: str
    sections: Dict[str, List[Entry]]
    """By their titles: terms, each with what is said of it."""
    footer: List[str]

    def entries(self, *titles: str) -> Iterator[Entry]:
        for title in titles:
            yield from self.sections.get(title, [])


def texts_of(program: str) -> Texts:
    module, colon, function = program.partition(":")
    if colon:
        return texts_of_click(getattr(importlib.import_module(module), function)())

    def text(words: Sequence[str]) -> str:
        command = [program, *words, "--help"]
        return subprocess.run(command, check=True, stdout=subprocess.PIPE, encoding="utf-8").stdout

    return text


def texts_of_click(group: click.Group) -> Texts:
    def context_of(words: Sequence[str]) -> click.Context:
        if not words:
            return group.make_context(group.name, [], resilient_parsing=True, terminal_width=WIDE)
        above = context_of(words[:-1])
        assert isinstance(above.command, click.Group)
        command = above.command.commands[words[-1]]
        return command.make_context(words[-1], [], above, resilient_parsing=True)

    return lambda words: context_of(words).get_help()


def read(text: str) -> Help:
    found = Help([], "", {}, [])
    for block in text.strip().split("\n\n"):
        title, *lines = textwrap.dedent(block).splitlines()
        before, is_usage, usage = block.partition("Usage: ")
        if is_usage:
            found = found._replace(usage=usage, description=before.splitlines())
        elif title.rstrip(":") in (*ARGUMENTS, OPTIONS, *COMMANDS, EXIT_STATUS):
            found.sections[title.rstrip(":")] = list(entries(lines))
        elif found.sections:
            found.footer.extend([title, *lines])
        else:
            found.description.extend(["", title, *lines] if found.description else [title, *lines])
    return found


def entries(lines: Sequence[str]) -> Iterator[Entry]:
    """A term stands two columns in, what is said of it after it or on the next line."""
    for part in re.findall(r"^  \S.*(?:\n {3,}.*)*", "\n".join(lines), re.MULTILINE):
        term, *said = re.split(r"\s{2,}", part.strip())
        yield re.sub(r" REQUIRED| Excludes: \S+", "", term), " ".join(said)


def escaped(text: str) -> str:
    # What is to be typed keeps its quotes. At the start of a line a full stop would be a request.
    for plain, escape in (("\\", r"\e"), ("-", r"\-"), ("'", r"\(aq"), ("`", r"\(ga")):
        text = text.replace(plain, escape)
    return f"\\&{text}" if text.startswith(".") else text


def paragraphs(lines: Sequence[str]) -> Iterator[str]:
    for line in lines:
        yield escaped(line) if line else ".PP"


def terms(found: Iterable[Entry]) -> Iterator[str]:
    for term, said in found:
        if "--help" not in term:
            yield from (".TP", f"\\fB{escaped(term)}\\fR", escaped(said))


def footer(found: Help) -> Iterator[str]:
    if found.footer:
        yield from (".PP", ".nf", *map(escaped, found.footer), ".fi")


def commands(texts: Texts, above: Sequence[str], parent: Help) -> Iterator[str]:
    for name, _ in parent.entries(*COMMANDS):
        words = [*above, name]
        found = read(texts(words))
        description = list(paragraphs(found.description))
        yield f".SS {escaped(found.usage)}"
        yield from (*description[:-1], description[-1].rstrip(".") + ".")
        yield from terms(found.entries(*ARGUMENTS, OPTIONS))
        # A command without words of its own repeats those of the one above it.
        if found.footer != parent.footer:
            yield from footer(found)
        yield from commands(texts, words, found)


def page(template: str, texts: Texts) -> Iterator[str]:
    found = read(texts([]))
    said: Dict[str, Callable[[], Iterator[str]]] = {
        "DESCRIPTION": lambda: paragraphs(found.description),
        "COMMANDS": lambda: commands(texts, [], found),
    }
    for line in template.splitlines():
        title = line.strip("@")
        if f"@{title}@" != line:
            yield line
        elif title in said:
            yield from said[title]()
        else:
            yield from terms(found.entries(title.capitalize()))


if __name__ == "__main__":
    print("\n".join(page(Path(sys.argv[1]).read_text(encoding="utf-8"), texts_of(sys.argv[2]))))
