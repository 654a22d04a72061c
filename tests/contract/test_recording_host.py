"""The recording host itself: it replaces the host of an unchanged module, and it can tell."""

import collections
import ctypes
from typing import Optional

import _libvswitch as vs
import children
import pytest
from children import BUILD, HERE
from peer import pointer_object
from recording_host import RecordingHost, loaded_files


@pytest.mark.parametrize("folder", [None, "tests/recording_host"])
def test_the_library_path_changes_the_host_under_an_unchanged_module(
    folder: Optional[str],
) -> None:
    script = (
        "import _libvswitch, recording_host as r;"
        "print(_libvswitch.__file__, *r.loaded_files('libvswitch.so'))"
    )
    path = str(BUILD / folder) if folder else None
    result = children.run("-c", script, LD_LIBRARY_PATH=path)
    library = BUILD / (folder or "simhost") / "libvswitch.so"
    assert result.stdout.split() == [vs.__file__, str(library)], result.stderr


def test_contract_tests_refuse_another_host() -> None:
    command = ["-m", "pytest", "-p", "no:cacheprovider", str(HERE)]
    result = children.run(*command, LD_LIBRARY_PATH=None)
    assert result.returncode == 3
    assert "which is not the recording host" in result.stdout + result.stderr


def test_this_process_runs_on_the_recording_host(host: RecordingHost) -> None:
    assert loaded_files("libvswitch.so") == [BUILD / "tests/recording_host/libvswitch.so"]
    assert host.functions["VSDVS_SetMTU"].parameters == ("const char*", "unsigned int")


def test_rules_hold_for_the_nth_call_or_for_every_other(host: RecordingHost) -> None:
    host.answer("VSDVS_SetMTU", 10)
    host.answer("VSDVS_SetMTU", 20, nth=2)
    host.spring("VSDVS_SetMTU", RuntimeError, "third", nth=3)
    assert [vs.VSDVS_SetMTU("a", 1), vs.VSDVS_SetMTU("a", 2)] == [10, 20]
    with pytest.raises(RuntimeError, match="^third$"):
        vs.VSDVS_SetMTU("a", 3)
    assert vs.VSDVS_SetMTU("a", 4) == 10
    assert [call.values[1] for call in host.calls()] == [1, 2, 3, 4]

    host.reset()
    assert vs.VSDVS_SetMTU("a", 5) == 0
    assert host.calls() == [("VSDVS_SetMTU", (b"a", 5))]


def test_calls_without_notes_are_served_and_counted(host: RecordingHost) -> None:
    host.answer("VSDVS_SetMTU", 20, nth=2)
    host.take_no_notes()
    assert [vs.VSDVS_SetMTU("a", 1), vs.VSDVS_SetMTU("a", 2)] == [0, 20]
    assert host.calls() == []

    host.reset()
    vs.VSDVS_SetMTU("a", 3)
    assert len(host.calls()) == 1


def test_captured_memory_is_what_the_call_found(host: RecordingHost) -> None:
    data = ctypes.create_string_buffer(b"before\0behind", 16)
    host.capture("VSDVS_FreeMemory", 1, 16)
    vs.VSDVS_FreeMemory(pointer_object(ctypes.addressof(data), "unsigned int *"))
    data.value = b"after"
    assert host.details()[0].memory == (b"before\0behind\0\0\0",)


def test_what_does_not_exist_cannot_be_told_anything(host: RecordingHost) -> None:
    with pytest.raises(ValueError):
        host.answer("VSDVS_NoSuchCall", 0)
    with pytest.raises(ValueError):
        host.capture("VSDVS_SetMTU", 3, 1)
    with pytest.raises(ValueError):
        host.spring("Panic", RuntimeError, "nowhere to go")


def test_every_call_of_the_host_is_recorded(host: RecordingHost) -> None:
    families = collections.Counter(name.split("_")[0] for name in host.functions)
    assert families.pop("VSDVS") == 53
    assert families.pop("VSQEX") == 26
    assert sum(families.values()) == 67
