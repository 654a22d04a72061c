"""The plug-in in runs of pytest: fixtures, marks, memory that is left out, refused hosts."""

import os
import re
import subprocess
import sys
import textwrap
from pathlib import Path

import pytest
import simhost

README = Path(__file__).resolve().parents[2] / "simhost/python/README.md"
DOCTOR = "python3 -m libvswitch.doctor says which host is loaded, and from where."
ADVICE = "Release each block once; libvswitch.owned does at the end of its block of code."

# What the tests within the tests use, with the flat module or with the classes.
HEADS = {
    "flat": """
        import pytest
        import _libvswitch as vs

        def take():
            return vs.VSQEX_GetUplinks("vswitch0")[1]

        def mtu(switch):
            info = vs.new_VSInfo()
            status = vs.VSQEX_GetVSInfo(switch, info)
            found = vs.VSInfo_mtu_get(info)
            vs.delete_VSInfo(info)
            return found if status == vs.QEX_OK else vs.QEX_ReturnStatusToString(status)
    """,
    "classes": """
        import pytest
        import libvswitch as vs

        def take():
            return vs.VSQEX_GetUplinks("vswitch0")[1]

        def mtu(switch):
            cell = vs.Cell("qex_uint32")
            status = vs.VSDVS_GetMTU(switch, cell.pointer)
            return cell.value if status == vs.QEX_OK else vs.QEX_ReturnStatusToString(status)
    """,
}


@pytest.fixture(params=HEADS)
def head(request: pytest.FixtureRequest) -> str:
    return dedented(HEADS[request.param])


def dedented(code: str) -> str:
    return textwrap.dedent(code)


def run(pytester: pytest.Pytester, code: str) -> pytest.RunResult:
    pytester.makepyfile(code)
    return pytester.runpytest_subprocess("-p", "no:cacheprovider")


def section(result: pytest.RunResult, heading: str) -> str:
    """What pytest says below such a heading."""
    lines = iter(result.outlines)
    for line in lines:
        if line.strip("_ ") == heading:
            break
    else:
        raise AssertionError(f"no {heading!r} in {result.outlines}")
    below = []
    for line in lines:
        if line.startswith(("===", "___")):
            break
        below.append(line)
    return "\n".join(below)


def left_out(who: str, *blocks: str) -> str:
    lines = "".join(f"    {block}\n" for block in blocks)
    return f"{who} left memory of the host out:\n{lines}{ADVICE}"


def test_each_test_has_a_host_of_its_own(pytester: pytest.Pytester, head: str) -> None:
    result = run(
        pytester,
        head
        + dedented(
            """
            @pytest.mark.parametrize("turn", [1, 2])
            def test_change_everything(host, turn):
                assert mtu("vswitch0") == 1500
                assert mtu("lab") == "Not found"
                assert vs.VSDVS_SetMTU("vswitch0", 9000) == vs.QEX_OK
                host.apply({"switches": [{"alias": "lab"}], "uplinks": [{"name": "more"}]})
                host.link("nic4").down()
                host.clock.stop()
                host.clock.set(1)
                host.fault("VSDVS_SetMTU", times=0, status="QEX_BUSY")

            def test_nothing_is_changed(host):
                described = host.describe()
                assert [switch["alias"] for switch in described["switches"]] == ["vswitch0"]
                assert {uplink["link"] for uplink in described["uplinks"]} == {"up"}
                assert len(described["uplinks"]) == 6
                assert not described["clock"]["stopped"]
                assert host.clock.now > 1e9
                assert vs.VSDVS_SetMTU("vswitch0", 9000) == vs.QEX_OK

            def test_without_a_host_of_its_own_nothing_is_left_either():
                assert mtu("vswitch0") == 1500
            """
        ),
    )
    result.assert_outcomes(passed=4)


