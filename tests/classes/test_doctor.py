"""The doctor names what is wrong, survives it, and says what to do."""

import json
import os
import shutil
import subprocess
import sys
from pathlib import Path
from typing import Any, Dict, List, Set, Tuple

import functions
import pytest
from libvswitch import _elf, _examination

FOLDER = Path(os.environ["BUILD_DIR"], "python")
SIMHOST = Path(os.environ["BUILD_DIR"], "simhost")
HOST = ("libvswitch.so", "libnebPublic.so")


def run(
    python: Path = FOLDER, host: str = "", *arguments: str
) -> "subprocess.CompletedProcess[str]":
    environment = {**os.environ, "PYTHONPATH": str(python)}
    environment.pop("LD_LIBRARY_PATH", None)
    if host:
        environment["LD_LIBRARY_PATH"] = host
    return subprocess.run(
        [sys.executable, "-m", "libvswitch.doctor", *arguments],
        cwd="/",
        env=environment,
        capture_output=True,
        text=True,
        timeout=120,
    )


def report(done: "subprocess.CompletedProcess[str]") -> Dict[str, Any]:
    assert done.stderr == ""
    found: Dict[str, Any] = json.loads(done.stdout)
    assert found["is_well"] == (done.returncode == 0)
    return found


def errors(found: Dict[str, Any]) -> List[str]:
    return [one["about"] for one in found["findings"] if one["level"] == "error"]


def text_of(found: Dict[str, Any], about: str) -> str:
    return " ".join(one["text"] for one in found["findings"] if one["about"] == about)


@pytest.fixture
def elsewhere(tmp_path: Path) -> Path:
    """A copy of the built package and module, where no host is beside them."""
    shutil.copytree(FOLDER, tmp_path / "one" / "python")
    return tmp_path / "one" / "python"


def library(folder: Path, name: str, source: str, *words: str) -> None:
    folder.mkdir(exist_ok=True)
    (folder / "library.c").write_text(source, encoding="ascii")
    subprocess.run(
        ["cc", "-shared", "-fPIC", f"-Wl,-soname,{name}", "-o", name, "library.c", *words],
        cwd=folder,
        check=True,
    )


def every_call_but(lacking: Set[str]) -> str:
    """The source of a library that has the host's calls, which do nothing."""
    calls = {function.name for function in functions.read() if function.kind == "call"}
    return "".join(f"void {name}(void) {{}}\n" for name in sorted(calls - lacking))


CLASS, DATA, MACHINE = 4, 5, 18


def planted(folder: Path, at: int, value: int) -> str:
    """A folder with the simulated host's libraries, one byte of each changed."""
    folder.mkdir()
    for name in HOST:
        held = bytearray((SIMHOST / name).read_bytes())
        held[at] = value
        (folder / name).write_bytes(held)
    return str(folder)


def loads(python: Path, host: str) -> bool:
    """What the loader itself makes of it."""
    environment = {**os.environ, "PYTHONPATH": str(python), "LD_LIBRARY_PATH": host}
    words = [sys.executable, "-c", "import _libvswitch"]
    return subprocess.run(words, cwd="/", env=environment, capture_output=True).returncode == 0


def test_a_good_build_is_well() -> None:
    done = run()
    assert done.returncode == 0, done.stdout
    for part in ("All is well.", sys.executable, str(FOLDER), "146 calls", "the host is simulated"):
        assert part in done.stdout
    found = report(run(FOLDER, "", "--json"))
    assert found["simulated"] is True
    assert found["missing_symbols"] == []
    for name in HOST:
        assert os.path.samefile(found["host"][name], SIMHOST / name)
    assert "size of 85 records" in text_of(found, "records")


def test_no_module(tmp_path: Path) -> None:
    shutil.copytree(FOLDER / "libvswitch", tmp_path / "libvswitch")
    found = report(run(tmp_path, "", "--json"))
    assert errors(found) == ["module"]
    assert "no _libvswitch in" in text_of(found, "module")


