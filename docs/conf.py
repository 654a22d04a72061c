"""The site, as Sphinx is told. ./dev docs builds it."""

import os
import sys
from pathlib import Path

HERE = Path(__file__).resolve().parent
# The extensions, and what reads the definitions and the statuses' texts for them.
sys.path[:0] = [str(HERE / "_ext"), str(HERE.parent / "python")]
sys.path.append(str(HERE.parent / "simhost/abi/libvswitch"))

project = "libvswitch"
author = "the authors of libvswitch"
project_copyright = author
version = release = (HERE.parent / "VERSION").read_text(encoding="ascii").strip()
html_title = f"libvswitch {version} for Python"

extensions = ["myst_parser", "documents", "reference", "sources"]
build_folder = os.environ.get("BUILD_DIR", str(HERE.parent / "build"))
exclude_patterns = ["_ext", "_static"]

nitpicky = True
toc_object_entries_show_parents = "hide"
add_function_parentheses = False
smartquotes = False
add_module_names = True
myst_heading_anchors = 3
pygments_style = "tango"
pygments_dark_style = "tango"  # there is no dark form of the theme, see site.css
# Only colour is lost where a quoted text of a shell session goes on in the next line.
suppress_warnings = ["misc.highlighting_failure"]
highlight_language = "none"

html_theme = "furo"
html_static_path = ["_static"]
html_css_files = ["site.css"]
html_search_scorer = str(HERE / "search_scorer.js")
html_copy_source = False
html_show_sphinx = False
html_show_copyright = False
html_theme_options = {"navigation_with_keys": True}
