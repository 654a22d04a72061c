"""Which statuses a call returns and when, as the comments of the call and of its header list them.

Nothing is read out of running text. What is not written as include/README.md asks for is refused.
"""

import re
from typing import Collection, Dict, Iterator, List, Mapping, Tuple

from call_model import Call
from comments import Comment, Header

_CONCERNED = re.compile(r" \((`\w+`(?:, `\w+`)*)\)$")


def of_call(call: Call, header: Header) -> Dict[str, str]:
    """The statuses of a call; none if it returns something else."""
    if not call.has_status:
        return {}
    found = {"QEX_OK": "done", **header.comments[call.name].statuses}
    for status, text in header.text.statuses.items():
        said = _said_of(call, text, header)
        if said:
            found[status] = f"{found[status]}; {said}" if status in found else said
    return found


def concerned(call: Call, header: Header) -> Dict[str, List[str]]:
    """The parameters of a call that the statuses of its header are about."""
    return {
        status: _taken(call, parameters, header)
        for status, text in header.text.statuses.items()
        for _, parameters in [_parted(text)]
    }


def refused(
    headers: Collection[Header], calls: Mapping[str, Call], statuses: Collection[str]
) -> List[str]:
    """What is not written as it should be, each with where it stands."""
    return [
        one
        for header in headers
        for one in _refused(header, [calls[name] for name in header.comments], statuses)
    ]


def _said_of(call: Call, text: str, header: Header) -> str:
    """What a header's status says of one call; nothing if it does not concern it."""
    when, parameters = _parted(text)
    if not parameters:
        return when if call.has_pointers else ""
    taken = _taken(call, parameters, header)
    return f"{when} ({', '.join(f'`{one}`' for one in taken)})" if taken else ""


def _parted(text: str) -> Tuple[str, List[str]]:
    """When a header's status is returned, and the parameters that it is about."""
    listed = _CONCERNED.search(text)
    if listed is None:
        return text, []
    return text[: listed.start()], re.findall(r"\w+", listed[1])


def _taken(call: Call, parameters: Collection[str], header: Header) -> List[str]:
    """Those of parameters that a call takes as what the header says they are."""
    own = header.comments[call.name].parameters
    return [one for one in call.texts if one in parameters and one not in own]


def _refused(header: Header, calls: Collection[Call], statuses: Collection[str]) -> Iterator[str]:
    where = header.name
    yield from _misplaced(where, header.text, statuses)
    for status, text in header.text.statuses.items():
        if text.endswith(")") and not _parted(text)[1]:
            yield f"{where}: {status} has no list of `parameters` in parentheses"
    listed = {one for text in header.text.statuses.values() for one in _parted(text)[1]}
    taken = {one for call in calls for one in call.texts}
    for parameter in sorted(listed - taken):
        yield f"{where}: no call takes a text {parameter}"
    for parameter in sorted(listed - set(header.text.parameters)):
        yield f"{where}: nothing says what {parameter} is"
    for parameter in header.text.parameters:
        if not any(_has_parameter(call, parameter) for call in calls):
            yield f"{where}: no call has a parameter {parameter}"
    for call in calls:
        yield from _refused_of_call(call, header, statuses)


def _refused_of_call(call: Call, header: Header, statuses: Collection[str]) -> Iterator[str]:
    comment = header.comments[call.name]
    yield from _misplaced(call.name, comment, statuses)
    if comment.statuses and not call.has_status:
        yield f"{call.name}: lists statuses, but returns none"
    for parameter in comment.parameters:
        if not _has_parameter(call, parameter):
            yield f"{call.name}: has no parameter {parameter}"
    for parameter in call.texts:
        if parameter not in {**header.text.parameters, **comment.parameters}:
            yield f"{call.name}: nothing says what {parameter} is"


def _has_parameter(call: Call, name: str) -> bool:
    return any(one.name == name for one in call.arguments)


def _misplaced(where: str, comment: Comment, statuses: Collection[str]) -> Iterator[str]:
    for status in comment.statuses:
        if status not in statuses:
            yield f"{where}: {status or 'what a list names'} is no status"
    # Success may be spoken of: an output has a meaning with it only.
    for text in (comment.text, comment.returns, *comment.parameters.values()):
        for word in re.findall(r"\w+", text):
            if word in statuses and word != "QEX_OK":
                yield f"{where}: {word} belongs in the list of statuses"