def test_a_module_for_another_interpreter(elsewhere: Path) -> None:
    (module,) = elsewhere.glob("_libvswitch*.so")
    module.rename(elsewhere / "_libvswitch.cpython-27-x86_64-linux-gnu.so")
    found = report(run(elsewhere, "", "--json"))
    assert errors(found) == ["module"]
    assert "is for another interpreter" in text_of(found, "module")


def test_a_module_for_another_machine(elsewhere: Path) -> None:
    (module,) = elsewhere.glob("_libvswitch*.so")
    held = bytearray(module.read_bytes())
    held[18] = 0xF3
    module.write_bytes(held)
    found = report(run(elsewhere, "", "--json"))
    assert errors(found) == ["module"]
    assert "is for riscv64, this machine is x86_64" in text_of(found, "module")


@pytest.mark.parametrize("length", [0, 4, 64, 5000])
def test_a_module_that_was_cut_off(elsewhere: Path, length: int) -> None:
    (module,) = elsewhere.glob("_libvswitch*.so")
    module.write_bytes(module.read_bytes()[:length])
    assert errors(report(run(elsewhere, "", "--json"))) == ["module"]


def test_no_host(elsewhere: Path) -> None:
    found = report(run(elsewhere, "", "--json"))
    assert errors(found) == ["host", "host", "loading"]
    assert found["host"] == {name: None for name in HOST}
    assert "LD_LIBRARY_PATH" in found["findings"][2]["advice"]


def test_a_host_that_lacks_calls(elsewhere: Path, tmp_path: Path) -> None:
    lacking = {"VSDVS_GetMTU", "DVSData_Free"}
    library(tmp_path / "host", "libvswitch.so", every_call_but(lacking))
    library(tmp_path / "host", "libnebPublic.so", "")
    found = report(run(elsewhere, str(tmp_path / "host"), "--json"))
    assert errors(found) == ["symbols", "loading"]
    assert found["missing_symbols"] == sorted(lacking)
    assert "lacks 2 of 146 calls" in text_of(found, "symbols")


def test_many_missing_calls_are_counted(elsewhere: Path, tmp_path: Path) -> None:
    for name in HOST:
        library(tmp_path / "host", name, "")
    done = run(elsewhere, str(tmp_path / "host"))
    assert done.returncode == 1
    (line,) = [line for line in done.stdout.splitlines() if " symbols " in line]
    assert "the host lacks 146 of 146 calls: DVPortExist, DVSAliasTo" in line
    assert line.endswith(" and 141 more, all of which --json names")
    assert len(line.split(", ")) == 6
    assert len(report(run(elsewhere, str(tmp_path / "host"), "--json"))["missing_symbols"]) == 146


def test_what_another_library_has_is_no_call(
    tmp_path: Path, monkeypatch: pytest.MonkeyPatch
) -> None:
    for name in HOST:
        library(tmp_path, name, "")
    library(tmp_path, "libother.so", "void helps(void) {}\n")
    source = "void helps(void), DVPortExist(void); void go(void) { helps(); DVPortExist(); }\n"
    library(tmp_path, "module.so", source, "-Wl,--no-as-needed", "./libother.so")
    monkeypatch.setenv("LD_LIBRARY_PATH", str(tmp_path))
    found = _examination.Report()
    host = [_elf.read(tmp_path / name) for name in HOST]
    _examination._symbols(found, _elf.read(tmp_path / "module.so"), host)
    (finding,) = found.findings
    assert finding.text == "the host lacks 1 of 1 calls: DVPortExist"


SIMULATION = ("SIMHOST_STATE", "SIMHOST_SCENARIO")


def test_a_simulated_host_without_variables(monkeypatch: pytest.MonkeyPatch) -> None:
    for name in SIMULATION:
        monkeypatch.delenv(name, raising=False)
    found = report(run(FOLDER, "", "--json"))
    assert found["simulation"] == {name: None for name in SIMULATION}
    assert text_of(found, "simulation") == (
        "SIMHOST_STATE is not set: the host is in memory "
        "for a fresh host SIMHOST_SCENARIO is not set: it is the usual one "
        "a call of the host succeeds"
    )


