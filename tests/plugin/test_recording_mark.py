"""The mark `recording`: a test's calls are played, other tests have their host, and nothing of one
disturbs the next."""

import json
from pathlib import Path

import pytest
from hostless import without_host

INI = "[pytest]\nvswitch_recordings = true\n"

TESTS = """
import pytest
import _libvswitch as flat
import libvswitch, vswitch

def uplinks():
    status, found = flat.VSQEX_GetUplinks("vswitch0")
    assert status == 0
    return found

@pytest.fixture
def asked():
    # Of the test: it has a part in the recording.
    yield flat.VSDVS_SetMTU("vswitch0", 9000)
    flat.VSDVS_SetMTU("vswitch0", 1500)

@pytest.mark.recording("made.jsonl", mode="once")
@pytest.mark.parametrize("time", ["recorded", "played"])
def test_once(time, asked):
    assert asked == 0
    assert list(vswitch.Host().switches) == ["vswitch0"]
    assert flat.DVS_SwitchId(flat.DVSState_SwitchFindByAlias("vswitch0"))
    found = uplinks()
    flat.VSQEX_FreeMemory(found)
    with pytest.raises(RuntimeError, match="is given back twice"):
        flat.VSQEX_FreeMemory(found)

def test_without_the_mark_calls_go_to_the_host(host):
    assert flat.VSDVS_SetMTU("vswitch0", 8000) == 0
    found = uplinks()
    flat.VSQEX_FreeMemory(found)
    with pytest.raises(RuntimeError, match="is given back twice"):
        flat.VSQEX_FreeMemory(found)

@pytest.mark.recording("made.jsonl", by="arguments")
def test_hidden():
    try:
        flat.VSDVS_SetMTU("vswitch0", 1280)
    except RuntimeError:
        pass

@pytest.fixture
def fails_late():
    yield
    try:
        flat.VSDVS_SetMTU("vswitch0", 1281)
    except RuntimeError:
        pass

@pytest.mark.recording("made.jsonl", by="arguments")
def test_late(fails_late):
    pass

kept = []

@pytest.mark.recording("made.jsonl", by="arguments")
def test_keeps_memory():
    kept.append(uplinks())
    kept.append(flat.DVSState_SwitchFindByAlias("vswitch0"))

def test_what_was_kept_does_no_harm(host):
    flat.VSQEX_FreeMemory(kept[0])
    assert flat.VSDVS_SetMTU("vswitch0", 9000) == 0
    with pytest.raises(RuntimeError, match="belongs to a recording that has ended"):
        flat.DVS_SwitchId(kept[1])

@pytest.mark.recording("made.jsonl", by="arguments", all_used=True)
def test_strict():
    pass

@pytest.mark.recording("failed.jsonl", mode="all")
def test_recorded_while_it_fails():
    assert flat.VSDVS_SetMTU("vswitch0", 1281) == 7

@pytest.mark.recording("made.jsonl", mode="all")
def test_recorded_but_asks_nothing():
    pass

@pytest.mark.recording("none.jsonl")
def test_no_file():
    pass

@pytest.mark.recording("damaged.jsonl")
def test_damaged():
    pass

@pytest.mark.recording("made.jsonl", by="chance")
def test_wrong_word():
    pass

@pytest.mark.recording()
def test_no_name():
    pass
"""


def run(pytester: pytest.Pytester, ini: str, *options: str) -> pytest.RunResult:
    pytester.makeini(ini)
    pytester.makepyfile(test_marked=TESTS)
    (pytester.path / "damaged.jsonl").write_text('{"vswitch trace": 7}\n')
    return pytester.runpytest_subprocess("-p", "no:cacheprovider", *options)


