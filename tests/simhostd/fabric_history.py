"""What became of a fabric, change by change, as the cluster of its database wrote it down."""

import json
from dataclasses import dataclass, field
from pathlib import Path
from typing import Any, Dict, Iterable, Iterator, List, Mapping, Optional, Set

_TABLES = ("Fabric", "Switch", "Port", "Change")


@dataclass
class Port:
    """Of a switch that hosts share; `host` is where it is connected."""

    host: str = ""
    settings: Dict[str, Any] = field(default_factory=dict)


@dataclass
class Switch:
    """By the names of its ports and of its settings."""

    hosts: Set[str] = field(default_factory=set)
    settings: Dict[str, Any] = field(default_factory=dict)
    ports: Dict[str, Port] = field(default_factory=dict)


Switches = Dict[str, Switch]


@dataclass(frozen=True)
class Transaction:
    """A change that was made: its id, whose it was, the revision and the switches after it."""

    change: str
    host: str
    revision: int
    switches: Switches


def history(log: Path) -> List[Transaction]:
    """All changes, of the file of one server that has all of them."""
    tables: Dict[str, Dict[str, Dict[str, Any]]] = {name: {} for name in _TABLES}
    found = []
    for record in _records(log):
        for name in _TABLES:
            for row, columns in record.get(name, {}).items():
                if columns is None:
                    tables[name].pop(row, None)
                elif row in tables[name]:
                    _change(tables[name][row], columns)
                else:
                    tables[name][row] = row_in(columns)
        for change in record.get("Change", {}).values():
            if change is not None and not change.get("revoked"):
                (fabric,) = tables["Fabric"].values()
                switches = switches_in(tables["Switch"].values(), tables["Port"].values())
                made = change["id"], change.get("host", ""), fabric["revision"], switches
                found.append(Transaction(*made))
    return found


def switches_in(
    switches: Iterable[Mapping[str, Any]], ports: Iterable[Mapping[str, Any]]
) -> Switches:
    """Of rows, with values as they are in Python."""
    by_id = {
        row["id"]: (row["alias"], Switch(set(row["hosts"]), _settings(row))) for row in switches
    }
    for row in ports:
        _, switch = by_id[row["switch"]]
        switch.ports[row["id"]] = Port(row.get("host", ""), _settings(row))
    return dict(by_id.values())


def row_in(row: Mapping[str, Any]) -> Dict[str, Any]:
    """A row that a server told, with values as they are in Python."""
    values = {column: _said(value) for column, value in row.items()}
    return {**values, "hosts": _set_in(values.get("hosts", set()))}


def _records(log: Path) -> Iterator[Dict[str, Any]]:
    """What was done to rows. What a leader wrote that lost its majority another one wrote over."""
    entries: Dict[int, Optional[Dict[str, Any]]] = {}
    for line in log.read_text(encoding="utf-8").splitlines():
        if line.startswith("{"):
            record = json.loads(line)
            if "prev_data" in record:
                assert record["prev_data"][1] == {}, "the log does not begin with the fabric"
            if "index" in record and "term" in record:
                entries[record["index"]] = record["data"][1] if "data" in record else None
    for _, entry in sorted(entries.items()):
        if entry is not None:
            assert entry.get("_is_diff"), entry
            yield entry


def _change(row: Dict[str, Any], columns: Mapping[str, Any]) -> None:
    """Sets and maps are told as what came and what went."""
    for column, value in columns.items():
        there, other = row.get(column), _said(value)
        if column == "hosts":
            row[column] = _set_in(there or set()) ^ _set_in(other)
        elif isinstance(other, dict):
            went = {key for key in other if (there or {}).get(key) == other[key]}
            row[column] = {
                key: text for key, text in {**(there or {}), **other}.items() if key not in went
            }
        else:
            row[column] = other


def _said(value: Any) -> Any:
    """A value in the notation of RFC 7047."""
    if isinstance(value, list) and value[0] == "map":
        return dict(value[1])
    if isinstance(value, list) and value[0] == "set":
        return set(value[1])
    return value


def _set_in(value: Any) -> Set[str]:
    """One that has but one element is told as that."""
    return value if isinstance(value, set) else {value}


def _settings(row: Mapping[str, Any]) -> Dict[str, Any]:
    return {name: json.loads(text) for name, text in row.get("settings", {}).items()}
