"""The comments of headers: how they are read, and what is refused in them."""

import shutil
from pathlib import Path
from typing import Dict, List

import call_model
import comments
import pytest
import statuses
from catalogue import Catalogue
from comments import Header
from conftest import BUILD, ROOT
from definitions import Type

STATUSES = {"QEX_OK", "QEX_EXISTS", "QEX_NOT_FOUND", "QEX_BAD_PARAM"}
FILE = """/**
 * @file
 * Switches.
 *
 * - QEX_NOT_FOUND for a name the host does not know (`switchName`,
 *   `port`)
 * - QEX_BAD_PARAM for a null where nothing allows it
 *
 * @param switchName alias of the switch
 * @param port identifier of the port
 */
"""
ADD = """
/**
 * Adds a port.
 *
 * - QEX_EXISTS if `port` is taken,
 *   by whatever it may be
 * - QEX_BAD_PARAM for an empty one
 *
 * @param port identifier of the new port
 */
QEX_ReturnStatus Add(char const *switchName, char const *port);
"""
REST = """
/** Removes a port. */
QEX_ReturnStatus Remove(char const *switchName, char const *port);

/** Removes all ports of the host. */
QEX_ReturnStatus Clear(void);

/** Whether there is a port: 1 or 0. */
char Exists(char const *port);
"""


def declared(name: str, *texts: str, result: str = call_model.STATUS) -> call_model.Call:
    """A call that takes texts."""
    nothing = call_model.Value(call_model.Ownership.VALUE)
    arguments = tuple(
        call_model.Argument(
            name=text,
            type=Type(("p",), "char"),
            c_type="char const *",
            direction=call_model.Direction.IN,
            is_nullable=False,
            length=None,
            room=0,
            value=nothing,
            is_added=False,
        )
        for text in texts
    )
    returned = call_model.Result(Type((), result), result, False, nothing)
    return call_model.Call(name, "switches", "", arguments, returned, takes_more=False)


CALLS = {
    one.name: one
    for one in (
        declared("Add", "switchName", "port"),
        declared("Remove", "switchName", "port"),
        declared("Clear"),
        declared("Exists", "port", result="char"),
    )
}


def header(text: str, folder: Path) -> Header:
    path = folder / "switches.h"
    path.write_text(text, encoding="ascii")
    return comments.read(path, "switches.h")


@pytest.mark.parametrize(
    "call, expected",
    [
        (
            "Add",
            {
                "QEX_OK": "done",
                "QEX_EXISTS": "if `port` is taken, by whatever it may be",
                "QEX_BAD_PARAM": "for an empty one; for a null where nothing allows it",
                "QEX_NOT_FOUND": "for a name the host does not know (`switchName`)",
            },
        ),
        (
            "Remove",
            {
                "QEX_OK": "done",
                "QEX_NOT_FOUND": "for a name the host does not know (`switchName`, `port`)",
                "QEX_BAD_PARAM": "for a null where nothing allows it",
            },
        ),
        ("Clear", {"QEX_OK": "done"}),
        ("Exists", {}),
    ],
)
def test_statuses_of_a_call(call: str, expected: Dict[str, str], tmp_path: Path) -> None:
    read = header(FILE + ADD + REST, tmp_path)
    assert statuses.of_call(CALLS[call], read) == expected
    assert statuses.refused([read], CALLS, STATUSES) == []


def test_success_in_a_call_s_own_words(tmp_path: Path) -> None:
    read = header(FILE + ADD.replace("QEX_BAD_PARAM for", "QEX_OK for"), tmp_path)
    assert statuses.of_call(CALLS["Add"], read)["QEX_OK"] == "for an empty one"


def test_the_parameters_that_must_name_something(tmp_path: Path) -> None:
    read = header(FILE + ADD + REST, tmp_path)
    assert statuses.concerned(CALLS["Add"], read)["QEX_NOT_FOUND"] == ["switchName"]
    assert statuses.concerned(CALLS["Remove"], read)["QEX_NOT_FOUND"] == ["switchName", "port"]


def test_a_list_is_no_running_text(tmp_path: Path) -> None:
    comment = header(FILE + ADD, tmp_path).comments["Add"]
    assert comment.text == "Adds a port."
    assert comment.parameters == {"port": "identifier of the new port"}


