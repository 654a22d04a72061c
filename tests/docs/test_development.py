"""The files that documents name are there, and the pages for those who develop this."""

import os
import re
from pathlib import Path, PurePosixPath
from typing import Dict, List, Set

import pytest
from check_links import Page
from conftest import ROOT
from documents import PAGES as ELSEWHERE

PAGES = sorted((ROOT / "docs/development").glob("*.md"))
DOCUMENTS = [
    *sorted((ROOT / "docs").glob("**/*.md")),
    *(ROOT / document for document in sorted(ELSEWHERE)),
    ROOT / "README.md",
    ROOT / "CONTRIBUTING.md",
]
# What the build writes, and where the wheel has it.
MADE = {"calls.md", "properties.md", "simhost/lib"}


def ends_of_paths() -> Set[str]:
    """Files and folders of the tree, by their paths and by the ends of those."""
    found: Set[str] = set()
    for folder, folders, files in os.walk(ROOT):
        folders[:] = [one for one in folders if not one.startswith(("build", ".", "__"))]
        for name in [*folders, *files]:
            parts = PurePosixPath(folder, name).relative_to(ROOT).parts
            found.update("/".join(parts[at:]) for at in range(len(parts)))
    return found


THERE = ends_of_paths()
TOPS = {top.name for top in ROOT.iterdir() if not top.name.startswith(("build", "."))}


def missing(text: str) -> List[str]:
    """The files and folders that a text names in code, and that are not in the tree."""
    named = re.findall(r"`((?:[\w.-]+/)*[\w.-]*\w/?)`", text)
    files = [
        one
        for one in named
        if re.search(r"\w\.(?:py|cpp|h|i|sh|md|txt)$", one) or one.split("/")[0] in TOPS
    ]
    return [one for one in files if one.rstrip("/") not in THERE and one not in MADE]


def where(document: Path) -> str:
    return str(document.relative_to(ROOT))


@pytest.mark.parametrize("document", DOCUMENTS, ids=where)
def test_the_files_that_are_named_are_there(document: Path) -> None:
    assert missing(document.read_text(encoding="utf-8")) == []


def test_a_file_that_is_not_there_would_be_found() -> None:
    text = "see `helpers/none.cpp`, `docs/none/`, `_none.py`, `helpers/names.cpp`, `_table.py`"
    assert missing(text) == ["helpers/none.cpp", "docs/none/", "_none.py"]


def test_each_layer_is_a_folder_and_has_its_row() -> None:
    text = (ROOT / "docs/development/architecture.md").read_text(encoding="utf-8")
    rows = set(re.findall(r"`simhost/(\w+)`", text))
    folders = {one.name for one in (ROOT / "simhost").iterdir() if one.is_dir()}
    assert folders - {"python", "__pycache__"} <= rows <= folders


def test_each_page_is_on_the_site(site: Dict[str, Page]) -> None:
    for page in PAGES:
        assert f"development/{page.stem}.html" in site
    assert "development/architecture.html" in site["index.html"].links
