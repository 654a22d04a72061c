"""Makes a table of the properties, for people, from the one for programs.

usage: make_property_table.py PROPERTIES.JSON PROPERTIES.MD
"""

import json
import sys
from typing import Any, Dict, List

Property = Dict[str, Any]

OWNERS = {"switch": "Of a switch", "host": "Of the host's part of a switch", "port": "Of a port"}


def accepted(value: Property) -> str:
    """What values there are, in a few words."""
    form = value["form"]
    if form in ("number", "range"):
        return f"{value['least']:,} to {value['greatest']:,}"
    if form == "boolean":
        return "`true` or `false`"
    if form == "choice":
        return " or ".join(f"`{word}`" for word in value["choices"])
    if form == "bits":
        return "any of " + ", ".join(f"`{word}`" for word in value["choices"])
    if form == "text":
        return f"up to {value['most_bytes']} bytes"
    if form in ("record", "one_of"):
        return ", ".join(f"`{member['name']}`" for member in value["members"])
    if form == "list":
        return f"up to {value['most']:,}, each: {accepted(value['element'])}"
    return ""


def default_of(known: Property) -> str:
    """What stands for it while it is not set."""
    if "inherits" in known:
        return f"the switch's `{known['inherits']}`"
    if isinstance(known.get("default"), (dict, list)):
        return f"`{json.dumps(known['default'])}`"
    return f"`{json.dumps(known['default'])}`" if "default" in known else ""


def access_to(known: Property) -> str:
    """How callers reach it."""
    if known["read_only"]:
        return "only read"
    access = "typed and raw" if known["typed"] else "raw"
    return access + (", computed" if known["computed"] else "")


def name_of(known: Property) -> str:
    """What documents call it."""
    if "part_of" in known:
        return f"`{known['part_of']['name']}.{known['part_of']['member']}`"
    return f"`{known['name']}`" if "name" in known else ""


def frames_of(known: Property) -> str:
    """What frames make of it, where a daemon moves some."""
    if known["frames"] == "kept":
        return "kept, without effect"
    return "obeyed" + (f"; not {known['beyond_frames']}" if "beyond_frames" in known else "")


def row_of(known: Property) -> List[str]:
    """A property as a row."""
    return [
        f"`{known['key']}`",
        name_of(known),
        known["bytes"],
        accepted(known["value"]),
        default_of(known),
        known["type"],
        access_to(known),
        frames_of(known),
        known["words"],
    ]


def table(properties: List[Property]) -> List[str]:
    """The lines of a table."""
    head = ["Key", "In documents", "Bytes", "Accepted", "Unless set", "Type", "Access"]
    head += ["By frames", ""]
    rows = [head, ["---"] * len(head), *map(row_of, properties)]
    return ["| " + " | ".join(row) + " |" for row in rows]


def main() -> None:
    """Reads one and writes the other."""
    source, target = sys.argv[1:]
    with open(source, encoding="utf-8") as file:
        properties = json.load(file)["properties"]
    lines = ["# Properties of switches and ports"]
    for scope, title in OWNERS.items():
        of_scope = [known for known in properties if known["scope"] == scope]
        lines += ["", f"## {title}", "", *table(of_scope)]
    with open(target, "w", encoding="utf-8") as file:
        file.write("\n".join(lines) + "\n")


if __name__ == "__main__":
    main()
