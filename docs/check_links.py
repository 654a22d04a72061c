"""Follows the links of a built site that stay in it: check_links.py FOLDER

Prints those that lead nowhere, be it to no file or to no place in one; then the status is 1.
"""

import sys
from dataclasses import dataclass, field
from html.parser import HTMLParser
from pathlib import Path
from typing import Dict, List, Optional, Tuple
from urllib.parse import unquote, urlsplit


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


def broken(site: Dict[str, Page]) -> List[str]:
    known = {page.path.resolve(): set(page.anchors) for page in site.values()}
    found = []
    for page in site.values():
        for link in page.links:
            parts = urlsplit(link)
            if parts.scheme or parts.netloc:
                continue
            path = (page.path.parent / unquote(parts.path)).resolve()
            target = path if parts.path else page.path.resolve()
            anchor = unquote(parts.fragment)
            if not target.exists() or (anchor and anchor not in known.get(target, {anchor})):
                found.append(f"{page.path.name}: {link}")
    return found


def main() -> int:
    found = broken(read(Path(sys.argv[1])))
    for line in found:
        print(f"a link that leads nowhere: {line}", file=sys.stderr)
    return 1 if found else 0


if __name__ == "__main__":
    sys.exit(main())