def test_scenarios(pytester: pytest.Pytester, head: str) -> None:
    pytester.path.joinpath("lab.json").write_text('{"switches": [{"alias": "lab", "mtu": 9000}]}')
    result = run(
        pytester,
        head
        + dedented(
            """
            def test_unless_given_it_is_the_default_host(host):
                assert mtu("vswitch0") == 1500

            @pytest.mark.scenario({"switches": [{"alias": "here", "mtu": 2000}]})
            def test_a_dict(host):
                assert (mtu("here"), mtu("vswitch0")) == (2000, "Not found")
                host.apply("lab.json")
                assert mtu("lab") == 9000
                host.reset()
                assert (mtu("here"), mtu("lab")) == (2000, "Not found")

            @pytest.mark.scenario("lab.json")
            def test_a_file_beside_the_test(host, shared_host):
                assert mtu("lab") == 9000
                assert [one["alias"] for one in shared_host.describe()["switches"]] == ["lab"]

            @pytest.mark.scenario({})
            def test_nothing_at_all(host):
                assert (host.describe()["uplinks"], host.describe()["switches"]) == ([], [])

            class TestFixture:
                @pytest.fixture(params=[1300, 1400])
                def scenario(self, request):
                    return {"switches": [{"alias": "lab", "mtu": request.param}]}

                def test_describes(self, host, request):
                    assert mtu("lab") in (1300, 1400)

                @pytest.mark.scenario("lab.json")
                def test_but_the_mark_is_nearer(self, host):
                    assert mtu("lab") == 9000

            @pytest.mark.scenario({"switches": [{"alias": "of-the-class"}]})
            class TestMark:
                def test_of_the_class(self, host):
                    assert mtu("of-the-class") == 1500

                @pytest.mark.scenario("lab.json")
                def test_of_its_own(self, host):
                    assert (mtu("of-the-class"), mtu("lab")) == ("Not found", 9000)
            """
        ),
    )
    result.assert_outcomes(passed=10)


@pytest.mark.parametrize("fixture", ["host", "shared_host"])
@pytest.mark.parametrize(
    "mark, why",
    [
        (
            '{"switches": [{"alias": "s", "mtu": 99}]}',
            "the scenario of this test cannot be used: switches[0].mtu: 99 is below 1280",
        ),
        (
            '"none.json"',
            "the scenario of this test cannot be used: [Errno 2] No such file or directory:"
            " '{folder}/none.json'",
        ),
        ("", "the mark scenario takes one document"),
        ("{}, {}", "the mark scenario takes one document"),
    ],
)
def test_a_scenario_that_cannot_be_used(
    pytester: pytest.Pytester, fixture: str, mark: str, why: str
) -> None:
    result = run(
        pytester,
        f"import pytest\n@pytest.mark.scenario({mark})\ndef test_it({fixture}): pass",
    )
    result.assert_outcomes(errors=1)
    expected = why.format(folder=pytester.path)
    assert section(result, "ERROR at setup of test_it") == expected


def test_a_test_that_leaves_memory_out_fails(pytester: pytest.Pytester, head: str) -> None:
    result = run(
        pytester,
        head
        + dedented(
            """
            def test_takes_three(host):
                take(), take()
                vs.VSQEX_GetPortMACTable("vswitch0", "web-1", vs.VS_MAC_ADDR_TYPE_LEARNED)

            def test_releases(host):
                vs.VSQEX_FreeMemory(take())

            def test_asks_late_for_the_host(request):
                request.getfixturevalue("host")
                take()
            """
        ),
    )
    result.assert_outcomes(passed=1, failed=2)
    uplinks, addresses = "VSQEX_GetUplinks: 80 bytes", "VSQEX_GetPortMACTable: 26 bytes"
    found = section(result, "test_takes_three")
    assert found == left_out("the test", uplinks, uplinks, addresses)
    assert section(result, "test_asks_late_for_the_host") == left_out("the test", uplinks)


def test_memory_of_fixtures(pytester: pytest.Pytester, head: str) -> None:
    """It may be out as long as the fixture is; then it is the fixture that is to blame."""
    result = run(
        pytester,
        head
        + dedented(
            """
            @pytest.fixture
            def released(host):
                uplinks = take()
                yield uplinks
                vs.VSQEX_FreeMemory(uplinks)

            @pytest.fixture
            def left_out(host):
                return take()

            @pytest.fixture(scope="module", autouse=True)
            def of_the_module():
                uplinks = take()
                yield
                vs.VSQEX_FreeMemory(uplinks)

            def test_good(released):
                assert released is not None

            def test_bad(left_out):
                assert left_out is not None

            def test_both(released):
                take()
            """
        ),
    )
    result.assert_outcomes(passed=2, failed=1, errors=1)
    uplinks = "VSQEX_GetUplinks: 80 bytes"
    found = section(result, "ERROR at teardown of test_bad")
    assert found == left_out("a fixture of the test", uplinks)
    assert section(result, "test_both") == left_out("the test", uplinks)


