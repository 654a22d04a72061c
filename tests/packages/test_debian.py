"""The Debian packages, each installed into a root, used there and purged.

The tests go on where the one before left the root: it ends as it began.
"""

import re
import subprocess
import sysconfig
from pathlib import Path
from typing import Dict, Iterator, List, Set, Tuple

import pytest
from debian_packages import NAMES, field, install, satisfy
from on_a_machine import HOST, Machine
from roots import FOLDER, Root

ROOT = Path(__file__).resolve().parents[2]
TRIPLET = str(sysconfig.get_config_var("MULTIARCH"))
SIMHOST = f"/usr/lib/{TRIPLET}/libvswitch-simhost"
TESTERS = "python3-pytest, mypy"


@pytest.fixture(scope="module")
def before(root: Root, debs: Dict[str, Path]) -> Set[str]:
    """The files of the root with all that the packages ask for, and what tests them."""
    satisfy(root, list(debs.values()))
    root.satisfy(TESTERS)
    return root.files()


@pytest.fixture(scope="module")
def machine(root: Root, debs: Dict[str, Path], before: Set[str]) -> Machine:
    assert before
    # Nothing else had to come: the packages say all that they need.
    assert install(root, list(debs.values())) == set(NAMES)
    return Machine(root, "/usr/bin/python3", "/usr/bin")


def test_they_are_what_is_made(debs: Dict[str, Path]) -> None:
    assert sorted(debs) == list(NAMES)


def lintian(*options: str) -> "subprocess.CompletedProcess[str]":
    (changes,) = FOLDER.glob("*.changes")
    strict = [
        "--allow-root",
        "--display-info",
        "--pedantic",
        "--fail-on=error,warning,info,pedantic",
    ]
    return subprocess.run(
        ["lintian", *strict, *options, changes], capture_output=True, text=True, timeout=600
    )


def test_lintian_has_nothing_to_say() -> None:
    done = lintian()
    assert (done.returncode, done.stdout) == (0, ""), done.stdout + done.stderr


def overrides() -> List[Tuple[str, str]]:
    """Each exception with the line above it."""
    found = []
    for file in (ROOT / "packaging" / "debian").glob("*.lintian-overrides"):
        above = ""
        for line in file.read_text(encoding="utf-8").splitlines():
            if line and not line.startswith("#"):
                found.append((line, above))
            above = line
    return found


def test_each_exception_has_a_reason_and_is_one() -> None:
    listed = overrides()
    assert listed
    assert all(above.startswith("# ") for _, above in listed), listed
    done = lintian("--no-override")
    assert done.returncode != 0
    tags = [line.split(": ", 2)[2].split(" ")[0] for line in done.stdout.splitlines()]
    assert sorted(tags) == sorted(line.split(" ")[0] for line, _ in listed)


def test_the_version_is_that_of_the_project(debs: Dict[str, Path], wheel: Path) -> None:
    version = (ROOT / "VERSION").read_text(encoding="ascii").strip()
    assert {field(deb, "Version") for deb in debs.values()} == {version}
    assert wheel.name.split("-")[1] == version


def test_the_module_needs_nothing_of_the_simulated_host(debs: Dict[str, Path]) -> None:
    for kind in ("Pre-Depends", "Depends", "Recommends"):
        assert "simhost" not in field(debs["python3-libvswitch"], kind)
    assert "python3" in field(debs["python3-libvswitch"], "Depends")


def test_the_simulated_host_is_found(machine: Machine) -> None:
    machine.finds_simulated_host(SIMHOST)


def test_the_examples_run(machine: Machine) -> None:
    machine.runs_the_examples("/usr/share/doc/python3-libvswitch/examples")


def test_simhostctl_controls_the_host(machine: Machine) -> None:
    machine.controls_the_host()


def test_the_plugin_is_found(machine: Machine) -> None:
    machine.runs_tests_with_the_plugin()


def test_type_checkers_find_the_stubs(machine: Machine) -> None:
    machine.type_checks()