def simulated_error() -> Tuple[str, str]:
    """What the doctor says with these variables set, and what it advises."""
    found = report(run(FOLDER, "", "--json"))
    assert errors(found) == ["simulation"]
    assert found["simulation"] == {name: os.environ.get(name) for name in SIMULATION}
    (error,) = [one for one in found["findings"] if one["level"] == "error"]
    return error["text"], error["advice"]


def test_a_state_that_cannot_be_used(tmp_path: Path, monkeypatch: pytest.MonkeyPatch) -> None:
    monkeypatch.delenv("SIMHOST_SCENARIO", raising=False)
    for file in (tmp_path / "nowhere" / "host.db", tmp_path):
        monkeypatch.setenv("SIMHOST_STATE", str(file))
        text, advice = simulated_error()
        assert text.startswith("no call of the host succeeds: OSError: ")
        assert f"the state file {file} cannot be used: " in text
        assert advice == "correct what SIMHOST_STATE tells the host, or unset it"


def test_a_scenario_that_cannot_be_used(tmp_path: Path, monkeypatch: pytest.MonkeyPatch) -> None:
    scenario = tmp_path / "scenario.json"
    scenario.write_text('{"switches": [{"alias": "s", "mtu": 99}]}', encoding="ascii")
    monkeypatch.delenv("SIMHOST_STATE", raising=False)
    monkeypatch.setenv("SIMHOST_SCENARIO", str(scenario))
    text, advice = simulated_error()
    assert text.endswith(
        f"the scenario {scenario} cannot be used: switches[0].mtu: 99 is below 1280"
    )
    assert advice == "correct what SIMHOST_SCENARIO tells the host, or unset it"

    # The same where it would be the beginning of a host in a file, which the doctor does not make.
    monkeypatch.setenv("SIMHOST_STATE", str(tmp_path / "host.db"))
    assert simulated_error()[0] == text


def test_the_doctor_makes_no_host(tmp_path: Path, monkeypatch: pytest.MonkeyPatch) -> None:
    monkeypatch.delenv("SIMHOST_SCENARIO", raising=False)
    monkeypatch.setenv("SIMHOST_STATE", str(tmp_path / "host.db"))
    found = report(run(FOLDER, "", "--json"))
    assert errors(found) == []
    assert f"SIMHOST_STATE is {tmp_path}/host.db: the host is kept" in text_of(found, "simulation")
    assert list(tmp_path.iterdir()) == []


def files_in(folder: Path) -> Dict[str, Tuple[bytes, int]]:
    return {
        str(one): (one.read_bytes(), one.stat().st_mtime_ns)
        for one in sorted(folder.rglob("*"))
        if one.is_file()
    }


def simhostctl(state: Path, *words: str) -> str:
    done = subprocess.run(
        [SIMHOST / "simhostctl", f"--state={state}", *words],
        capture_output=True,
        text=True,
        check=True,
    )
    return done.stdout


@pytest.mark.parametrize("held", [b"", b"x", b"no database"])
def test_no_file_becomes_a_state(
    tmp_path: Path, monkeypatch: pytest.MonkeyPatch, held: bytes
) -> None:
    monkeypatch.delenv("SIMHOST_SCENARIO", raising=False)
    state = tmp_path / "host.db"
    state.write_bytes(held)
    before = files_in(tmp_path)
    monkeypatch.setenv("SIMHOST_STATE", str(state))
    found = report(run(FOLDER, "", "--json"))
    assert files_in(tmp_path) == before
    for one in found["findings"]:
        if one["level"] == "error":
            assert str(state) in one["text"], "the file that was asked about, not its copy"


