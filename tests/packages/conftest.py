"""What ./dev package made, and a real host to install it on."""

import os
import shutil
import subprocess
from pathlib import Path
from typing import Dict

import pytest
from roots import FOLDER, Root

HOST = ("libvswitch.so", "libnebPublic.so")
TOOLS = ("mmdebstrap", "unshare", "lintian", "cc", "nm", "swig")


def pytest_configure() -> None:
    """Nothing is skipped: what cannot be tested here is an error."""
    if os.geteuid() != 0:
        raise pytest.UsageError("installing packages into a root of their own takes root's rights")
    missing = [tool for tool in TOOLS if not shutil.which(tool)]
    if missing:
        raise pytest.UsageError(f"not found: {', '.join(missing)}")


@pytest.fixture(scope="session")
def debs() -> Dict[str, Path]:
    """The packages by their names, without those that only hold debug symbols."""
    found = {file.name.split("_")[0]: file for file in FOLDER.glob("*.deb")}
    return {name: file for name, file in found.items() if not name.endswith("-dbgsym")}


@pytest.fixture(scope="session")
def wheel() -> Path:
    (found,) = FOLDER.glob("*.whl")
    return found


@pytest.fixture(scope="session")
def real_host(tmp_path_factory: pytest.TempPathFactory) -> Path:
    """A folder with libraries that bear the names of a host's and return 4242 from every call."""
    built = FOLDER / "source" / "debian" / "python3-libvswitch"
    (module,) = built.glob("usr/lib/python3/dist-packages/_libvswitch.*.so")
    said = subprocess.run(["nm", "-D", "-u", module], check=True, capture_output=True, text=True)
    # The C library's have a version, the interpreter's its prefix.
    wanted = [line.split()[-1] for line in said.stdout.splitlines()]
    calls = [name for name in wanted if "@" not in name and not name.startswith(("Py", "_"))]
    assert len(calls) == 146
    folder = tmp_path_factory.mktemp("real_host")
    sources = {
        HOST[0]: "".join(f"int {name}(void) {{ return 4242; }}\n" for name in calls),
        HOST[1]: "",
    }
    for name, source in sources.items():
        subprocess.run(
            ["cc", "-shared", "-fPIC", f"-Wl,-soname,{name}", "-o", folder / name, "-xc", "-"],
            input=source.encode("ascii"),
            check=True,
        )
    return folder


@pytest.fixture(scope="module")
def root(request: pytest.FixtureRequest) -> Root:
    """A root for all tests of a file."""
    return Root(request.module.__name__)
