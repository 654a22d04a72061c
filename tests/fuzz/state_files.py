#!/usr/bin/env python3
"""Damages state files at random, and looks at what the host makes of each.

    state_files.py [--seconds N | --mutations N] [--seed N]

Prints what is wrong and, last, how many states it tried.

A damaged state is described and called on, in a process of its own, by a call of each family. All
of them have to end in a result, a status or an OSError that names the file. What is not tried: a
fault that waits, which is right to; and files that change while they are read.
"""

import argparse
import ctypes
import faulthandler
import json
import os
import random
import resource
import shutil
import sqlite3
import sys
import tempfile
import time
from pathlib import Path
from typing import Any, Callable, Dict, List, NamedTuple, Tuple

import libvswitch as vs
from libvswitch.enums import Multicast

BUILD = Path(os.environ["BUILD_DIR"])
PATIENCE = 30
"""Seconds of computing after which calls on one state hang."""

# Something in every table. A fault waits for one call, which may end in any way.
DOCUMENT = {
    "faults": [{"call": "VSDVS_GetMTU", "exception": "OSError", "message": "gone", "nth": 9}],
    "mac_learning": {"aging_time": 100},
    "runtime_options": {"MaxRARPsPerInterval": 5, "IGMPRouterIP": "192.0.2.1"},
    "uplinks": [{"name": "nic4", "link": "down"}],
    "switches": [
        {
            "alias": "vswitch0",
            "lags": [{"name": "lag0", "uplinks": ["nic5"]}],
            "counters": {"txErrors": 3},
        }
    ],
}

Odd = [
    *(None, -1, 0, 1, 2, 3, 7, 101, 255, 4095, 65536, 2**31, 2**32, 2**63 - 1, -(2**63)),
    *(0.5, "", "x", "web-1", "nic5", "x" * 48, "x" * 300, "a\0b", "ünder"),
    *(b"", b"\0", b"\x02" * 5, b"\x02" * 6, b"\xff" * 4, b"\xff" * 17, b"\xff" * 2000),
]

SCHEMAS = [
    "CREATE TRIGGER t AFTER UPDATE ON switch BEGIN"
    " UPDATE switch SET version = version + 1 WHERE key = new.key; END",
    "CREATE VIEW v AS SELECT * FROM v2",
    "CREATE TABLE property2 AS SELECT * FROM property",
    "DROP INDEX property_by_owner",
    "DROP TABLE link",
    "DROP TRIGGER address_added",
    "ALTER TABLE port ADD COLUMN colour TEXT",
    "ALTER TABLE fault RENAME TO faults",
    "PRAGMA user_version = 99",
    "PRAGMA application_id = 7",
]


class Outcome(NamedTuple):
    """What became of a run."""

    inputs: int
    """How many states were tried."""
    wrong: List[str]


class Believer(Exception):
    """A planted fault is not what it seems: what a host does that believes what it reads."""


def _columns(database: sqlite3.Connection) -> List[Tuple[str, str]]:
    tables = [
        name
        for (name,) in database.execute("SELECT name FROM sqlite_schema WHERE type = 'table'")
        if not name.startswith("sqlite_stat")
    ]
    return [
        (table, row[1])
        for table in tables
        for row in database.execute(f"PRAGMA table_info({table})")
        if (table, row[1]) != ("fault", "delay")
    ]


def _key_of(database: sqlite3.Connection, table: str) -> str:
    """The columns that tell its rows apart."""
    (sql,) = database.execute("SELECT sql FROM sqlite_schema WHERE name = ?", (table,)).fetchone()
    if "WITHOUT ROWID" not in sql:
        return "rowid"
    columns = database.execute(f"PRAGMA table_info({table})")
    return ", ".join(name for _, name, _, _, _, place in columns if place)


def _damaged_bytes(value: bytes, chance: random.Random) -> bytes:
    """Another length, or other bytes in some places."""
    damaged = bytearray(value)
    if chance.random() < 0.3:
        return bytes(damaged[: chance.randrange(len(damaged) + 1)])
    for _ in range(chance.randrange(1, 5)):
        if damaged:
            damaged[chance.randrange(len(damaged))] = chance.choice((0, 1, 0x7F, 0xFF))
    return bytes(damaged)


