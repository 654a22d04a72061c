"""What pytest loads: fixtures and marks for tests on the simulated host.

Nothing of a host is loaded before the first test asks for one.
"""

import os
from pathlib import Path
from typing import Any, FrozenSet, Iterator, Optional, Type, TypeVar

import pytest

from simhost import Block, Frames, Host, HostRefused, MemoryLeftOut, NotSimulated, SharedHost
from simhost._frames import FramesHost
from simhost._host import Document
from simhost._namespaces import NoFrames
from simhost._recorded_test import RecordedTest, stand_in_front
from simhost._loaded import LoadedControl

_MARKS = (
    "scenario(document): the host of this test is what the document describes, a dict or the name"
    " of a JSON file beside the test.",
    "leaves_host_memory(reason): this test may leave memory of the host out.",
    "recording(file, by='order', mode='none', all_used=False): the calls of this test get what they"
    " got when the file was recorded; its name is relative to the test's file.",
)
_FRONT = "vswitch_recordings"
AnyHost = TypeVar("AnyHost", Host, SharedHost)


class _Watch:
    """The memory that is out on a test's host, and who took it."""

    def __init__(self, host: Host, may_leave: bool) -> None:
        self._host = host
        self._may_leave = may_leave
        self._of_fixtures: FrozenSet[Block] = frozenset()
        self._excused: FrozenSet[Block] = frozenset()

    def end_of_setup(self) -> None:
        self._of_fixtures = frozenset(self._host.ledger())

    def end_of_passed_test(self) -> None:
        """A test that has failed has been told enough, so nothing looks at what it left."""
        self._check("the test", self._of_fixtures)

    def start_of_teardown(self) -> None:
        self._excused = frozenset(self._host.ledger()) - self._of_fixtures

    def end_of_teardown(self) -> None:
        self._check("a fixture of the test", self._excused)

    def _check(self, who: str, excused: FrozenSet[Block]) -> None:
        left = [block for block in self._host.ledger() if block not in excused]
        if left and not self._may_leave:
            pytest.fail(str(MemoryLeftOut(who, left)), pytrace=False)


_WATCH = pytest.StashKey[_Watch]()
_RECORDED = pytest.StashKey[RecordedTest]()


def pytest_addoption(parser: pytest.Parser) -> None:
    parser.addini(_FRONT, "whether tests may have the mark recording", type="bool", default=False)


@pytest.hookimpl(tryfirst=True)  # type: ignore[misc]  # pluggy is not typed
def pytest_load_initial_conftests(early_config: pytest.Config) -> None:
    """Before anything of the tests is there, which may load the module, and with it a host."""
    if early_config.getini(_FRONT):
        try:
            stand_in_front()
        except OSError as error:
            raise pytest.UsageError(f"{_FRONT}: {error}") from None


def pytest_configure(config: pytest.Config) -> None:
    for mark in _MARKS:
        config.addinivalue_line("markers", mark)


@pytest.fixture
def scenario() -> Optional[Document]:
    """What a fresh host is unless the test has the mark `scenario`: a dict, the name of a JSON file
    beside the test, or None for the default host. Made to be overridden."""
    return None


@pytest.fixture(autouse=True)
def _recording(request: pytest.FixtureRequest) -> Iterator[None]:
    """Has the calls of a test with the mark `recording` played, and those of its own fixtures."""
    mark = request.node.get_closest_marker("recording")
    if mark is None:
        yield
        return
    if not request.config.getini(_FRONT):
        pytest.fail(
            f"the mark recording needs a line {_FRONT} = true in the ini file, in the section of"
            " pytest: what plays has to be there before the module is loaded",
            pytrace=False,
        )
    try:
        test = RecordedTest(request.node, *mark.args, **mark.kwargs)
    except (OSError, TypeError, ValueError) as error:
        pytest.fail(f"the mark recording: {error}", pytrace=False)
    request.node.stash[_RECORDED] = test
    with test.under_way():
        yield