def test_what_is_said_of_single_constants(tmp_path: Path) -> None:
    text = """
/** Limits. */
#define MAX_PORTS 8 /**< ports of a switch */
#define MAX_NAME "x" /**< bytes of a name */
#define MAX_REST (-1)

/** Kinds of ports. */
typedef enum Kind {
  KIND_ANY = 0,
  KIND_UP = 1,   /**< an uplink */
  KIND_LONG = 2, /**< what takes
                      two lines */
  /** said before it */
  KIND_LAST,
} Kind;
"""
    limits, kinds = header(FILE + text, tmp_path).families
    assert (limits.title, limits.names) == ("MAX_*", ("MAX_PORTS", "MAX_NAME", "MAX_REST"))
    assert limits.remarks == {"MAX_PORTS": "ports of a switch", "MAX_NAME": "bytes of a name"}
    assert (kinds.title, kinds.text) == ("Kind", "Kinds of ports.")
    assert kinds.names == ("KIND_ANY", "KIND_UP", "KIND_LONG", "KIND_LAST")
    assert kinds.remarks == {
        "KIND_UP": "an uplink",
        "KIND_LONG": "what takes\ntwo lines",
        "KIND_LAST": "said before it",
    }


@pytest.mark.parametrize(
    "right, wrong, refused",
    [
        ("- QEX_EXISTS if", "- QEX_EXIST if", ["Add: QEX_EXIST is no status"]),
        ("- QEX_EXISTS if", "- if", ["Add: if is no status"]),
        ("- QEX_EXISTS if", "- `QEX_EXISTS` if", ["Add: what a list names is no status"]),
        ("- QEX_NOT_FOUND for", "- QEX_NOTFOUND for", ["switches.h: QEX_NOTFOUND is no status"]),
        ("Adds a port.", "Adds it; QEX_EXISTS if it is there.", ["Add: QEX_EXISTS belongs"]),
        ("Removes a port.", "QEX_NOT_FOUND if none.", ["Remove: QEX_NOT_FOUND belongs"]),
        ("new port", "new port, else QEX_BAD_PARAM", ["Add: QEX_BAD_PARAM belongs"]),
        ("Switches.", "A null is QEX_BAD_PARAM.", ["switches.h: QEX_BAD_PARAM belongs"]),
        ("(`switchName`,", "(`switchname`,", ["switches.h: no call takes a text switchname"]),
        (
            "(`switchName`,\n *   `port`)",
            "(switchName, port)",
            ["switches.h: QEX_NOT_FOUND has no list of `parameters` in parentheses"],
        ),
        (
            " * @param switchName alias of the switch\n",
            "",
            ["switches.h: nothing says what switchName is", "Add: nothing says what switchName is"],
        ),
        (" * @param port identifier of the new", " * @param prot", ["Add: has no parameter prot"]),
        ("@param switchName", "@param switch", ["switches.h: no call has a parameter switch"]),
        (
            "/** Whether there is a port: 1 or 0. */",
            "/**\n * Whether there is a port.\n *\n * - QEX_OK if there is\n */",
            ["Exists: lists statuses, but returns none"],
        ),
    ],
)
def test_what_is_refused(right: str, wrong: str, refused: List[str], tmp_path: Path) -> None:
    text = FILE + ADD + REST
    assert text.count(right) == 1
    found = statuses.refused([header(text.replace(right, wrong), tmp_path)], CALLS, STATUSES)
    for one in refused:
        assert any(line.startswith(one) for line in found), found


@pytest.mark.parametrize(
    "comment, message",
    [
        ("Something.\n\n@retur nothing", "unknown command @retur in a comment"),
        ("- QEX_OK if so\n- QEX_OK if not", "QEX_OK is listed twice in a comment"),
    ],
)
def test_a_comment_that_cannot_be_read(comment: str, message: str) -> None:
    with pytest.raises(ValueError) as raised:
        comments.parted(comment)
    assert str(raised.value) == message


def test_no_page_is_made_of_what_is_refused(tmp_path: Path) -> None:
    for folder in ("include", "helpers"):
        shutil.copytree(ROOT / folder, tmp_path / folder)
    planted = tmp_path / "include/vswitch/queries.h"
    text = planted.read_text(encoding="ascii")
    planted.write_text(text.replace("- QEX_ENETDOWN if", "- QEX_NETDOWN if"), encoding="ascii")
    with pytest.raises(ValueError) as raised:
        Catalogue(tmp_path, BUILD)
    assert str(raised.value) == (
        "include/README.md asks for other comments\n"
        "VSQEX_PortGetTeamUplinkHint: QEX_NETDOWN is no status"
    )