def test_python_knows_the_versions(machine: Machine, debs: Dict[str, Path]) -> None:
    program = (
        "from importlib.metadata import version; print(version('libvswitch'), version('simhost'))"
    )
    version = field(debs["python3-libvswitch"], "Version")
    assert machine.program(program).split() == [version, version]


@pytest.fixture(params=[f"/usr/lib/{TRIPLET}", "/usr/lib", "/opt/host/lib"])
def folder_of_the_real_host(request: pytest.FixtureRequest, root: Root) -> Iterator[str]:
    """Places where a real host may keep its libraries, known to the loader."""
    folder: str = request.param
    configuration = root.path("/etc/ld.so.conf.d/host.conf")
    if folder.startswith("/opt"):
        configuration.write_text(f"{folder}\n", encoding="ascii")
    yield folder
    for name in HOST:
        root.path(f"{folder}/{name}").unlink()
    if folder.startswith("/opt"):
        configuration.unlink()
        root.run("rm", "-r", "/opt/host")
    root.run("ldconfig")


def test_a_real_host_comes_before_the_simulated_one(
    machine: Machine, real_host: Path, folder_of_the_real_host: str
) -> None:
    assert machine.answer_of_the_host() != 4242
    for name in HOST:
        machine.root.put(real_host / name, folder_of_the_real_host)
    machine.root.run("ldconfig")
    assert machine.answer_of_the_host() == 4242
    found = machine.doctor()
    assert (found["is_well"], found["simulated"]) == (True, False)
    assert found["host"][HOST[0]] == f"{folder_of_the_real_host}/{HOST[0]}"
    # Whoever wants to try something out asks for the other one.
    assert machine.answer_of_the_host(LD_LIBRARY_PATH=SIMHOST) != 4242
    assert machine.doctor(LD_LIBRARY_PATH=SIMHOST)["simulated"] is True


def words_of_the_help(root: Root, program: str, *above: str) -> Set[str]:
    """Its commands, their commands, and all options."""
    said = root.run(program, *above, "--help")
    found = set(re.findall(r"^  (?:-h, ?)?(--[a-z-]+)", said, re.MULTILINE))
    _, _, listed = said.partition("ommands:\n")
    for command in re.findall(r"^  ([a-z]+) ", listed.partition("\n\n")[0], re.MULTILINE):
        words = (*above, command)
        found |= {" ".join(words)} | words_of_the_help(root, program, *words)
    return found - {"--help"}


@pytest.mark.parametrize(
    "program, some",
    [
        ("simhostctl", {"show", "--state", "clock step", "--exception"}),
        ("vswitch", {"show", "--confirm-within", "completion"}),
    ],
)
def test_the_manual_page_has_every_command_and_option(
    machine: Machine, program: str, some: Set[str]
) -> None:
    page = machine.root.run("zcat", f"/usr/share/man/man1/{program}.1.gz").replace("\\-", "-")
    words = words_of_the_help(machine.root, program)
    assert some <= words
    assert [each for each in sorted(words) if not re.search(rf"(?<![a-z-]){each}\b", page)] == []


# The root has no compiler and no generator, so those of this machine read what is installed there.


def headers(machine: Machine) -> str:
    return f"-I{machine.root.path('/usr/include/libvswitch')}"


def test_a_program_is_built_with_the_headers(machine: Machine, tmp_path: Path) -> None:
    (tmp_path / "program.c").write_text(
        '#include "simhost.h"\n#include "vswitch/configuration.h"\n#include <stdio.h>\n'
        'int main(void) {\n  printf("%d ", VSDVS_SetMTU("vswitch0", 9000));\n'
        '  printf("%d\\n", simhost_clock_stop());\n}\n',
        encoding="ascii",
    )
    libraries = machine.root.path(SIMHOST)
    compile_ = ["cc", "-Wall", "-Werror", headers(machine), "program.c", "-o", "program"]
    link = [
        f"-L{libraries}",
        f"-Wl,-rpath-link,{libraries}",
        "-lvswitch",
        "-lnebPublic",
        "-lsimhost",
    ]
    subprocess.run(compile_ + link, cwd=tmp_path, check=True)
    # The loader finds the host for any program, not for Python alone.
    assert machine.root.run(machine.root.put(tmp_path / "program", "/tmp")) == "0 0\n"


