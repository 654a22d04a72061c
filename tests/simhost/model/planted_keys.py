"""Whether the list of the settings compiles with the headers as they are, and not with others.

usage: planted_keys.py COMPILER REGISTRY GENERATOR INCLUDE [LAYER...]

A key that no descriptor has, and a descriptor whose key no header has, must each fail the build, in
words that say so.
"""

import subprocess
import sys
import tempfile
from pathlib import Path
from typing import Dict, Optional

FAMILIES = {"common": "qexapi/switch_properties.h", "vendor": "vswitch/properties.h"}
NEW_KEY = '#define VSPROP_PLANTED "com.quorix.vswitch.planted"\n'
MTU = '#define VSPROP_MTU "com.quorix.vswitch.mtu"\n'


def main() -> int:
    """Compiles the list with each set of headers."""
    compiler, registry, generator, include, *layers = sys.argv[1:]

    def complaint(listed: str, included: Optional[str] = None) -> str:
        """What the compiler says; its own header is the one that is listed unless given."""
        with tempfile.TemporaryDirectory() as folder:
            return compiled(Path(folder), {"vendor": listed}, included or listed)

    def compiled(folder: Path, changed: Dict[str, str], included: str) -> str:
        lists = []
        for family, header in FAMILIES.items():
            path = folder / "listed" / header
            path.parent.mkdir(parents=True)
            unchanged = (Path(include) / header).read_text(encoding="utf-8")
            path.write_text(changed.get(family, unchanged), encoding="utf-8")
            lists.append(f"{family}={path}")
        shown = folder / "shown" / FAMILIES["vendor"]
        shown.parent.mkdir(parents=True)
        shown.write_text(included, encoding="utf-8")
        made = folder / "shown" / "property_constants.inc"
        subprocess.run([sys.executable, generator, made, *lists], check=True)
        paths = [f"-I{path}" for path in (folder / "shown", *layers, include)]
        done = subprocess.run(
            [compiler, "-std=c++20", "-fsyntax-only", *paths, registry],
            stderr=subprocess.PIPE,
            encoding="utf-8",
            check=False,
        )
        return done.stderr if done.returncode != 0 else ""

    real = (Path(include) / FAMILIES["vendor"]).read_text(encoding="utf-8")
    assert MTU in real
    end = real.rindex("#endif")
    more = real[:end] + NEW_KEY + real[end:]
    expected = [
        (complaint(real), ""),
        (complaint(more), "VSPROP_PLANTED has no descriptor"),
        (complaint(real.replace(MTU, "")), "VSPROP_MTU"),
        (
            complaint(real.replace(MTU, ""), real),
            "a descriptor's key is no constant of the headers",
        ),
    ]
    wrong = [
        (said, part) for said, part in expected if part not in said or bool(said) != bool(part)
    ]
    for said, part in wrong:
        print(f"expected {part!r}, but the compiler says:\n{said}")
    return 1 if wrong else 0


if __name__ == "__main__":
    sys.exit(main())
