"""Pages of the site as tests look at them: anchors, links, and the text below an anchor."""

from dataclasses import dataclass, field
from html.parser import HTMLParser
from pathlib import Path
from typing import Dict, List, Optional, Tuple


@dataclass
class Page:
    path: Path
    anchors: List[str] = field(default_factory=list)
    links: List[str] = field(default_factory=list)
    text: str = ""
    starts: Dict[str, int] = field(default_factory=dict)  # of anchors, in the text

    def below(self, anchor: str, length: int = 100_000) -> str:
        """The text from an anchor on."""
        return self.text[self.starts[anchor] :][:length]


class _Reader(HTMLParser):
    def __init__(self, page: Page) -> None:
        super().__init__()
        self.page = page
        self._parts: List[str] = []
        self._length = 0

    def handle_starttag(self, tag: str, attrs: List[Tuple[str, Optional[str]]]) -> None:
        given = dict(attrs)
        anchor = given.get("id")
        if anchor:
            self.page.anchors.append(anchor)
            self.page.starts[anchor] = self._length
        for name in ("href", "src"):
            link = given.get(name)
            if link:
                self.page.links.append(link)

    def handle_data(self, data: str) -> None:
        self._parts.append(data)
        self._length += len(data)

    def close(self) -> None:
        super().close()
        self.page.text = "".join(self._parts)


def read(folder: Path) -> Dict[str, Page]:
    found: Dict[str, Page] = {}
    for path in sorted(folder.rglob("*.html")):
        page = Page(path)
        reader = _Reader(page)
        reader.feed(path.read_text(encoding="utf-8"))
        reader.close()
        found[str(path.relative_to(folder))] = page
    assert found
    return found