def change_value(file: Path, chance: random.Random) -> str:
    """Puts something odd into a row, of any type."""
    database = sqlite3.connect(file, isolation_level=None)
    database.execute("PRAGMA writable_schema = ON")
    kept = database.execute("SELECT sql, rowid FROM sqlite_schema").fetchall()
    database.execute(
        "UPDATE sqlite_schema SET sql = replace(replace(replace("
        "sql, ') STRICT, ', ') '), ') STRICT', ')'), ' NOT NULL', '') WHERE type = 'table'"
    )
    table, column = chance.choice(_columns(database))
    database.close()
    database = sqlite3.connect(file, isolation_level=None)
    database.execute("PRAGMA ignore_check_constraints = ON")
    rows = database.execute(f"SELECT {column} FROM {table}").fetchall()
    row = chance.randrange(len(rows)) if rows else 0
    value = chance.choice(Odd)
    if rows and isinstance(rows[row][0], bytes) and chance.random() < 0.7:
        value = _damaged_bytes(rows[row][0], chance)
    key = _key_of(database, table)
    what = f"{table}.{column} of row {row} = {value!r:.60}"
    try:
        database.execute(
            f"UPDATE {table} SET {column} = ? WHERE ({key}) ="
            f" (SELECT {key} FROM {table} LIMIT 1 OFFSET {row})",
            (value,),
        )
    except sqlite3.Error as error:
        what += f", which SQLite refuses: {error}"
    database.execute("PRAGMA writable_schema = ON")
    database.executemany("UPDATE sqlite_schema SET sql = ? WHERE rowid = ?", kept)
    database.close()
    return what


def remove_row(file: Path, chance: random.Random) -> str:
    """Takes a row away, and leaves what refers to it."""
    database = sqlite3.connect(file, isolation_level=None)
    table, _ = chance.choice(_columns(database))
    key = _key_of(database, table)
    row = chance.randrange(4)
    database.execute(
        f"DELETE FROM {table} WHERE ({key}) = (SELECT {key} FROM {table} LIMIT 1 OFFSET {row})"
    )
    database.close()
    return f"row {row} of {table} is removed"


def change_schema(file: Path, chance: random.Random) -> str:
    """Makes the tables others than a state's."""
    database = sqlite3.connect(file, isolation_level=None)
    sql = chance.choice(SCHEMAS)
    database.execute(sql)
    database.close()
    return sql


