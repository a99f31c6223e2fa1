"""What a host's explanation says, as it goes into the results: the same for the same device, wherever and whenever it was
rehearsed, and in numbers that can be added up."""

import json
import re
from collections import Counter
from typing import NamedTuple

from migration_rehearse.footprint import UUID

NEW_UUID = re.compile(UUID.pattern.decode())
TEMPORARY_NAME = re.compile(r"(/var/mobile/tmp/file)[A-Za-z0-9]{6}\b")
COUNTED = ("kept", "changed", "added", "converted", "folded", "dropped", "lost")
OF_THE_MOMENT = ("time", "root")  # members of a result that say when and where, and nothing of the device


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
    names = {}

    def label(match):
        return match[0] if match[0] in identifiers else names.setdefault(match[0], f"(new {len(names) + 1})")

    if root != "/":
        text = text.replace(json.dumps(root, ensure_ascii=False)[1:-1] + "/", "/")
    return TEMPORARY_NAME.sub(r"\1(temporary)", NEW_UUID.sub(label, text))


def explained(document):
    """Reads an explanation that `lasting` has gone over. Raises ValueError, KeyError or TypeError where it is none."""
    result = document["result"]
    facts = [(stage, fact) for stage in document["stages"] for fact in stage["steps"]]
    document["result"] = {key: value for key, value in result.items() if key not in OF_THE_MOMENT}
    losses = _losses(result, facts)
    return Explained(
        verdict=result.get("verdict") or _verdict(result, facts, losses),
        document=document,
        stored_version=result.get("storedVersion", _loaded_version(facts)),
        accounts=result.get("accounts") if isinstance(result.get("accounts"), int) else None,
        counts=_counts(result, facts, losses),
        losses=losses,
        facts=Counter((stage["stage"], fact["action"], fact.get("code", "")) for stage, fact in facts),
    )


def _verdict(result, facts, losses):
    saves = [fact["action"] for _, fact in facts if fact["action"] in ("saved", "save-failed")]
    if not result["success"]:
        return "failed"
    if saves[-1:] == ["save-failed"]:
        return "not saved"
    return "lost" if losses else "kept"


def _losses(result, facts):
    """Each account that went by its code; a file that went with its accounts counts as one."""
    lost = [one.get("code", "unknown") if isinstance(one, dict) else "file-lost" for one in result.get("lost", [])]
    if "verdict" not in result:
        lost += [fact.get("code", "dropped") for _, fact in facts if fact["action"] == "dropped"]
    return Counter(lost)


def _loaded_version(facts):
    for stage, fact in facts:
        if stage["stage"] == "load" and fact["action"] == "loaded":
            return fact["version"]
    return None


def _counts(result, facts, losses):
    told = result.get("counts")
    if isinstance(told, dict):
        return {name: told.get(name) for name in COUNTED}
    actions = Counter(fact["action"] for _, fact in facts)
    changed = {fact["account"].get("identifier") for _, fact in facts if fact["action"] == "changed"}
    counts = {name: actions[name] for name in ("added", "converted", "folded", "dropped")}
    return {**dict.fromkeys(COUNTED), **counts, "changed": len(changed), "lost": sum(losses.values())}
