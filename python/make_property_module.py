"""Makes vswitch/_properties.py from the reference of the properties, and of what else things have.

usage: make_property_module.py PROPERTIES.JSON _PROPERTIES.PY
"""

import json
import pprint
import sys

HEAD = '''"""The settings of switches and ports, the host's options, and bounds and defaults beside.

Written by python/make_property_module.py.
"""
'''


def main() -> None:
    """Reads one and writes the other."""
    source, target = sys.argv[1:]
    with open(source, encoding="utf-8") as file:
        reference = json.load(file)
    with open(target, "w", encoding="utf-8") as file:
        file.write(HEAD)
        for name in ("properties", "runtime_options"):
            held = pprint.pformat(tuple(reference[name]), width=100, sort_dicts=False)
            file.write(f"\n{name.upper()} = {held}\n")
        numbers = {
            thing: {one["name"]: (one["least"], one["greatest"]) for one in has if "least" in one}
            for thing, has in reference["objects"].items()
        }
        defaults = {
            thing: {one["name"]: one["default"] for one in has if "default" in one}
            for thing, has in reference["objects"].items()
        }
        fabric = reference["objects"]["fabric"]
        for name, said in (("NUMBERS", numbers), ("DEFAULTS", defaults), ("FABRIC", fabric)):
            held = pprint.pformat(said, width=100, sort_dicts=False)
            file.write(f"\n{name} = {held}\n")
        file.write(f"\nLONGEST_KEY = {reference['longest_key']}\n")


if __name__ == "__main__":
    main()