@pytest.fixture
def host(request: pytest.FixtureRequest, scenario: Optional[Document]) -> Iterator[Host]:
    """A fresh simulated host in the memory of this process, and what comes to it from outside."""
    state = os.environ.get("SIMHOST_STATE")
    if state:
        pytest.fail(
            f"SIMHOST_STATE names {state}, a host that the test would make anew: unset it."
            " The fixture shared_host gives each test a host in a file of its own.",
            pytrace=False,
        )
    _refuse_shared_state()
    may_leave = _may_leave_memory(request)
    host = _made(Host, _scenario(request, scenario), request.path.parent)
    watch = request.node.stash[_WATCH] = _Watch(host, may_leave)
    yield host
    # The next test may not ask for a host; it has nothing to do with what happened on this one.
    LoadedControl().reset(empty=False)
    watch.end_of_teardown()


def _refuse_shared_state() -> None:
    """The library has fixed its file when it was first used; the environment may say another."""
    try:
        file = LoadedControl().state_file()
        if file is None:
            return
        why = (
            f"the host of this process is kept in {file}, which the test would make anew:"
            " SIMHOST_STATE named it when the host was first used, before this test."
        )
    except NotSimulated as error:
        why = str(error)
    except HostRefused as error:
        why = f"the host of this process cannot be used: {error}"
    pytest.fail(why, pytrace=False)


@pytest.fixture
def shared_host(
    request: pytest.FixtureRequest, scenario: Optional[Document], tmp_path: Path
) -> SharedHost:
    """A fresh simulated host in a file, for the commands that the test runs."""
    return _made(
        SharedHost,
        tmp_path / "host.db",
        _scenario(request, scenario),
        request.path.parent,
        may_leave_memory=_may_leave_memory(request),
    )


@pytest.fixture(scope="session")
def _frames_host(tmp_path_factory: pytest.TempPathFactory) -> Iterator[FramesHost]:
    try:
        made = FramesHost(tmp_path_factory.mktemp("frames"))
    except (NoFrames, NotSimulated) as error:
        pytest.fail(str(error), pytrace=False)
    yield made
    made.close()


@pytest.fixture
def frames(
    request: pytest.FixtureRequest, scenario: Optional[Document], _frames_host: FramesHost
) -> Iterator[Frames]:
    """Real frames on a fresh host in a file, whose switches have nothing of other tests."""
    host = _made(
        SharedHost,
        _frames_host.state,
        _scenario(request, scenario),
        request.path.parent,
        may_leave_memory=_may_leave_memory(request),
    )
    frames = _frames_host.frames(host)
    yield frames
    frames.close()


@pytest.hookimpl(trylast=True)  # type: ignore[misc]  # pluggy is not typed
def pytest_runtest_setup(item: pytest.Item) -> None:
    if _WATCH in item.stash:
        item.stash[_WATCH].end_of_setup()


@pytest.hookimpl(trylast=True)  # type: ignore[misc]  # pluggy is not typed
def pytest_runtest_call(item: pytest.Item) -> None:
    """Runs after a test that has passed; what it raises fails the test itself."""
    if _RECORDED in item.stash:
        item.stash[_RECORDED].end_of_passed_test()
    if _WATCH in item.stash:
        item.stash[_WATCH].end_of_passed_test()


@pytest.hookimpl(tryfirst=True)  # type: ignore[misc]  # pluggy is not typed
def pytest_runtest_teardown(item: pytest.Item) -> None:
    if _WATCH in item.stash:
        item.stash[_WATCH].start_of_teardown()


def _scenario(request: pytest.FixtureRequest, of_fixture: Optional[Document]) -> Optional[Document]:
    mark = request.node.get_closest_marker("scenario")
    if mark is None:
        return of_fixture
    if len(mark.args) != 1 or mark.kwargs:
        pytest.fail("the mark scenario takes one document", pytrace=False)
    document: Document = mark.args[0]
    return document


def _may_leave_memory(request: pytest.FixtureRequest) -> bool:
    mark = request.node.get_closest_marker("leaves_host_memory")
    if mark is None:
        return False
    if not (mark.args or mark.kwargs.get("reason")):
        pytest.fail("the mark leaves_host_memory takes a reason", pytrace=False)
    return True


def _made(kind: Type[AnyHost], *arguments: Any, **more: Any) -> AnyHost:
    try:
        return kind(*arguments, **more)
    except NotSimulated as error:
        why = str(error)
    except (HostRefused, OSError, TypeError, ValueError) as error:
        why = f"the scenario of this test cannot be used: {error}"
    pytest.fail(why, pytrace=False)
