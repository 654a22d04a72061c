"""The settings that sequences draw: those that are one number in so many bytes, as the build tells.

What the host is to do with them is said in host_model, by hand.
"""

import json
import os
from pathlib import Path
from typing import List

BUILD = Path(os.environ.get("BUILD_DIR", Path(__file__).parents[2] / "build"))
REFERENCE = BUILD / "simhost" / "properties.json"
NUMBERS = {"number", "boolean", "choice", "bits"}


def of(scope: str) -> List[str]:
    """The keys of a "switch" or a "port" whose bytes the host keeps as they are."""
    properties = json.loads(REFERENCE.read_text(encoding="utf-8"))["properties"]
    return [
        known["key"]
        for known in properties
        if known["scope"] == scope and known["value"]["form"] in NUMBERS and not known["computed"]
    ]