def test_a_test_that_does_not_pass_is_told_one_thing(pytester: pytest.Pytester, head: str) -> None:
    result = run(
        pytester,
        head
        + dedented(
            """
            def test_fails(host):
                take()
                assert mtu("vswitch0") == 1

            def test_is_skipped(host):
                take()
                pytest.skip("not today")

            @pytest.mark.xfail(strict=True)
            def test_is_expected_to_leave_memory_out(host):
                take()

            def test_the_next_one_has_nothing_to_do_with_it(host):
                assert host.ledger() == []
            """
        ),
    )
    result.assert_outcomes(failed=1, skipped=1, xfailed=1, passed=1)
    assert "left memory" not in section(result, "test_fails")


def test_memory_may_be_left_out_for_a_reason(pytester: pytest.Pytester, head: str) -> None:
    result = run(
        pytester,
        head
        + dedented(
            """
            import sys

            @pytest.fixture
            def left_out(host):
                return take()

            @pytest.mark.leaves_host_memory("the tool's cache lives as long as the process")
            def test_with_a_reason(host, left_out, shared_host):
                take()
                code = "import _libvswitch as vs; vs.VSQEX_GetUplinks('vswitch0')"
                done = shared_host.run([sys.executable, "-c", code])
                assert (done.returncode, done.stdout, done.stderr) == (0, "", "")

            @pytest.mark.leaves_host_memory
            def test_without(host):
                take()
            """
        ),
    )
    result.assert_outcomes(passed=1, errors=1)
    found = section(result, "ERROR at setup of test_without")
    assert found == "the mark leaves_host_memory takes a reason"


def test_unittest_has_a_host_as_well(pytester: pytest.Pytester, head: str) -> None:
    result = run(
        pytester,
        head
        + dedented(
            """
            import unittest

            @pytest.mark.usefixtures("host")
            class TestSwitch(unittest.TestCase):
                def test_good(self):
                    self.assertEqual(mtu("vswitch0"), 1500)

                def test_bad(self):
                    take()

                def test_wrong(self):
                    take()
                    self.assertEqual(mtu("vswitch0"), 1)
            """
        ),
    )
    result.assert_outcomes(passed=1, failed=2)
    found = section(result, "TestSwitch.test_bad")
    assert found == left_out("the test", "VSQEX_GetUplinks: 80 bytes")
    assert "left memory" not in section(result, "TestSwitch.test_wrong")


USES_A_HOST = """
def test_uses_a_host({fixture}):
    raise AssertionError("it ran")

def test_uses_none():
    pass
"""


@pytest.mark.parametrize("fixture", ["host", "shared_host"])
def test_refuses_another_host(
    pytester: pytest.Pytester, monkeypatch: pytest.MonkeyPatch, fixture: str
) -> None:
    folder = Path(os.environ["BUILD_DIR"], "tests", "recording_host")
    assert folder.joinpath("libvswitch.so").exists()
    monkeypatch.setenv("LD_LIBRARY_PATH", str(folder))
    result = run(pytester, USES_A_HOST.format(fixture=fixture))
    result.assert_outcomes(passed=1, errors=1)
    assert section(result, "ERROR at setup of test_uses_a_host") == (
        f"tests need the simulated host, and {folder}/libvswitch.so is another: no test touches"
        " it. Let LD_LIBRARY_PATH name the folder of the simulated host's libraries before Python"
        f" starts. {DOCTOR}"
    )


@pytest.mark.parametrize("fixture", ["host", "shared_host"])
def test_refuses_to_go_without_a_host(pytester: pytest.Pytester, fixture: str) -> None:
    pytester.makeconftest("import sys; sys.modules['_libvswitch'] = None")
    result = run(pytester, USES_A_HOST.format(fixture=fixture))
    result.assert_outcomes(passed=1, errors=1)
    assert section(result, "ERROR at setup of test_uses_a_host") == (
        "tests need the simulated host, and import of _libvswitch halted; None in sys.modules."
        f" {DOCTOR}"
    )


