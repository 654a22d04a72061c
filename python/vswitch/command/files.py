"""Documents in files: YAML or JSON, and nothing that either would read in two ways.

YAML is read as its core schema has it, with no other numbers than the whole ones of JSON: `yes`,
`010`, `12e5`, a date and an address of digits and colons are texts. A key that is there twice is
refused.
"""

import json
import re
import sys
from typing import Any, Callable, Dict, List, Tuple

import yaml

from vswitch.words import DocumentError

__all__ = ["read", "write"]

_TAG = "tag:yaml.org,2002:"


class _Loader(yaml.SafeLoader):
    """Scalars as the core schema has them, each key once, and no kinds that JSON has not."""

    yaml_implicit_resolvers: Dict[str, List[Tuple[str, Any]]] = {}
    yaml_constructors = {
        tag: construct
        for tag, construct in yaml.SafeLoader.yaml_constructors.items()
        if tag is None or tag.replace(_TAG, "") in ("null", "bool", "int", "str", "seq", "map")
    }


class _Dumper(yaml.SafeDumper):
    """What a newer schema takes for a number is written as the text that it is, too."""


for _tag, _pattern, _first in (
    ("null", r"null|Null|NULL|~|", ["~", "n", "N", ""]),
    ("bool", r"true|True|TRUE|false|False|FALSE", list("tTfF")),
    ("int", r"[-+]?(?:0|[1-9][0-9]*)", list("-+0123456789")),
    ("merge", r"<<", ["<"]),
):
    _Loader.add_implicit_resolver(f"{_TAG}{_tag}", re.compile(f"(?:{_pattern})$"), _first)

_Dumper.add_implicit_resolver(
    f"{_TAG}float",
    re.compile(r"0o[0-7]+$|[-+]?(?:\.[0-9]+|[0-9]+(?:\.[0-9]*)?)(?:[eE][-+]?[0-9]+)?$"),
    list("-+.0123456789"),
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


def _checked(kind: str) -> Callable[[Any, Any], Any]:
    """What makes a scalar, whose tag may promise more than its text holds."""
    construct = yaml.SafeLoader.yaml_constructors[f"{_TAG}{kind}"]

    def checked(loader: Any, node: Any) -> Any:
        try:
            return construct(loader, node)
        except (KeyError, ValueError):
            raise _problem(node, f"this is no {kind} that can be read") from None

    return checked


def _problem(node: Any, words: str) -> yaml.MarkedYAMLError:
    return yaml.MarkedYAMLError(problem=words, problem_mark=node.start_mark)


_Loader.add_constructor(f"{_TAG}map", _mapping)
for _tag in ("bool", "int"):
    _Loader.add_constructor(f"{_TAG}{_tag}", _checked(_tag))


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
    except DocumentError:
        raise
    except ValueError:
        # No JSON, or with a number of more digits than Python reads.
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
    written: str = yaml.dump(plain, Dumper=_Dumper, sort_keys=False)
    return written
