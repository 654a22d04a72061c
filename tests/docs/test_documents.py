"""The documents: each is a page of the site, and leads somewhere wherever it is installed."""

import doctest
import os
import re
from pathlib import Path
from typing import Dict, List

import pytest
from conftest import ROOT
from check_links import Page
from documents import PAGES
from simhost import SharedHost

PACKAGING = ROOT / "packaging"
INSTALLED = PACKAGING / "installed/README.md"
LINK = re.compile(r"\]\((?!https?:|#)([^)#]+)")


def links(document: Path) -> List[str]:
    return LINK.findall(document.read_text(encoding="utf-8"))


def documents_of(package: str) -> Dict[str, Path]:
    """What a Debian package puts into its folder of documents, by the name that it has there."""
    found = {}
    for line in (PACKAGING / f"debian/{package}.docs").read_text().splitlines():
        (source,) = ROOT.glob(line)
        found[source.name] = source
    more = PACKAGING / f"debian/{package}.install"
    for line in more.read_text().splitlines() if more.exists() else ():
        source, folder = ROOT / line.split()[0], line.split()[1]
        beside = os.path.relpath(folder, f"usr/share/doc/{package}")
        found[os.path.normpath(f"{beside}/{source.name}")] = source
    return found


def lost(documents: Dict[str, Path]) -> List[str]:
    """Links that lead to none of the documents beside."""
    return [
        f"{name}: {link}"
        for name, source in documents.items()
        for link in links(source)
        if os.path.normpath(os.path.join(os.path.dirname(name), link)) not in documents
    ]


def packages() -> List[str]:
    return sorted(file.stem for file in (PACKAGING / "debian").glob("*.docs"))


@pytest.mark.parametrize("package", packages())
def test_the_documents_of_a_package_lead_to_each_other(package: str) -> None:
    assert lost(documents_of(package)) == []


def test_a_link_out_of_a_package_would_be_found() -> None:
    found = lost({"README.md": ROOT / "README.md"})
    assert "README.md: docs/architecture.svg" in found
    assert "README.md: simhost/python/README.md" in found


def test_the_simulated_host_brings_its_documents() -> None:
    expected = {"README.md", "SCENARIOS.md", "python/README.md", "scenario/default_host.json"}
    assert set(documents_of("libvswitch-simhost")) == expected


def test_the_description_of_the_wheel_leads_nowhere_else() -> None:
    project = (ROOT / "pyproject.toml").read_text(encoding="utf-8")
    assert re.findall(r'^readme = "(.*)"$', project, re.MULTILINE) == [
        str(INSTALLED.relative_to(ROOT))
    ]
    assert links(INSTALLED) == []


def test_the_session_of_what_is_installed(shared_host: SharedHost) -> None:
    program = (
        "import doctest, sys; result = doctest.testfile(sys.argv[1], module_relative=False); "
        "print(result.attempted); sys.exit(result.failed)"
    )
    done = shared_host.run(["/usr/bin/python3", "-c", program, INSTALLED])
    assert (done.returncode, done.stderr) == (0, ""), done.stdout
    examples = doctest.DocTestParser().get_examples(INSTALLED.read_text(encoding="utf-8"))
    assert int(done.stdout) == len(examples) > 3


def test_each_document_is_a_page(site: Dict[str, Page]) -> None:
    # The front page and the short text for what is installed are said in the site's own words.
    folders = ("bench", "include", "packaging", "simhost", "tests")
    found = {
        str(file.relative_to(ROOT))
        for folder in folders
        for file in (ROOT / folder).rglob("README.md")
    }
    assert found - {str(INSTALLED.relative_to(ROOT))} == set(PAGES) - {"simhost/SCENARIOS.md"}
    for document, page in PAGES.items():
        heading = (ROOT / document).read_text(encoding="utf-8").splitlines()[0].lstrip("# ")
        assert heading.replace("`", "") in site[page.strip("/").replace(".md", ".html")].text


def test_the_table_of_causes_is_the_one_of_the_front_page(site: Dict[str, Page]) -> None:
    text = site["guides/porting.html"].text
    table = (ROOT / "README.md").read_text(encoding="utf-8").split("| What you see")[1]
    causes = table.split("\n\n")[0].splitlines()[2:]
    assert len(causes) > 5
    for cause in causes:
        seen = cause.split(" | ")[0].strip("| `")
        assert " ".join(seen.split()) in " ".join(text.split())
    assert "../more/packages.html" in site["guides/porting.html"].links