def test_a_module_shares_records_with_the_installed_one(machine: Machine, tmp_path: Path) -> None:
    (tmp_path / "sharing.i").write_text(
        '%module sharing\n%{\n#include "vswitch/switch_info.h"\n%}\n'
        '%import "qexapi/types.h"\n%import "vswitch/switch_info.h"\n'
        "%inline %{ unsigned mtu_of(VSInfo *info) { return info->mtu; } %}\n",
        encoding="ascii",
    )
    include = f"-I{sysconfig.get_path('include')}"
    for command in (
        ["swig", "-python", "-builtin", "-Wall", "-Werror", headers(machine), "sharing.i"],
        ["cc", "-shared", "-fPIC", headers(machine), include, "-o", "_sharing.so"]
        + ["sharing_wrap.c"],
    ):
        subprocess.run(command, cwd=tmp_path, check=True)
    for name in ("sharing.py", "_sharing.so"):
        machine.root.put(tmp_path / name, "/tmp")
    program = (
        "import _libvswitch as vs, sharing; info = vs.new_VSInfo();"
        " vs.VSQEX_GetVSInfo('vswitch0', info); print(sharing.mtu_of(info)); vs.delete_VSInfo(info)"
    )
    assert machine.program(program) == "1500\n"


def test_the_definitions_are_whole(machine: Machine, tmp_path: Path) -> None:
    """The generator makes the module of them, as it did of those of this tree."""
    interface = machine.root.path("/usr/share/libvswitch/interface")
    subprocess.run(
        ["swig", "-python", "-noproxy", "-nofastunpack", "-Wall", "-Werror", headers(machine)]
        + [f"-I{interface / 'frame'}", f"-I{interface}", "-outdir", str(tmp_path)]
        + ["-o", str(tmp_path / "wrap.c"), str(interface / "libvswitch.i")],
        check=True,
    )
    built = FOLDER / "source" / f"obj-{TRIPLET}" / "interface" / "libvswitch_wrap.c"
    assert (tmp_path / "wrap.c").read_bytes() == built.read_bytes()


def test_nothing_is_left_after_purging(machine: Machine, before: Set[str]) -> None:
    root = machine.root
    added = root.files() - before
    assert f"{SIMHOST}/libvswitch.so" in added
    root.run("apt-get", "purge", "-q", "-y", *NAMES)
    assert root.files() ^ before == set()
    assert "libvswitch" not in root.run("ldconfig", "-p")
    assert root.run("dpkg-query", "-W", "-f", "${Package} ${Status}\n").count("libvswitch") == 0


def test_on_a_real_host_the_module_stands_alone(debs: Dict[str, Path], real_host: Path) -> None:
    root = Root("real_host")
    added = install(root, [debs["python3-libvswitch"]])
    assert "python3-libvswitch" in added and "libvswitch-simhost" not in added
    assert not {"libvswitch-command", "python3-click", "python3-typer"} & added
    machine = Machine(root, "/usr/bin/python3", "/usr/bin")

    # Before its host is there, it says what to do.
    found = machine.doctor()
    assert found["host"] == {name: None for name in HOST}
    (advice, *_) = [one["advice"] for one in found["findings"] if one["about"] == "host"]
    assert "LD_LIBRARY_PATH" in advice and "libvswitch-simhost" in advice

    for name in HOST:
        root.put(real_host / name, f"/usr/lib/{TRIPLET}")
    assert machine.answer_of_the_host() == 4242
    found = machine.doctor()
    assert (found["is_well"], found["simulated"]) == (True, False)
    assert not [file for file in root.files("/usr") if "simhost" in file]
    assert (
        machine.program("import vswitch; print(vswitch.Host(simulated=False).simulated)")
        == "False\n"
    )