def test_makes_no_host_anew_that_others_may_use(
    pytester: pytest.Pytester, monkeypatch: pytest.MonkeyPatch
) -> None:
    monkeypatch.setenv("SIMHOST_STATE", "/nowhere/host.db")
    result = run(pytester, USES_A_HOST.format(fixture="host"))
    result.assert_outcomes(passed=1, errors=1)
    assert section(result, "ERROR at setup of test_uses_a_host") == (
        "SIMHOST_STATE names /nowhere/host.db, a host that the test would make anew: unset it."
        " The fixture shared_host gives each test a host in a file of its own."
    )


FIXES_ITS_FILE = """
import os
os.environ["SIMHOST_STATE"] = {file!r}
import _libvswitch as vs
assert vs.VSDVS_CreateVSwitch("kept", None, None, 64, 1, 0, 0, 0) == vs.QEX_OK
{then}
"""


@pytest.mark.parametrize(
    "then", ['del os.environ["SIMHOST_STATE"]', 'os.environ["SIMHOST_STATE"] = ""']
)
def test_nor_when_the_environment_has_changed_since(
    pytester: pytest.Pytester, tmp_path: Path, then: str
) -> None:
    file = tmp_path / "shared.db"
    pytester.makeconftest(FIXES_ITS_FILE.format(file=str(file), then=then))
    result = run(pytester, USES_A_HOST.format(fixture="host"))
    result.assert_outcomes(passed=1, errors=1)
    assert section(result, "ERROR at setup of test_uses_a_host") == (
        f"the host of this process is kept in {file}, which the test would make anew:"
        " SIMHOST_STATE named it when the host was first used, before this test."
    )
    shown = subprocess.run(
        [Path(os.environ["BUILD_DIR"], "simhost", "simhostctl"), f"--state={file}", "show"],
        capture_output=True,
        text=True,
    )
    assert shown.returncode == 0 and "kept" in shown.stdout


def test_the_library_tells_its_file_once_and_for_all(tmp_path: Path) -> None:
    code = """
import os
from simhost._loaded import LoadedControl
control = LoadedControl()
{asked}
os.environ["SIMHOST_STATE"] = {file!r}
print(control.state_file())
try:
    control.reset(empty=False)
except Exception as error:
    print(type(error).__name__)
"""
    file = str(tmp_path / "shared.db")
    printed = []
    for asked in ("control.state_file()", ""):
        done = subprocess.run(
            [sys.executable, "-c", code.format(asked=asked, file=file)],
            capture_output=True,
            text=True,
        )
        printed.append(done.stdout.split())
    assert printed == [["None"], [file, "HostRefused"]]
    assert not Path(file).exists()


def test_what_the_shell_has_chosen_is_not_under_test(
    pytester: pytest.Pytester, monkeypatch: pytest.MonkeyPatch
) -> None:
    monkeypatch.setenv("SIMHOST_SCENARIO", "/nowhere/scenario.json")
    result = run(
        pytester,
        """
        import os

        def test_of_both(host, shared_host):
            for one in (host, shared_host):
                assert [switch["alias"] for switch in one.describe()["switches"]] == ["vswitch0"]
            assert os.environ["SIMHOST_SCENARIO"] == "/nowhere/scenario.json"
        """,
    )
    result.assert_outcomes(passed=1)


def test_a_run_without_a_host_loads_none(pytester: pytest.Pytester) -> None:
    result = run(
        pytester,
        """
        import sys

        def test_nothing_is_loaded(pytestconfig):
            assert pytestconfig.pluginmanager.has_plugin("simhost")
            assert not {"_libvswitch", "libvswitch"} & set(sys.modules)
        """,
    )
    result.assert_outcomes(passed=1)


def test_explains_itself(pytester: pytest.Pytester) -> None:
    marks = pytester.runpytest_subprocess("--markers").outlines
    for mark in ("scenario(document): ", "leaves_host_memory(reason): "):
        assert any(line.startswith(f"@pytest.mark.{mark}") for line in marks)
    fixtures = pytester.runpytest_subprocess("--fixtures").stdout.str()
    for fixture in ("host", "shared_host", "scenario"):
        said = fixtures.split(f"\n{fixture} -- ")[1].splitlines()[1].strip()
        assert said and said != "no docstring available"