def test_tests_with_and_without_the_mark(pytester: pytest.Pytester) -> None:
    done = run(pytester, INI, "-rA")
    done.assert_outcomes(passed=8, failed=2, errors=6, warnings=2)
    path = pytester.path
    done.stdout.fnmatch_lines_random(
        [
            "PASSED test_marked.py::test_once[[]recorded]",
            "PASSED test_marked.py::test_once[[]played]",
            "PASSED test_marked.py::test_without_the_mark_calls_go_to_the_host",
            "PASSED test_marked.py::test_what_was_kept_does_no_harm",
            'VSDVS_SetMTU(switchName="vswitch0", mtu=1280) was not recorded',
            "  made.jsonl: line 3: mtu: 9000 was recorded, and 1280 asked",
            "FAILED test_marked.py::test_hidden*",
            'a fixture of the test: VSDVS_SetMTU(switchName="vswitch0", mtu=1281) was not recorded',
            "ERROR test_marked.py::test_late*",
            "*PytestWarning: 2 of * calls of made.jsonl were made; the first that was not is *",
            "0 of * calls of made.jsonl were made; the first that was not is VSDVS_SetMTU*",
            "ERROR test_marked.py::test_strict*",
            "FAILED test_marked.py::test_recorded_while_it_fails*",
            "*PytestWarning: the test made no call, so that nothing is recorded in made.jsonl",
            f"the mark recording: there is no {path / 'none.jsonl'}; mode='once' records it",
            f"the mark recording: {path / 'damaged.jsonl'}: line 1: a trace of version 7, and this"
            " program reads those up to 1",
            "the mark recording: by is one of order, arguments, and mode one of none, once, all",
            "the mark recording: *missing 1 required positional argument: 'file'",
        ]
    )
    assert sorted(one.name for one in path.iterdir() if "jsonl" in one.name) == [
        "damaged.jsonl",
        "made.jsonl",
    ]
    header = json.loads((path / "made.jsonl").read_text().splitlines()[0])
    assert header["command"] == ["test_marked.py::test_once[recorded]"]


def test_tests_of_several_processes(pytester: pytest.Pytester) -> None:
    marked = ("-k", "once or without or keeps", "-n", "2", "--dist", "load")
    assert run(pytester, INI, "-k", "once").ret == 0
    run(pytester, INI, *marked).assert_outcomes(passed=4, warnings=1)


def test_without_the_line_in_the_ini_file(pytester: pytest.Pytester) -> None:
    done = run(pytester, "[pytest]\n", "-k", "once or without")
    done.assert_outcomes(passed=1, errors=2)
    done.stdout.fnmatch_lines(["the mark recording needs a line vswitch_recordings = true in the*"])


def test_a_recording_that_has_no_place(pytester: pytest.Pytester) -> None:
    pytester.makepyfile(
        test_nowhere="""
        import pytest
        @pytest.mark.recording("nowhere/made.jsonl", mode="once")
        def test_nowhere(): pass
        @pytest.mark.recording(".", mode="all")
        def test_a_folder(): pass
        """
    )
    pytester.makeini(INI)
    done = pytester.runpytest_subprocess("test_nowhere.py")
    done.assert_outcomes(errors=2)
    made = pytester.path / "nowhere" / "made.jsonl"
    done.stdout.fnmatch_lines(
        [
            f"the mark recording: [[]Errno 2[]] No such file or directory: '{made}'",
            f"the mark recording: [[]Errno 21[]] Is a directory: '{pytester.path}'",
        ]
    )
    done.stdout.no_fnmatch_line("*Traceback*")
    done.stdout.no_fnmatch_line("*_recorded_test.py*")


def test_a_module_that_is_loaded_already_is_too_late(pytester: pytest.Pytester) -> None:
    pytester.makepyfile(early="import _libvswitch")
    pytester.syspathinsert()
    done = run(pytester, INI, "-p", "early")
    assert done.ret == pytest.ExitCode.USAGE_ERROR
    done.stderr.fnmatch_lines(
        ["ERROR: vswitch_recordings: _libvswitch is loaded already, and with it the libraries of*"]
    )


def test_without_a_host(
    pytester: pytest.Pytester, monkeypatch: pytest.MonkeyPatch, tmp_path: Path
) -> None:
    assert run(pytester, INI, "-k", "once").ret == 0
    monkeypatch.setenv("PYTHONPATH", str(without_host(tmp_path) / "python"))
    monkeypatch.delenv("LD_LIBRARY_PATH", raising=False)
    done = run(pytester, INI, "-k", "once or without")
    done.assert_outcomes(passed=2, errors=1)
    done.stdout.fnmatch_lines(["*tests need the simulated host, and */libvswitch.so is another*"])
    (pytester.path / "made.jsonl").unlink()
    done = run(pytester, INI, "-k", "once")
    done.assert_outcomes(errors=2)
    made = pytester.path / "made.jsonl"
    done.stdout.fnmatch_lines([f"the mark recording: there is no host to record {made} with"])
