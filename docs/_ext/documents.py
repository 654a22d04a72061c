"""Documents that live with the code which they describe, and a picture that a machine must make.

A page whose whole text is `document: PATH` is that document of the tree, links to other documents
leading to their pages here. `bench-picture` shows what ./dev bench drew, if it did.
"""

import re
from datetime import date
from os.path import relpath
from pathlib import Path
from typing import Dict, List

from docutils import nodes
from sphinx.application import Sphinx
from sphinx.util.docutils import SphinxDirective

ROOT = Path(__file__).resolve().parents[2]
PAGES = {
    "simhost/README.md": "/more/simulated_host.md",
    "simhost/python/README.md": "/more/plugin.md",
    "simhost/SCENARIOS.md": "/more/scenarios.md",
    "simhost/planes/openvswitch/compile/README.md": "/more/pipeline.md",
    "bench/README.md": "/more/bench.md",
    "include/README.md": "/more/headers.md",
    "packaging/README.md": "/more/packages.md",
    "tests/README.md": "/more/tests.md",
}
_LINK = re.compile(r"\[([^\]]+)\]\((?!https?:|#)([^)#]+)\)")


def take_document(app: Sphinx, page: str, source: List[str]) -> None:
    named = re.fullmatch(r"document: (\S+)\s*", source[0])
    if named is None:
        return
    path = ROOT / named[1]
    app.env.note_dependency(str(path))

    def link(match: "re.Match[str]") -> str:
        target = relpath((path.parent / match[2]).resolve(), ROOT)
        # What is no document is a file of the tree, and has no page here.
        return f"[{match[1]}]({PAGES[target]})" if target in PAGES else match[1]

    source[0] = _LINK.sub(link, path.read_text(encoding="utf-8"))


class BenchPicture(SphinxDirective):
    def run(self) -> List[nodes.Node]:
        picture = Path(self.config.build_folder) / "bench/calls.svg"
        self.env.note_dependency(str(picture))
        if not picture.exists():
            text = "There is no picture here, for the bench has not run on this machine: "
            advice = nodes.paragraph("", text, nodes.literal(text="./dev bench"))
            advice += nodes.Text(" draws it, and the next ")
            advice += nodes.literal(text="./dev docs")
            advice += nodes.Text(" shows it.")
            return [nodes.note("", advice)]
        made = date.fromtimestamp(picture.stat().st_mtime)
        caption = f"The module beside its peers, as measured on this machine on {made:%d %B %Y}."
        image = nodes.image(uri="/" + relpath(picture, self.env.srcdir), alt=caption)
        return [nodes.figure("", image, nodes.caption(text=caption))]


def setup(app: Sphinx) -> Dict[str, bool]:
    app.connect("source-read", take_document)
    app.add_directive("bench-picture", BenchPicture)
    return {"parallel_read_safe": True, "parallel_write_safe": True}
