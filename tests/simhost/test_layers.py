"""The layers of the simulated host: each finds those below it and none above."""

import os
import re
import shlex
import subprocess
from pathlib import Path
from typing import Dict, List

import pytest
from compile_commands import compile_commands

ROOT = Path(__file__).resolve().parents[2]
BUILD = Path(os.environ.get("BUILD_DIR", ROOT / "build"))

# A header of each layer, lowest first.
HEADERS = {
    "base": "base/outcomes.h",
    "storage": "storage/store.h",
    "clock": "clock/clock.h",
    "faults": "faults/faults.h",
    "model": "model/plane.h",
    "planes/stored": "planes/stored/stored_plane.h",
    "events": "events/loop.h",
    "planes/openvswitch/transport": "planes/openvswitch/transport/stream.h",
    "planes/openvswitch/openflow": "planes/openvswitch/openflow/connection.h",
    "planes/openvswitch/ovsdb": "planes/openvswitch/ovsdb/client.h",
    "planes/openvswitch/rows": "planes/openvswitch/rows/rows.h",
    "planes/openvswitch/reconcile": "planes/openvswitch/reconcile/difference.h",
    "planes/openvswitch/multicast": "planes/openvswitch/multicast/membership.h",
    "planes/openvswitch/beacons": "planes/openvswitch/beacons/hearing.h",
    "planes/openvswitch/compile": "planes/openvswitch/compile/compile.h",
    "planes/openvswitch/reading": "planes/openvswitch/reading/read_network.h",
    "planes/openvswitch/counting": "planes/openvswitch/counting/tally.h",
    "planes/openvswitch/processes": "planes/openvswitch/processes/private_openvswitch.h",
    "planes/openvswitch/line": "planes/openvswitch/line/line.h",
    "planes/openvswitch/trace": "planes/openvswitch/trace/story.h",
    "planes/openvswitch/caller": "planes/openvswitch/caller/openvswitch_plane.h",
    "scenario": "scenario/scenario.h",
    "fabric/shared": "fabric/shared/records.h",
    "fabric/caller": "fabric/caller/fabric_sharing.h",
    "abi": "abi/host.h",
    "daemon": "daemon/daemon.h",
    "fabric/cluster": "fabric/cluster/cluster.h",
    "fabric/rows": "fabric/rows/rows.h",
    "fabric/agent": "fabric/agent/agent.h",
    "cli": "cli/commands.h",
}
# The state, and the compiler of its switches.
COMPILER_OF_STATE = [
    "base",
    "storage",
    "clock",
    "model",
    "events",
    "planes/openvswitch/transport",
    "planes/openvswitch/openflow",
    "planes/openvswitch/multicast",
    "planes/openvswitch/beacons",
    "planes/openvswitch/compile",
]
# What the plane of those who use a state that a daemon serves may use.
CALLER = [
    *COMPILER_OF_STATE,
    "planes/openvswitch/reading",
    "planes/openvswitch/line",
    "planes/openvswitch/trace",
]
# What each may use.
BELOW: Dict[str, List[str]] = {
    "base": [],
    "storage": ["base"],
    "clock": ["base", "storage"],
    "faults": ["base", "storage"],
    "model": ["base", "storage", "clock"],
    "planes/stored": ["base", "storage", "clock", "model"],
    # Waiting, which anything that serves may do.
    "events": [],
    # Languages, of which the host knows nothing.
    "planes/openvswitch/transport": ["events"],
    "planes/openvswitch/openflow": ["planes/openvswitch/transport", "events"],
    "planes/openvswitch/ovsdb": ["planes/openvswitch/transport", "events"],
    "planes/openvswitch/reconcile": [
        "events",
        "planes/openvswitch/transport",
        "planes/openvswitch/openflow",
    ],
    # Who is a member of what, whatever frames and clocks there are.
    "planes/openvswitch/multicast": [
        "events",
        "planes/openvswitch/transport",
        "planes/openvswitch/openflow",
    ],
    # Who hears whom, likewise.
    "planes/openvswitch/beacons": [
        "events",
        "planes/openvswitch/transport",
        "planes/openvswitch/openflow",
    ],
    # A pure function, which cannot look at the state.
    "planes/openvswitch/compile": [
        "base",
        "events",
        "planes/openvswitch/transport",
        "planes/openvswitch/openflow",
        "planes/openvswitch/multicast",
        "planes/openvswitch/beacons",
    ],
    "planes/openvswitch/reading": COMPILER_OF_STATE,
    "planes/openvswitch/counting": COMPILER_OF_STATE,
    "planes/openvswitch/rows": [
        "events",
        "planes/openvswitch/transport",
        "planes/openvswitch/ovsdb",
    ],
    "planes/openvswitch/processes": ["events"],
    "planes/openvswitch/line": ["events"],
    "planes/openvswitch/trace": [
        "base",
        "events",
        "planes/openvswitch/transport",
        "planes/openvswitch/openflow",
        "planes/openvswitch/multicast",
        "planes/openvswitch/beacons",
        "planes/openvswitch/compile",
    ],
    "planes/openvswitch/caller": CALLER,
    "scenario": ["base", "storage", "clock", "faults", "model"],
    # What is shared is told in the words of documents, and decided by asking the daemon.
    "fabric/shared": ["base", "storage", "clock", "faults", "model", "scenario"],
    "fabric/caller": [
        *("base", "storage", "clock", "faults", "model", "scenario"),
        *("events", "planes/openvswitch/line", "fabric/shared"),
    ],
    "abi": [
        *CALLER,
        *("faults", "planes/stored", "planes/openvswitch/caller", "scenario"),
        *("fabric/shared", "fabric/caller"),
    ],
    "daemon": [
        one
        for one in HEADERS
        if one not in ("daemon", "cli", "fabric/cluster", "fabric/rows", "fabric/agent")
    ],
    "fabric/cluster": [
        "events",
        "planes/openvswitch/transport",
        "planes/openvswitch/ovsdb",
    ],
    "fabric/rows": [
        *("base", "storage", "clock", "faults", "model", "scenario"),
        *("planes/openvswitch/transport", "planes/openvswitch/ovsdb", "events", "fabric/shared"),
    ],
    "fabric/agent": [one for one in HEADERS if one not in ("fabric/agent", "cli")],
    # Of the layers below, only what any program may use.
    "cli": [],
}
API = "abi/simhost_api/simhost.h"
PRIVATE = "storage/query.h"
MOST_FILES = 25


