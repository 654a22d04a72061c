"""Documents in files: YAML or JSON, and nothing that either would read in two ways.

YAML is read as its core schema has it: `yes`, `010`, a date and an address of digits and colons are
texts. A key that is there twice is refused.
"""

import json
import re
import sys
from typing import Any, Dict, List, Tuple

import yaml

from vswitch.words import DocumentError

__all__ = ["read", "write"]

_MAP = "tag:yaml.org,2002:map"


class _Loader(yaml.SafeLoader):
    """Scalars as the core schema has them, and each key once."""

    yaml_implicit_resolvers: Dict[str, List[Tuple[str, Any]]] = {}


for _tag, _pattern, _first in (
    ("null", r"null|Null|NULL|~|", ["~", "n", "N", ""]),
    ("bool", r"true|True|TRUE|false|False|FALSE", list("tTfF")),
    ("int", r"[-+]?(?:0|[1-9][0-9]*)", list("-+0123456789")),
    ("merge", r"<<", ["<"]),
):
    _Loader.add_implicit_resolver(
        f"tag:yaml.org,2002:{_tag}", re.compile(f"(?:{_pattern})$"), _first
    )


def _mapping(loader: Any, node: Any) -> Any:
    seen = set()
    for key, _ in node.value:
        if not isinstance(key, yaml.ScalarNode):
            raise _problem(key, "a key that is no text")
        if key.value in seen:
            raise _problem(key, f"the key {key.value!r} is there twice")
        seen.add(key.value)
    return loader.construct_mapping(node, deep=True)


def _problem(node: Any, words: str) -> yaml.MarkedYAMLError:
    return yaml.MarkedYAMLError(problem=words, problem_mark=node.start_mark)


_Loader.add_constructor(_MAP, _mapping)


def read(name: str) -> Any:
    """The document in a file; - is standard input. DocumentError says where it is none."""
    try:
        if name == "-":
            data = sys.stdin.buffer.read()
        else:
            with open(name, "rb") as file:
                data = file.read()
        return _parsed(data.decode("utf-8-sig"))
    except UnicodeDecodeError as error:
        raise DocumentError(name, f"no text: {error}") from None
    except yaml.YAMLError as error:
        raise DocumentError(name, _said(error)) from None
    except RecursionError:
        raise DocumentError(name, "it is nested too deeply") from None
    except DocumentError as error:
        raise DocumentError(name, str(error)) from None


def _parsed(text: str) -> Any:
    try:
        return json.loads(text, object_pairs_hook=_once)
    except json.JSONDecodeError:
        return yaml.load(text, _Loader)


def _once(pairs: List[Tuple[str, Any]]) -> Dict[str, Any]:
    found: Dict[str, Any] = {}
    for key, value in pairs:
        if key in found:
            raise DocumentError("", f"the key {key!r} is there twice")
        found[key] = value
    return found


def _said(error: yaml.YAMLError) -> str:
    mark = getattr(error, "problem_mark", None)
    problem = getattr(error, "problem", None) or str(error).splitlines()[0]
    return f"line {mark.line + 1}: {problem}" if mark is not None else problem


def write(document: Dict[str, Any]) -> str:
    """A document as YAML that any reader of YAML takes as it is meant."""
    # What is ready for JSON may be of kinds that only look like a number or a text.
    plain = json.loads(json.dumps(document))
    written: str = yaml.safe_dump(plain, sort_keys=False)
    return written
