"""Values and operations in the notation of RFC 7047."""

from typing import Any, Dict, Iterable, List, Mapping, Tuple

__all__ = [
    "Operation",
    "Row",
    "Rows",
    "Where",
    "delete",
    "insert",
    "map_of",
    "mutate",
    "pairs_in",
    "select",
    "set_of",
    "unchanged",
    "update",
    "values_in",
    "where",
]

Operation = Dict[str, Any]
Row = Dict[str, Any]
Rows = Dict[str, Dict[str, Row]]
"""Of each table its rows, by what the database calls them."""
Where = List[Tuple[str, str, Any]]


def values_in(column: Any) -> List[Any]:
    """Those of a set, of which one value may stand alone."""
    if isinstance(column, list) and column[:1] == ["set"]:
        return list(column[1])
    return [column]


def pairs_in(column: Any) -> Dict[str, str]:
    return {str(key): str(value) for key, value in column[1]}


def set_of(values: Iterable[str]) -> List[Any]:
    return ["set", list(values)]


def map_of(pairs: Mapping[str, str]) -> List[Any]:
    return ["map", [[key, value] for key, value in pairs.items()]]


def where(**equal: Any) -> Where:
    return [(column, "==", value) for column, value in equal.items()]


def insert(table: str, **row: Any) -> Operation:
    return {"op": "insert", "table": table, "row": row}


def select(table: str, which: Where, *columns: str) -> Operation:
    return {"op": "select", "table": table, "where": which, "columns": columns}


def update(table: str, which: Where, **row: Any) -> Operation:
    return {"op": "update", "table": table, "where": which, "row": row}


def mutate(table: str, which: Where, column: str, mutator: str, value: Any) -> Operation:
    mutations = [(column, mutator, value)]
    return {"op": "mutate", "table": table, "where": which, "mutations": mutations}


def delete(table: str, which: Where) -> Operation:
    return {"op": "delete", "table": table, "where": which}


def unchanged(table: str, which: Where, **row: Any) -> Operation:
    """Refuses the transaction unless the one row has these values."""
    return {
        "op": "wait",
        "timeout": 0,
        "table": table,
        "where": which,
        "columns": list(row),
        "until": "==",
        "rows": [row],
    }