def command_of(layer: str) -> List[str]:
    """The command that compiles a source of a layer, without the source and what it makes."""
    # The sources of the host's two libraries stand in folders of their own within the edge.
    source = re.compile(rf"/simhost/{layer}/(?!libvswitch|libnebPublic).*\.cpp$")
    entry = next(entry for entry in compile_commands(BUILD) if source.search(entry["file"]))
    words = shlex.split(entry["command"])
    return words[: words.index("-o")]


def preprocessed(
    layer: str, tmp_path: Path, *headers: str, text: str = ""
) -> "subprocess.CompletedProcess[str]":
    """What becomes of a source of a layer that includes headers: whether they are found there.

    That they compile there the build shows.
    """
    probe = tmp_path / "probe.cpp"
    lines = [f'#include "{header}"\n' for header in headers]
    probe.write_text("".join(lines) + text, encoding="utf-8")
    command = [*command_of(layer), "-E", "-o", os.devnull, str(probe)]
    return subprocess.run(command, cwd=BUILD, stderr=subprocess.PIPE, text=True, check=False)


@pytest.mark.parametrize("layer", BELOW)
def test_the_layers_below_are_found(layer: str, tmp_path: Path) -> None:
    headers = [HEADERS[layer], *(HEADERS[below] for below in BELOW[layer])]
    done = preprocessed(layer, tmp_path, *headers)
    assert done.returncode == 0, done.stderr