def test_no_fault_is_used_up(tmp_path: Path, monkeypatch: pytest.MonkeyPatch) -> None:
    monkeypatch.delenv("SIMHOST_SCENARIO", raising=False)
    state = tmp_path / "host.db"
    fault = '{"faults": [{"call": "DVSState_SwitchFindByAlias", "exception": "OSError"}]}'
    document = tmp_path / "faults.json"
    document.write_text(fault, encoding="ascii")
    simhostctl(state, "apply", str(document))
    faults = json.loads(simhostctl(state, "show", "--json"))["faults"]
    assert [one["call"] for one in faults] == ["DVSState_SwitchFindByAlias"]
    before = files_in(tmp_path)
    monkeypatch.setenv("SIMHOST_STATE", str(state))
    run(FOLDER, "", "--json")
    assert files_in(tmp_path) == before
    assert json.loads(simhostctl(state, "show", "--json"))["faults"] == faults


def huge(path: Path) -> None:
    with path.open("wb") as file:
        file.truncate(1 << 40)


def pipe(path: Path) -> None:
    os.mkfifo(path)


def device(path: Path) -> None:
    path.symlink_to("/dev/zero")


ODD = [(huge, "has 1099511627776 bytes"), (pipe, "is no regular"), (device, "is no regular file")]


@pytest.mark.parametrize("variable", ["SIMHOST_STATE", "SIMHOST_SCENARIO"])
@pytest.mark.parametrize("make, why", ODD)
def test_odd_files_end_in_a_finding(
    tmp_path: Path, monkeypatch: pytest.MonkeyPatch, variable: str, make: Any, why: str
) -> None:
    for name in ("SIMHOST_STATE", "SIMHOST_SCENARIO"):
        monkeypatch.delenv(name, raising=False)
    make(tmp_path / "odd")
    monkeypatch.setenv(variable, str(tmp_path / "odd"))
    text, _ = simulated_error()
    assert f"{tmp_path}/odd {why}" in text


@pytest.mark.parametrize("make, why", ODD)
def test_odd_libraries_end_in_a_finding(
    elsewhere: Path, tmp_path: Path, make: Any, why: str
) -> None:
    host = tmp_path / "host"
    host.mkdir()
    for name in HOST:
        make(host / name)
    if make is not pipe:  # which the loader itself waits for
        found = report(run(elsewhere, str(host), "--json"))
        assert errors(found)[:2] == ["host", "host"] and why in text_of(found, "host")
    with pytest.raises(_elf.NotElf, match=why):
        _elf.read(host / HOST[0])


def test_damaged_libraries_end_in_a_finding(tmp_path: Path) -> None:
    """Any of its numbers may say anything."""
    whole = (SIMHOST / HOST[1]).read_bytes()
    file = tmp_path / HOST[1]
    table = int.from_bytes(whole[40:48], "little")
    places = [*range(40, 64, 2), *range(table, min(table + 1024, len(whole) - 8), 8)]
    found = set()
    for at in places:
        for value in (b"\xff" * 8, b"\0" * 8, (1 << 62).to_bytes(8, "little")):
            held = bytearray(whole)
            held[at : at + 8] = value
            file.write_bytes(held)
            try:
                _elf.read(file)
                found.add("read")
            except _elf.NotElf:
                found.add("refused")
    assert found == {"read", "refused"}


def test_a_reader_that_leaves_early() -> None:
    environment = {**os.environ, "PYTHONPATH": str(FOLDER)}
    command = [sys.executable, "-m", "libvswitch.doctor"]
    reader, pipe = os.pipe()
    os.close(reader)
    try:
        done = subprocess.run(
            command, cwd="/", env=environment, stdout=pipe, stderr=subprocess.PIPE
        )
    finally:
        os.close(pipe)
    assert (done.returncode, done.stderr) == (1, b"")


