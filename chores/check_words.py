"""Holds the tree to the field's words: check_words.py [FOLDER]

Code, pages and tests say a thing in the word that the field has for it, so that nobody needs a
dictionary; docs/development/glossary.md has them. Prints each line that says it otherwise, and the
word to take instead. The status is 1 if there is one.
"""

import re
import sys
from pathlib import Path
from typing import Iterator, List, NamedTuple, Pattern, Tuple

SUFFIXES = {".c", ".cpp", ".h", ".i", ".inc", ".py", ".pyi", ".sh", ".md", ".rst", ".txt", ".cmake"}
SUFFIXES |= {".in", ".toml", ".json", ".svg", ".css", ".js"}
NAMES = {"dev", "run", "rules", "control"}

# Folders whose words are still to be taken over, and who reads them until then.
NOT_CONVERTED: List[str] = []

# They name the words to say which those are.
EXEMPT = {
    "chores/check_words.py": "the list itself",
    "tests/chores/test_words.py": "plants each of them",
}


class Rule(NamedTuple):
    """What is not said, the word for it, and where it is right all the same, with the reason."""

    unwanted: Pattern[str]
    instead: str
    allowed: Pattern[str]
    why: str
    # Elsewhere the same word may be plain English.
    only_below: Tuple[str, ...] = ("",)


HOST = ("simhost",)
PRODUCT = (*HOST, "docs", "examples", "helpers", "include", "interface", "python", "recordings")


def rule(
    unwanted: str,
    instead: str,
    allowed: str = r"(?!)",
    why: str = "",
    below: Tuple[str, ...] = ("",),
) -> Rule:
    return Rule(
        re.compile(unwanted, re.IGNORECASE), instead, re.compile(allowed, re.IGNORECASE), why, below
    )


RULES = [
    rule(
        r"\bfront door\b|\bdoors?\b",
        "deallocator (of memory), typed call or raw call (of a property), command",
    ),
    rule(r"\b(?:giv(?:e|es|en|ing)|gave) up\b", "the call traps; a trap"),
    rule(
        r"\bpanic(?:s|ked|king)?\b",
        "the call traps; a trap",
        r"\bPanic\b(?! of\b)",
        "Panic is a function of C",
    ),
    rule(
        r"\b(?:springs|sprang|springing)\b",
        "the call traps; a trap",
        r"\bspr(?:ings|ang|inging) (?:\w+ ){0,2}trap\b",
        "to spring the trap is what a library does to the module's buffer",
    ),
    rule(
        r"\banswer(?:s|ed|ing)\b|\b(?:to|can|cannot|may|must|will|would|not|should) answer\b",
        "returns",
    ),
    rule(
        r"\banswer\b",
        "result, status",
        r"[\"']answer[\"']|\| Answer \|",
        "a column of calls.json and calls.md, which programs read",
        below=PRODUCT,
    ),
    rule(r"\bhand(?:s|ed|ing)? (?:\w+ )?out\b", "allocates (memory), returns (values)"),
    rule(
        r"\b(?:giv(?:e|es|en|ing)|gave|goes|go|went) (?:\w+ ){0,2}back\b",
        "releases",
        r"\bgiven back twice\b|\bnot given back\b",
        "the ledger's texts, which users rely on",
    ),
    rule(
        r"\bbehind\b",
        "pointee, trailing, next",
        r"\b(?:left|leaves?|leaving|stays?|staying|remains?) (?:\w+ ){0,3}behind\b",
        "what stays behind lies after nothing",
    ),
    rule(
        r"\bwhat runs\b",
        "the runtime state; running",
        r"\bwhat runs the switches\b",
        "a plane does",
    ),
    rule(r"\bfurnish\w*\b|\bmeet_faults\b", "populate, inject"),
    rule(r"\bstrikes?\(|\baside\(", "apply, unlocked", below=HOST),
    rule(
        r"\bknown_\w+\(|(?<!> )(?<![>.:])\b(?:found|required)\(",
        "find_*, get_*, require_*",
        below=HOST,
    ),
    rule(r"\bTransaction (?:const )?&work\b|\bwork\.", "transaction", below=HOST),
    rule(
        r"\bdescribed\(|\bis_said_whole\b|\bkept_elsewhere\b",
        "to_json, round_trips, computed",
        below=HOST,
    ),
]


class Finding(NamedTuple):
    place: str
    line: int
    said: str
    instead: str

    def __str__(self) -> str:
        return f"{self.place}:{self.line}: '{self.said}'; say: {self.instead}"


def texts(root: Path, left_out: List[str]) -> Iterator[Path]:
    """The files of the tree that are held to the words."""
    for path in sorted(root.rglob("*")):
        place = path.relative_to(root)
        if place.parts[0].startswith("build") or any(part[0] == "." for part in place.parts):
            continue
        if path.suffix not in SUFFIXES and path.name not in NAMES or not path.is_file():
            continue
        outside = any(place == Path(one) or Path(one) in place.parents for one in left_out)
        if not outside and str(place) not in EXEMPT:
            yield path


def spoken(line: str) -> str:
    """The line with the words of its identifiers apart."""
    return re.sub(r"_|(?<=[a-z0-9])(?=[A-Z])", " ", line)


def unwanted(one: Rule, line: str) -> Iterator[str]:
    right = [found.span() for found in one.allowed.finditer(line)]
    for found in one.unwanted.finditer(line):
        if not any(start <= found.start() and found.end() <= end for start, end in right):
            yield found[0]


def findings(root: Path, left_out: List[str]) -> Iterator[Finding]:
    for path in texts(root, left_out):
        place = str(path.relative_to(root))
        text = path.read_text(encoding="utf-8")
        texts_of_it = (text, spoken(text))
        # Most rules meet no word of a file; a search of the whole of it says so at once.
        rules = [
            one
            for one in RULES
            if place.startswith(one.only_below) and any(map(one.unwanted.search, texts_of_it))
        ]
        for number, line in enumerate(text.splitlines() if rules else (), start=1):
            for one in rules:
                # Some rules are of identifiers as they are written.
                found = [*unwanted(one, line)] or [*unwanted(one, spoken(line))]
                yield from (Finding(place, number, said, one.instead) for said in found)


def main(root: Path) -> int:
    found = list(findings(root, NOT_CONVERTED))
    for one in found:
        print(one)
    return 1 if found else 0


if __name__ == "__main__":
    sys.exit(main(Path(sys.argv[1]) if len(sys.argv) > 1 else Path.cwd()))