def found(layer: str, tmp_path: Path) -> List[str]:
    """The layers of which a source of this one could include a header."""
    lines = [
        f'#if __has_include("{one}")\n#error found: {one}.\n#endif' for one in HEADERS.values()
    ]
    done = preprocessed(layer, tmp_path, text="\n".join(lines))
    headers = re.findall(r"#error found: (\S+)\.$", done.stderr, re.MULTILINE)
    return [one for one, header in HEADERS.items() if header in headers]


@pytest.mark.parametrize("layer", BELOW)
def test_no_other_layer_is_found(layer: str, tmp_path: Path) -> None:
    assert found(layer, tmp_path) == [one for one in HEADERS if one in (layer, *BELOW[layer])]


def test_the_command_finds_what_any_program_does(tmp_path: Path) -> None:
    assert preprocessed("cli", tmp_path, API).returncode == 0


def test_queries_are_the_storage_s_own(tmp_path: Path) -> None:
    assert preprocessed("storage", tmp_path, PRIVATE).returncode == 0
    for layer, below in BELOW.items():
        if "storage" in below:
            done = preprocessed(layer, tmp_path, PRIVATE)
            assert f"{PRIVATE}: No such file or directory" in done.stderr, layer


def tracked(*folders: str) -> List[Path]:
    listed = subprocess.run(
        ["git", "ls-files", "-z", *folders], cwd=ROOT, stdout=subprocess.PIPE, text=True, check=True
    ).stdout
    return [ROOT / name for name in listed.split("\0") if name]


def outside_storage(path: Path) -> bool:
    return (ROOT / "simhost" / "storage") not in path.parents


def sqlite_includes(text: str) -> List[str]:
    """The database is the storage's own matter, exceptions and all."""
    return re.findall(r"^\s*#\s*include\s+<(?:SQLiteCpp/|sqlite3).*$", text, re.MULTILINE)


def test_only_the_storage_knows_its_database() -> None:
    inside = (ROOT / "simhost" / "storage" / "connection.h").read_text(encoding="utf-8")
    assert sqlite_includes(inside) != []
    found = {
        str(path): lines
        for path in tracked("simhost")
        if path.suffix in (".h", ".cpp") and path.exists() and outside_storage(path)
        for lines in [sqlite_includes(path.read_text(encoding="utf-8"))]
        if lines
    }
    assert found == {}


def upward_includes(text: str) -> List[str]:
    return re.findall(r'^\s*#\s*include\s+"\.\.?/.*$', text, re.MULTILINE)


def test_nothing_is_included_by_its_place() -> None:
    """A path from the file itself would lead past the include paths of its layer."""
    assert upward_includes('#include "../storage/query.h"\n') != []
    sources = [path for path in tracked("simhost", "helpers", "include") if path.suffix != ".md"]
    found = {
        str(path): lines
        for path in sources
        if path.suffix in (".h", ".cpp", ".i") and path.exists()
        for lines in [upward_includes(path.read_text(encoding="utf-8"))]
        if lines
    }
    assert found == {}


def test_each_source_is_of_a_layer() -> None:
    assert HEADERS.keys() == BELOW.keys()
    host = ROOT / "simhost"
    layers = [host / layer for layer in HEADERS]
    # What the build makes lists with is of none.
    sources = [one for one in tracked("simhost") if one.suffix == ".cpp" and one.parent != host]
    assert [path for path in sources if not any(one in path.parents for one in layers)] == []


def test_folders_are_small_enough_to_look_through() -> None:
    sizes: Dict[Path, int] = {}
    for path in tracked("simhost"):
        if path.exists():
            sizes[path.parent] = sizes.get(path.parent, 0) + 1
    assert {str(path): size for path, size in sizes.items() if size > MOST_FILES} == {}