def change_pages(file: Path, chance: random.Random) -> str:
    """Overwrites bytes, puts a page at the place of another, or cuts the file."""
    content = bytearray(file.read_bytes())
    page = 4096
    kind = chance.randrange(4)
    if kind == 0:
        source, target = (chance.randrange(len(content) // page) * page for _ in range(2))
        content[target : target + page] = content[source : source + page]
        what = f"page {source // page} at the place of {target // page}"
    elif kind == 1:
        del content[chance.randrange(len(content)) :]
        what = f"cut at {len(content)}"
    else:
        # The heads of pages say how they hang together.
        heads = [at + offset for at in range(0, len(content), page) for offset in range(64)]
        places = [
            chance.choice(heads) if kind == 2 else chance.randrange(len(content))
            for _ in range(chance.randrange(1, 9))
        ]
        for at in places:
            content[at] = chance.choice((0, 1, 2, 5, 13, chance.randrange(256)))
        what = f"bytes at {places}"
    file.write_bytes(content)
    return what


MUTATIONS: List[Callable[[Path, random.Random], str]] = [
    *[change_value] * 6,
    *[change_pages] * 3,
    remove_row,
    change_schema,
]


def describe(simhost: Any) -> None:
    """Writes the whole host as a document."""
    text = ctypes.create_string_buffer(1 << 20)
    if simhost.simhost_describe(text, ctypes.c_size_t(len(text))) == 0:
        assert simhost.simhost_error(), "a refusal says why"


def calls(simhost: Any) -> Dict[str, Callable[[], object]]:
    """A call of each family, with what it allocates released."""
    switch, port = "vswitch0", "web-1"
    identifier = "5f0c7a1e-27c4-4b61-9d0e-6a5b8f3d2c10"

    def freed(result: Any, free: Callable[[Any], object] = vs.VSQEX_FreeMemory) -> None:
        if isinstance(result, list) and result[0] == vs.QEX_OK:
            str(result[1])
            free(result[1])

    def number() -> int:
        found = vs.VSDVS_DvPortIDToPortID(switch, port)
        return int(found[1])

    def state() -> None:
        kept, length = vs.Cell("void *"), vs.Cell("int")
        if vs.DVSQEX_StateGet(kept.pointer, length.pointer) == vs.QEX_OK:
            vs.DVSQEX_DataFree(kept.value)

    def lags() -> None:
        table = vs.Cell("VSLAGTable *")
        if vs.VSQEX_GetLAGTable(switch, table.pointer) == vs.QEX_OK:
            with vs.owned(table):
                str(table.value)

    every = vs.VS_MAC_ADDR_TYPE_ALL

    def filters() -> None:
        for mode in Multicast:
            freed(vs.VSQEX_GetMcastFilters(switch, number(), mode))

    return {
        "simhost_describe": lambda: describe(simhost),
        "VSDVS_GetMTU": lambda: vs.VSDVS_GetMTU(switch, vs.Cell("qex_uint32").pointer),
        "VSQEX_GetVSInfo": lambda: vs.VSQEX_GetVSInfo(switch, vs.VSInfo()),
        "VSQEX_GetUplinks": lambda: freed(vs.VSQEX_GetUplinks(switch)),
        "VSQEX_GetLAGTable": lags,
        "hint": lambda: vs.VSQEX_PortGetTeamUplinkHint(number(), vs.qex_Name()),
        "VSQEX_GetTeamMACTable": lambda: freed(vs.VSQEX_GetTeamMACTable(switch, every)),
        "VSQEX_GetPortMACTable": lambda: freed(vs.VSQEX_GetPortMACTable(switch, port, every)),
        "filters": filters,
        "filter": lambda: freed(
            vs.VSQEX_GetMcastFilterStats(
                switch, number(), vs.VS_MCAST_FILTER_MODE_IGMP, bytes((239, 1, 1, 1))
            )
        ),
        "options": lambda: freed(vs.VSQEX_GetRuntimeOptions(None, 0)),
        "rarp": lambda: vs.VSQEX_GetRARPStats(switch, vs.VSRARPStats()),
        "VSDVS_GetPortSecurity": lambda: vs.VSDVS_GetPortSecurity(
            switch, port, vs.VSPropSecurity()
        ),
        "DVSState_PortFind": lambda: vs.DVS_PortId(vs.DVSState_PortFind(identifier, port)),
        "DVSQEX_StateGet": state,
        "VSDVS_SetMTU": lambda: vs.VSDVS_SetMTU(switch, 9000),
        "VSDVS_AddDVPort": lambda: vs.VSDVS_AddDVPort(switch, "another", 0),
        "simhost_learn": lambda: simhost.simhost_learn(
            switch.encode(), port.encode(), b"02:00:00:00:00:09", 0, 0
        ),
        "simhost_set_link": lambda: simhost.simhost_set_link(b"nic5", 0),
        "simhost_clock_step": lambda: simhost.simhost_clock_step(ctypes.c_int64(1000)),
        "VSDVS_RemoveDVPort": lambda: vs.VSDVS_RemoveDVPort(switch, port),
        "simhost_restart": lambda: simhost.simhost_restart(),
        "VSDVS_DestroyVSwitch": lambda: vs.VSDVS_DestroyVSwitch(switch),
        "again": lambda: describe(simhost),
    }


def _believe(file: Path, planted: str) -> None:
    """What a host would do that looked at a fault's exception without a doubt."""
    try:
        database = sqlite3.connect(file)
        (exception,) = database.execute("SELECT exception FROM fault").fetchone() or ("OSError",)
    except sqlite3.Error:
        return
    if exception == "OSError":
        return
    if planted == "crash":
        ctypes.string_at(0)
    while planted == "hang":
        pass
    raise Believer("what was read was believed")


def use(file: Path, planted: str) -> None:
    """Makes all calls on a state. Raises for what is neither a result nor an error in words; of a
    state that is sound, for any error."""
    os.environ["SIMHOST_STATE"] = str(file)
    simhost = ctypes.CDLL(str(BUILD / "simhost" / "libsimhost.so"))
    simhost.simhost_error.restype = ctypes.c_char_p
    simhost.simhost_describe.restype = ctypes.c_size_t
    if planted in ("crash", "hang", "untrue"):
        _believe(file, planted)
    for name, call in calls(simhost).items():
        try:
            call()
        except OSError as error:
            if planted == "sound" or str(file) not in str(error) and name != "VSDVS_GetMTU":
                raise
        except RuntimeError as error:
            # What is not there has no handle, and to ask what it is called is a caller's mistake.
            if "handle" not in str(error):
                raise


def survives(file: Path, planted: str = "") -> str:
    """Uses a state in a child; what was wrong, or nothing."""
    readable, writable = os.pipe()
    child = os.fork()
    if child == 0:
        os.dup2(writable, 2)
        resource.setrlimit(resource.RLIMIT_CPU, (PATIENCE, PATIENCE))
        resource.setrlimit(resource.RLIMIT_CORE, (0, 0))
        faulthandler.enable()
        try:
            use(file, planted)
            os._exit(0)
        except BaseException as error:  # pylint: disable=broad-except
            os.write(2, f"{type(error).__name__}: {error}".encode("utf-8", "replace"))
            os._exit(1)
    os.close(writable)
    with open(readable, "rb") as pipe:
        said = pipe.read().decode("utf-8", "replace")
    ended = os.waitpid(child, 0)[1]
    status = -os.WTERMSIG(ended) if os.WIFSIGNALED(ended) else os.WEXITSTATUS(ended)
    return "" if status == 0 else f"status {status}: {said[-2000:]}"


def make_state(file: Path) -> None:
    """A default host with something in every table."""
    child = os.fork()
    if child == 0:
        os.environ["SIMHOST_STATE"] = str(file)
        simhost = ctypes.CDLL(str(BUILD / "simhost" / "libsimhost.so"))
        simhost.simhost_error.restype = ctypes.c_char_p
        status = simhost.simhost_apply(json.dumps(DOCUMENT).encode())
        if status != 0:
            print(simhost.simhost_error(), file=sys.stderr)
        # An end that closes the state, so that the file is the whole of it, and nothing of ours.
        ctypes.CDLL(None).exit(1 if status else 0)
    if os.waitpid(child, 0)[1] != 0:
        raise SystemExit("the state to be damaged could not be made")


def run(
    seed: int, mutations: int = 0, seconds: float = 0, planted: str = "", most: int = 3
) -> Outcome:
    """Damage and use states until there are so many, time is over, or enough is wrong."""
    wrong: List[str] = []
    tried = 0
    end = time.monotonic() + seconds
    with tempfile.TemporaryDirectory() as folder:
        whole = Path(folder) / "whole.db"
        make_state(whole)
        while (tried < mutations if mutations else time.monotonic() < end) and len(wrong) < most:
            chance = random.Random(f"{seed} {tried}")
            damaged = Path(folder) / "host.db"
            for beside in Path(folder).glob("host.db*"):
                beside.unlink()
            shutil.copy(whole, damaged)
            did = [chance.choice(MUTATIONS)(damaged, chance)]
            said = survives(damaged, planted)
            if said:
                wrong.append(f"mutation {tried} of seed {seed}: {'; '.join(did)}: {said}")
            tried += 1
    return Outcome(tried, wrong)


def main() -> int:
    """Run on what the command line says."""
    parser = argparse.ArgumentParser()
    parser.add_argument("--mutations", type=int, default=0)
    parser.add_argument("--seconds", type=int, default=60)
    parser.add_argument("--seed", type=int, default=random.randrange(1, 2**31))
    parser.add_argument("--most", type=int, default=3, help="stop after so many findings")
    given = parser.parse_args()
    print(f"seed {given.seed}", file=sys.stderr)
    done = run(given.seed, given.mutations, given.seconds, most=given.most)
    print(*done.wrong, done.inputs, sep="\n")
    return 1 if done.wrong else 0


if __name__ == "__main__":
    sys.exit(main())
