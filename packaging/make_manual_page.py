"""Writes the manual page of simhostctl from what its --help says: make_manual_page.py SIMHOSTCTL"""

import re
import subprocess
import sys
from typing import Dict, Iterator, List, NamedTuple, Sequence, Tuple

FRONT = r""".TH SIMHOSTCTL 1 "" libvswitch "User Commands"
.SH NAME
simhostctl \- look at a simulated virtual-switch host and change it
.SH SYNOPSIS
.B simhostctl
.RB [ \-\-state
.IR FILE ]
.I COMMAND
.RI [ ARGUMENT ...]
.SH DESCRIPTION"""

BACK = r""".SH ENVIRONMENT
.TP
.B SIMHOST_STATE
The file that holds the state of the host; one that does not exist becomes a new host.
.TP
.B SIMHOST_SCENARIO
The scenario document of a new state; the default host unless set.
.SH SEE ALSO
README.md and SCENARIOS.md of the package say what the host models and what documents may hold."""

Entry = Tuple[str, str]


class Help(NamedTuple):
    description: str
    usage: str
    sections: Dict[str, List[Entry]]
    """Positionals, Options and Subcommands: terms, each with what is said of it."""
    footer: List[str]


def read(program: str, words: Sequence[str]) -> Help:
    done = subprocess.run(
        [program, *words, "--help"], check=True, stdout=subprocess.PIPE, encoding="utf-8"
    )
    head, *blocks = done.stdout.strip().split("\n\n")
    description, usage = head.split("\nUsage: ")
    found = Help(description, usage, {}, [])
    for block in blocks:
        title, *lines = block.splitlines()
        if title in ("Positionals:", "Options:", "Subcommands:"):
            found.sections[title[:-1]] = list(entries(lines))
        else:
            found.footer.extend(block.splitlines())
    return found


def entries(lines: Sequence[str]) -> Iterator[Entry]:
    """A term stands two columns in, what is said of it after it or on the next line."""
    for part in re.findall(r"^  \S.*(?:\n {3,}.*)*", "\n".join(lines), re.MULTILINE):
        term, *said = re.split(r"\s{2,}", part.strip())
        yield re.sub(r" REQUIRED| Excludes: \S+", "", term), " ".join(said)


def escaped(text: str) -> str:
    # At the start of a line a full stop or an apostrophe would be a request.
    return re.sub(r"^([.'])", r"\\&\1", text.replace("\\", r"\e").replace("-", r"\-"))


def terms(found: Help) -> Iterator[str]:
    for section in ("Positionals", "Options"):
        for term, said in found.sections.get(section, []):
            if "--help" not in term:
                yield from (".TP", f"\\fB{escaped(term)}\\fR", escaped(said))


def footer(found: Help) -> Iterator[str]:
    if found.footer:
        yield from (".PP", ".nf", *map(escaped, found.footer), ".fi")


def commands(program: str, above: Sequence[str], parent: Help) -> Iterator[str]:
    for name, _ in parent.sections.get("Subcommands", []):
        words = [*above, name]
        found = read(program, words)
        yield from (f".SS {escaped(found.usage)}", escaped(found.description) + ".")
        yield from terms(found)
        # A command without words of its own repeats those of the one above it.
        if found.footer != parent.footer:
            yield from footer(found)
        yield from commands(program, words, found)


def page(program: str) -> Iterator[str]:
    found = read(program, [])
    yield from (FRONT, escaped(found.description), ".SH OPTIONS", *terms(found), ".SH COMMANDS")
    yield from commands(program, [], found)
    yield BACK


if __name__ == "__main__":
    print("\n".join(page(sys.argv[1])))