@pytest.mark.parametrize("words", [[], ["--json"], ["--help"]])
@pytest.mark.parametrize("unbuffered", ["", "1"])
def test_a_full_disk(words: List[str], unbuffered: str) -> None:
    environment = {**os.environ, "PYTHONPATH": str(FOLDER), "PYTHONUNBUFFERED": unbuffered}
    command = [sys.executable, "-m", "libvswitch.doctor", *words]
    with open("/dev/full", "w", encoding="ascii") as full:
        done = subprocess.run(
            command, cwd="/", env=environment, stdout=full, stderr=subprocess.PIPE, text=True
        )
    assert (done.returncode, done.stderr) == (1, "doctor: [Errno 28] No space left on device\n")


def test_a_real_host_is_none_that_simulates(elsewhere: Path, tmp_path: Path) -> None:
    library(tmp_path / "host", "libvswitch.so", every_call_but(set()))
    library(tmp_path / "host", "libnebPublic.so", "")
    found = report(run(elsewhere, str(tmp_path / "host"), "--json"))
    assert (errors(found), found["simulated"]) == ([], False)


def test_a_host_for_another_machine(elsewhere: Path, tmp_path: Path) -> None:
    host = planted(tmp_path / "host", MACHINE, 0xB7)
    found = report(run(elsewhere, host, "--json"))
    assert errors(found) == ["host", "host", "loading"]
    assert "is for aarch64, the module for x86_64" in text_of(found, "host")
    assert "libvswitch.so is nowhere the loader looks" in text_of(found, "host")


@pytest.mark.parametrize("at, value, machine", [(CLASS, 1, "32 bits"), (MACHINE, 0xB7, "aarch64")])
def test_a_foreign_library_is_passed_over(
    tmp_path: Path, at: int, value: int, machine: str
) -> None:
    foreign = planted(tmp_path / "foreign", at, value)
    assert loads(FOLDER, foreign)
    found = report(run(FOLDER, foreign, "--json"))
    assert errors(found) == []
    notes = [one for one in found["findings"] if one["level"] == "note"]
    assert [one["text"] for one in notes if one["about"] == "host"] == [
        f"{name}: {foreign}/{name} is for {machine}, the module for x86_64: "
        "the loader passes over it"
        for name in HOST
    ]
    for name in HOST:
        assert os.path.samefile(found["host"][name], SIMHOST / name)


def test_a_library_that_may_not_be_read_is_passed_over(
    tmp_path: Path, monkeypatch: pytest.MonkeyPatch
) -> None:
    machine_of, locked = _elf.machine_of, tmp_path / "libvswitch.so"
    locked.touch()

    def refuse(path: Path) -> str:  # as the system does, though not to root
        if path == locked:
            raise PermissionError(f"[Errno 13] Permission denied: '{path}'")
        return machine_of(path)

    monkeypatch.setattr(_elf, "machine_of", refuse)
    monkeypatch.setenv("LD_LIBRARY_PATH", str(tmp_path))
    found = _examination.Report()
    module = _examination._module(found)
    assert module is not None
    library = _examination._library(found, "libvswitch.so", module)
    assert library is not None and os.path.samefile(library.path, SIMHOST / "libvswitch.so")
    (note,) = [one.text for one in found.findings if one.level == "note"]
    assert note == f"libvswitch.so: {locked} may not be read: the loader passes over it"


def test_a_library_of_the_other_byte_order_is_not(tmp_path: Path) -> None:
    wrong = planted(tmp_path / "wrong", DATA, 2)
    assert not loads(FOLDER, wrong)
    found = report(run(FOLDER, wrong, "--json"))
    assert errors(found) == ["host", "host", "loading"]
    assert found["host"] == {name: None for name in HOST}
    assert f"{wrong}/libvswitch.so is no little-endian ELF file" in text_of(found, "host")


def test_a_folder_of_that_name(tmp_path: Path) -> None:
    (tmp_path / "libvswitch.so").mkdir()
    assert not loads(FOLDER, str(tmp_path))
    found = report(run(FOLDER, str(tmp_path), "--json"))
    assert errors(found) == ["host", "loading"]
    texts = {one["text"]: one["advice"] for one in found["findings"]}
    advice = "put this host's own library there, or take its folder out of LD_LIBRARY_PATH"
    assert texts[f"libvswitch.so: {tmp_path}/libvswitch.so is a folder"] == advice


