"""The pages for those who develop this: the files that they name are there."""

import re
from pathlib import Path
from typing import Dict, List

import pytest
from check_links import Page
from conftest import ROOT

PAGES = sorted((ROOT / "docs/development").glob("*.md"))
DOCUMENTS = [*PAGES, ROOT / "CONTRIBUTING.md"]
TOPS = {top.name for top in ROOT.iterdir() if not top.name.startswith(("build", "."))}


def missing(text: str) -> List[str]:
    """The files and folders that a text names in code, and that are not in the tree."""
    named = re.findall(r"`([\w.]+/[\w./]*|\w+\.md)`", text)
    return [one for one in named if one.split("/")[0] in TOPS and not (ROOT / one).exists()]


def stem(page: Path) -> str:
    return page.stem


@pytest.mark.parametrize("page", DOCUMENTS, ids=stem)
def test_the_files_that_are_named_are_there(page: Path) -> None:
    assert missing(page.read_text(encoding="utf-8")) == []


def test_a_file_that_is_not_there_would_be_found() -> None:
    assert missing("see `helpers/none.cpp`, `docs/none/`, `helpers/names.cpp`") == [
        "helpers/none.cpp",
        "docs/none/",
    ]


def test_each_layer_is_a_folder_and_has_its_row() -> None:
    text = (ROOT / "docs/development/architecture.md").read_text(encoding="utf-8")
    rows = set(re.findall(r"`simhost/(\w+)`", text))
    folders = {one.name for one in (ROOT / "simhost").iterdir() if one.is_dir()}
    assert folders - {"python", "__pycache__"} <= rows <= folders


def test_each_page_is_on_the_site(site: Dict[str, Page]) -> None:
    for page in PAGES:
        assert f"development/{page.stem}.html" in site
    assert "development/architecture.html" in site["index.html"].links
