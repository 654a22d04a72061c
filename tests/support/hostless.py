"""The module where no host can be found."""

import os
import shutil
from pathlib import Path

__all__ = ["without_host"]


def without_host(made: Path) -> Path:
    """A folder with the module as it is built, in `python` of it, beside which there is no host."""
    built, python = Path(os.environ["BUILD_DIR"]), made / "python"
    python.mkdir()
    for one in (built / "python").iterdir():
        # The loader looks beside the file itself, not beside what a link leads to.
        if one.name.startswith("_libvswitch."):
            shutil.copy(one, python)
        else:
            (python / one.name).symlink_to(one)
    (made / "recordings").symlink_to(built / "recordings")
    return made
