"""What a host's explanation says, as it goes into the results: the same for the same device, wherever and whenever it was
rehearsed, and in numbers that can be added up."""

import json
import re
from collections import Counter
from typing import NamedTuple

from migration_rehearse.footprint import identifiers_in

TEMPORARY_NAME = re.compile(r"(/var/mobile/tmp/file)[A-Za-z0-9]{6}\b")
COUNTED = ("kept", "changed", "added", "converted", "folded", "dropped", "lost")
OF_THE_MOMENT = ("time", "root")  # members that say when and where, and nothing of the device


class Explained(NamedTuple):
    """`document` is the explanation without what differs from run to run; facts are counted by stage, action and code,
    losses by code."""

    verdict: str
    document: dict
    stored_version: int | None
    accounts: int | None
    counts: dict
    losses: Counter
    facts: Counter


def lasting(text, root, identifiers):
    """The text without the root, and with identifiers that the device did not have numbered as they appear."""
    names, parts, end = {}, [], 0
    if root != "/":
        text = text.replace(json.dumps(root, ensure_ascii=False)[1:-1] + "/", "/")
    for start, identifier in identifiers_in(text):
        if identifier not in identifiers:
            parts += [text[end:start], names.setdefault(identifier, f"(new {len(names) + 1})")]
            end = start + len(identifier)
    return TEMPORARY_NAME.sub(r"\1(temporary)", "".join([*parts, text[end:]]))


def explained(document):
    """Reads an explanation that `lasting` has gone over. Raises ValueError, KeyError or TypeError where it is none."""
    result = document["result"]
    facts = [(stage["stage"], fact) for stage in document["stages"] for fact in stage["facts"]]
    counts = result.get("counts", {})
    return Explained(
        verdict=result["verdict"] if result["success"] else "failed",
        document={member: value for member, value in document.items() if member not in OF_THE_MOMENT},
        stored_version=result.get("storedVersion"),
        accounts=result.get("accounts"),
        counts={name: counts.get(name) for name in COUNTED},
        losses=Counter(one["code"] for one in result.get("lost", [])),
        facts=Counter((stage, fact["fact"], fact.get("code", "")) for stage, fact in facts),
    )