@pytest.mark.parametrize(
    "path, expected",
    [
        ("", "beside"),
        (":", "current"),
        (":{first}", "current"),
        ("{first}:", "first"),
        ("{nothing}:", "current"),
        ("{nothing};{first}", "first"),
        (";{first}", "current"),
    ],
)
def test_the_search_path_is_read_as_the_loader_reads_it(
    tmp_path: Path, path: str, expected: str
) -> None:
    folders = {"beside": SIMHOST}
    for folder in ("current", "first", "nothing"):
        folders[folder] = tmp_path / folder
        folders[folder].mkdir()
    for library in SIMHOST.glob("lib*.so"):
        for folder in ("current", "first"):
            shutil.copy(library, folders[folder])
    environment = {**os.environ, "PYTHONPATH": str(FOLDER)}
    environment["LD_LIBRARY_PATH"] = path.format(**folders)
    # Python itself must not take a library in the current folder for the package of that name.
    program = (
        "import pathlib, sys; sys.path.remove('')\n"
        "import json; from libvswitch import _examination as doctor\n"
        "found = doctor.Report(); module = doctor._module(found); doctor._host(found, module)\n"
        "import _libvswitch\n"
        "lines = pathlib.Path('/proc/self/maps').read_text().splitlines()\n"
        "loaded = {line.split()[-1] for line in lines if '/' in line}\n"
        "print(json.dumps([found.host, sorted(loaded)]))"
    )
    done = subprocess.run(
        [sys.executable, "-c", program],
        cwd=folders["current"],
        env=environment,
        capture_output=True,
        text=True,
    )
    assert done.stderr == ""
    host, loaded = json.loads(done.stdout)
    for name in HOST:
        assert os.path.samefile(host[name], folders[expected] / name)
        assert os.path.realpath(host[name]) in loaded


def test_a_host_that_crashes_as_it_loads(tmp_path: Path, elsewhere: Path) -> None:
    source = every_call_but(set())
    source += "__attribute__((constructor)) static void start(void) { __builtin_trap(); }\n"
    library(tmp_path / "host", "libvswitch.so", source)
    library(tmp_path / "host", "libnebPublic.so", "")
    found = report(run(elsewhere, str(tmp_path / "host"), "--json"))
    assert errors(found) == ["loading"]
    assert "the process ends with SIGILL" in text_of(found, "loading")


def test_classes_of_another_build() -> None:
    found = _examination.Report()
    _examination._sizes(found, {"VSInfo": [232, 232], "VSStats": [120, 136]})
    (finding,) = found.findings
    assert (finding.level, finding.about) == ("error", "records")
    assert "VSStats" in finding.text and "VSInfo" not in finding.text


def test_the_doctor_does_not_load_what_it_examines() -> None:
    """In its own process neither the module nor the host's libraries appear."""
    program = (
        "import pathlib, sys; sys.argv = ['-m']\n"
        "from libvswitch import doctor\n"
        "doctor.examine()\n"
        "loaded = pathlib.Path('/proc/self/maps').read_text()\n"
        "print('_libvswitch' in sys.modules, 'libvswitch.so' in loaded)"
    )
    done = subprocess.run([sys.executable, "-c", program], capture_output=True, text=True)
    assert (done.stdout, done.stderr) == ("False False\n", "")


def test_importing_a_package_without_a_host_says_so(elsewhere: Path) -> None:
    environment = {**os.environ, "PYTHONPATH": str(elsewhere)}
    done = subprocess.run(
        [sys.executable, "-c", "import libvswitch"], env=environment, capture_output=True, text=True
    )
    assert done.returncode == 1
    assert "ImportError: libvswitch.so: cannot open shared object file" in done.stderr
