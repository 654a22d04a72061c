"""The words of the tree: what is not said is caught, and what is right all the same is not."""

import subprocess
from pathlib import Path
from typing import List

import pytest
from check_words import EXEMPT, NOT_CONVERTED, findings

ROOT = Path(__file__).resolve().parents[2]

UNWANTED = [
    "the door of a block",
    "what the host gives up on",
    "it panics",
    "the trap is armed and springs",
    "the call answers a status",
    "so that it can answer",
    "what a call hands out",
    "what was handed out",
    "memory goes back to it",
    "it is given back",
    "the bytes behind the pointer",
    "what runs is asked",
    "furnish the host",
    "object_behind(pointer)",
    "RECORDS_BEHIND_POINTERS",
    "TEST(Door, TakesWhatWasHandedOut)",
]

RIGHT = [
    "the memory at 0x1 is given back twice: a gave it out, b took it back",
    "memory that is not given back",
    "Panic(text) writes its text",
    "the library springs the trap",
    'row["answer"], which programs read',
    "| Call | Library | Answer |",
    "no switch stays behind",
    "it returns a status",
]

OF_THE_PRODUCT = ["the answer of the host", "answer_of(call)"]

OF_THE_HOST = [
    "void strike(Fault);",
    "auto found(Handle);",
    "Transaction &work",
    "known_port(name)",
]


def said(tree: Path, place: str, line: str) -> List[str]:
    path = tree / place
    path.parent.mkdir(parents=True, exist_ok=True)
    path.write_text(f"nothing to see\n{line}\n", encoding="utf-8")
    return sorted({f"{one.place}:{one.line}" for one in findings(tree, [])})


@pytest.mark.parametrize("line", UNWANTED)
@pytest.mark.parametrize("place", ["simhost/abi/a.cpp", "docs/page.md", "dev", "tests/test_a.py"])
def test_an_unwanted_word_is_caught(tmp_path: Path, place: str, line: str) -> None:
    assert said(tmp_path, place, line) == [f"{place}:2"]


@pytest.mark.parametrize("line", RIGHT)
def test_what_is_right_is_not(tmp_path: Path, line: str) -> None:
    assert said(tmp_path, "simhost/a.cpp", line) == []


@pytest.mark.parametrize("line", OF_THE_PRODUCT)
def test_the_product_is_held_to_more_words(tmp_path: Path, line: str) -> None:
    assert said(tmp_path, "tests/a.cpp", line) == []
    assert said(tmp_path, "python/a.py", line) == ["python/a.py:2"]


@pytest.mark.parametrize("line", OF_THE_HOST)
def test_names_are_held_to_the_words_in_the_simulated_host(tmp_path: Path, line: str) -> None:
    assert said(tmp_path, "bench/a.cpp", line) == []
    assert said(tmp_path, "simhost/a.cpp", line) == ["simhost/a.cpp:2"]


def test_what_is_built_is_not_read(tmp_path: Path) -> None:
    assert said(tmp_path, "build-fuzzers/a.cpp", UNWANTED[0]) == []
    assert said(tmp_path, ".git/a.py", UNWANTED[0]) == []


def test_a_finding_fails_and_says_what_to_say_instead(tmp_path: Path) -> None:
    said(tmp_path, "chores/a.py", "it panics")
    command = ["/usr/bin/python3", str(ROOT / "chores/check_words.py"), str(tmp_path)]
    done = subprocess.run(command, stdout=subprocess.PIPE, encoding="utf-8")
    assert done.stdout == "chores/a.py:2: 'panics'; say: the call traps; a trap\n"
    assert done.returncode == 1


def test_what_is_left_out_is_there() -> None:
    for place in (*EXEMPT, *NOT_CONVERTED):
        assert (ROOT / place).exists(), place


def test_the_tree_says_things_in_its_words() -> None:
    assert [str(one) for one in findings(ROOT, NOT_CONVERTED)] == []