def test_the_readme_shows_what_passes(pytester: pytest.Pytester) -> None:
    text = README.read_text(encoding="utf-8")
    code = "".join(re.findall(r"^```python\n(.*?)^```$", text, re.M | re.S))
    tests = re.findall(r"^def test_", code, re.M)
    assert tests
    ini = re.search(r"^```ini\n(.*?)^```$", text, re.M | re.S)
    assert ini
    pytester.makeini(ini[1])
    run(pytester, code).assert_outcomes(passed=len(tests))
    said = re.search(r"^_+ test_the_uplinks _+\n(.*?)^```$", text, re.M | re.S)
    assert said and said[1].rstrip() == left_out("the test", "VSQEX_GetUplinks: 80 bytes")


def test_the_readme_names_all_there_is() -> None:
    text = README.read_text(encoding="utf-8")
    for kind in (simhost.SimulatedHost, simhost.Host, simhost.SharedHost, simhost.Clock):
        for name in vars(kind):
            assert name.startswith("_") or re.search(rf"[`.]{name}\b", text), name


def test_is_typed(tmp_path: Path) -> None:
    program = tmp_path / "test_tool.py"
    program.write_text(
        dedented(
            """
            from simhost import Host, SharedHost

            def test_typed(host: Host, shared_host: SharedHost) -> None:
                now: float = host.clock.now
                host.fault("VSDVS_SetMTU", nth=2, panic=(OSError, "gone"))
                size: int = host.ledger()[0].size
                mtu: int = host.objects.switches["lab"].mtu
                out: str = shared_host.run(["tool"]).stdout
                print(now, size, mtu, out)
                host.link("nic4").sideways()
            """
        )
    )
    # Debian's interpreter has mypy, whichever the module is built for.
    done = subprocess.run(
        ["/usr/bin/python3", "-m", "mypy", "--config-file=", "--strict", str(program)],
        cwd=tmp_path,
        env={**os.environ, "MYPYPATH": str(Path(os.environ["BUILD_DIR"], "python"))},
        stdout=subprocess.PIPE,
        encoding="utf-8",
    )
    assert done.stdout == (
        'test_tool.py:11: error: "Link" has no attribute "sideways"  [attr-defined]\n'
        "Found 1 error in 1 file (checked 1 source file)\n"
    )


OBJECTS = """
import doctest
import sys

import pytest
import simhost


def test_nothing_is_loaded_before_it_is_asked_for(host: simhost.Host) -> None:
    assert not {"vswitch", "libvswitch"} & set(sys.modules)
    assert host.objects.simulated
    assert {"vswitch", "libvswitch"} <= set(sys.modules)


def test_they_are_of_the_host_of_the_test(host: simhost.Host) -> None:
    host.apply({"switches": [{"alias": "lab", "uplinks": ["nic0"], "ports": [{"id": "desk"}]}]})
    desk = host.objects.switches["lab"].ports["desk"]
    desk.vlan = 7
    assert host.describe()["switches"][1]["ports"][0]["vlan"] == 7
    assert str(desk.carrier) == "nic0"
    host.reset()
    assert list(host.objects.switches) == ["vswitch0"]


def test_a_transaction_knows_what_is_written(host: simhost.Host) -> None:
    from vswitch import RolledBack

    with pytest.raises(RolledBack):
        with host.objects.transaction():
            host.objects.switches["vswitch0"].mtu = 9000
            raise OSError("the tool fails")
    assert host.describe()["switches"][0]["mtu"] == 1500


def test_the_documentation_shows_what_happens(host: simhost.Host) -> None:
    finder = doctest.DocTestFinder(recurse=False)
    (example,) = finder.find(simhost.Host.objects, "objects", globs={"host": host})
    result = doctest.DocTestRunner().run(example)
    assert result.attempted == 2 and result.failed == 0
"""


def test_the_host_as_objects(pytester: pytest.Pytester) -> None:
    """In a process of its own: the objects load the classes."""
    run(pytester, OBJECTS).assert_outcomes(passed=4)
