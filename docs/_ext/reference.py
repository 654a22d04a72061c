"""The reference pages: directives that describe what the headers declare.

    .. calls:: vswitch/queries.h       every call of a header
    .. helpers::                       the module's own functions, and arrays
    .. records:: vswitch/lags.h        every record of headers, its bytes as a picture
    .. constants:: qexapi/links.h      the constants of headers, by family
    .. types::                         the other names of C types
    .. overview:: calls                a table of all calls, or of all records
    .. record-picture:: VSMACLearning  a picture alone
"""

from typing import Dict

from docutils import nodes
from sphinx.application import Sphinx

from call_pages import Calls, Helpers
from constant_pages import Constants
from described import read_catalogue
from overviews import Overview, Types
from record_pages import RecordPicture, Records


def _link_literals(app: Sphinx, document: nodes.document) -> None:
    # The reference's own pages have a link where they mean one.
    if not app.env.docname.startswith("reference/"):
        read_catalogue(app.config.build_folder)[1].link_literals(document)


def setup(app: Sphinx) -> Dict[str, bool]:
    app.add_config_value("build_folder", "", "env")
    app.connect("doctree-read", _link_literals)
    app.add_directive("calls", Calls)
    app.add_directive("helpers", Helpers)
    app.add_directive("records", Records)
    app.add_directive("constants", Constants)
    app.add_directive("types", Types)
    app.add_directive("overview", Overview)
    app.add_directive("record-picture", RecordPicture)
    return {"parallel_read_safe": True, "parallel_write_safe": True}
