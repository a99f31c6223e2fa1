"""Two releases over the same images: which devices end differently, by kind of difference, and whether that may pass."""

import json
import math
import os
from argparse import ArgumentTypeError
from typing import NamedTuple

from migration_rehearse.campaign import LOSING
from migration_rehearse.faults import NO_CONTENTS, OF_THE_RUN
from migration_rehearse.results import ResultFault

MOST_KINDS = 20  # of differences that are told in words
NOTICEABLE = 0.1  # seconds; who takes less more is not slower, but measured beside somebody else

# By name: what a rule says, and the contents that break it.
RULES = {
    "none-lost": ("no device may lose anything, or break the run",
                  f"SELECT content FROM later WHERE verdict IN {LOSING} OR cause IN {OF_THE_RUN}"),
    "none-newly-lost": ("no device may lose what it did not lose before, or break the run that it did not break",
                        f"""SELECT content FROM pairs WHERE new_verdict IN {LOSING} AND new_verdict != old_verdict
                        OR new_cause IN {OF_THE_RUN} AND old_verdict != 'unrehearsed'
                        OR EXISTS (SELECT 1 FROM main.losses AS now WHERE rehearsal = new AND count > coalesce(
                          (SELECT count FROM old.losses WHERE rehearsal = pairs.old AND code = now.code), 0))"""),
    "none-different": ("no device may end differently", "SELECT content FROM pairs WHERE is_different"),
    "all-rehearsed": ("every image must have been rehearsed, those of the earlier results, too",
                      "SELECT content FROM later WHERE verdict = 'unrehearsed' UNION ALL SELECT content FROM earlier_only"),
    "none-slower": ("none-slower=FACTOR: no device may take so many times its processor time",
                    f"""SELECT content FROM pairs WHERE new_seconds > {{0}} * old_seconds
                    AND new_seconds - old_seconds > {NOTICEABLE}"""),
}


class WrongRule(ArgumentTypeError):
    """A rule that is none; the command line tells of it."""


class Kind(NamedTuple):
    """How a device ends differently. The three tuples hold codes and facts that came or went, in order."""

    verdicts: tuple  # before and after; empty where they are the same
    lost_more: tuple
    lost_less: tuple
    facts_more: tuple
    facts_less: tuple
    is_by_numbers: bool  # the same facts, but more or fewer of them

    def in_words(self):
        parts = [f"{self.verdicts[0]} → {self.verdicts[1]}"] if self.verdicts else []
        parts += [f"{words}: {', '.join(codes)}" for words, codes in (
            ("loses by", self.lost_more), ("no longer loses by", self.lost_less),
            ("new", self.facts_more), ("no longer", self.facts_less)) if codes]
        return "; ".join(parts) or ("the same facts, in other numbers" if self.is_by_numbers else "other values only")


class Group:
    """The devices of one kind: how many, and the smallest of them."""

    def __init__(self):
        self.devices = 0
        self.size = None
        self.example = ""

    def add(self, size, content):
        self.devices += 1
        if self.size is None or (size, content) < (self.size, self.example):
            self.size, self.example = size, content


# Of the rehearsals in a file, those count that an image has; those of an image that is not there are compared with nothing.
SIDES = f"""
CREATE TEMP VIEW earlier AS
  SELECT * FROM old.rehearsals WHERE release = {{earlier}} AND content IN (SELECT content FROM old.images);
CREATE TEMP VIEW later AS
  SELECT * FROM main.rehearsals WHERE release = {{later}} AND content IN (SELECT content FROM main.images);
CREATE TEMP TABLE pairs AS
  SELECT content, old.id AS old, old.verdict AS old_verdict, old.cause AS old_cause, old.processor_seconds AS old_seconds,
    new.id AS new, new.verdict AS new_verdict, new.cause AS new_cause, new.processor_seconds AS new_seconds,
    coalesce(new.accounts, 0) AS accounts,
    (old.fingerprint, old.verdict, old.cause) IS NOT (new.fingerprint, new.verdict, new.cause) AS is_different
  FROM later AS new JOIN earlier AS old USING (content) WHERE content NOT GLOB '{NO_CONTENTS}*';
CREATE TEMP VIEW earlier_only AS
  SELECT content FROM earlier WHERE content NOT GLOB '{NO_CONTENTS}*' AND content NOT IN (SELECT content FROM later);
CREATE TEMP VIEW later_only AS
  SELECT content FROM later WHERE content NOT GLOB '{NO_CONTENTS}*' AND content NOT IN (SELECT content FROM earlier);
"""
PATH = ("coalesce((SELECT min(path) FROM main.images WHERE content = found.content),"
        " (SELECT min(path) FROM old.images WHERE content = found.content), found.content)")


class Broken(NamedTuple):
    """By how many devices a rule is broken, and the path of one of them."""

    devices: int
    example: str


class Comparison:
    """The rehearsals of `results` under `release` beside those of another file, `other`, under `earlier`."""

    def __init__(self, results, release, other, earlier):
        self.results, self.release, self.earlier = results, release, earlier
        place = os.path.abspath(other.path).replace("%", "%25").replace("?", "%3f").replace("#", "%23")
        results.database.execute("PRAGMA temp_store = FILE")
        results.database.execute("ATTACH ? AS old", (f"file:{place}?mode=ro",))
        results.database.executescript(SIDES.format(earlier=earlier.id, later=release.id))
        self.compared, *self.alone = (self._count(side) for side in ("pairs", "earlier_only", "later_only"))
        self.groups = self._grouped()

    @property
    def different(self):
        return sum(group.devices for group in self.groups.values())

    def ordered(self):
        """Kinds with their groups; those in which a verdict changed first, then the largest."""
        return sorted(self.groups.items(), key=lambda each: (not each[0].verdicts, -each[1].devices, each[0].in_words()))

    def path(self, content):
        """Of the first image with these contents: of the later results, where they have one."""
        return self.results.row(f"SELECT {PATH} FROM (SELECT ? AS content) AS found", (content,))[0]

    def breaking(self, rule, number):
        """How many devices break a rule, and one of them; `number` is the rule's, where it has one."""
        devices, example = self.results.row(f"SELECT count(*), min(content) FROM ({RULES[rule][1].format(number)})")
        return Broken(devices, self.path(example))

    def each(self, rules):
        """Each device that ends differently, with how, and each that breaks one of the rules; by their paths."""
        words = [kind.in_words() for kind in self.groups]
        for path, kind in self.results.rows(f"SELECT {PATH} AS path, kind FROM different AS found ORDER BY path"):
            yield {"device": path, "difference": words[kind]}
        for rule, number in rules.items():
            query = f"SELECT {PATH} AS path FROM ({RULES[rule][1].format(number)}) AS found ORDER BY path"
            yield from ({"device": path, "breaks": rule} for path, in self.results.rows(query))

    def processor_seconds(self):
        """Of all that were compared: before and after."""
        return self.results.row("SELECT total(old_seconds), total(new_seconds) FROM pairs")

    def _grouped(self):
        """Devices that end differently, by kind of difference; which is of which kind, numbered as they come, is for the
        database to remember."""
        groups, numbers = {}, {}
        self.results.database.execute("CREATE TEMP TABLE different (content TEXT, kind INTEGER)")
        for kind, size, content in self._differences():
            groups.setdefault(kind, Group()).add(size, content)
            number = numbers.setdefault(kind, len(numbers))
            self.results.database.execute("INSERT INTO different VALUES (?, ?)", (content, number))
        return groups

    def _differences(self):
        named = [self._kinds(database) for database in ("old", "main")]
        query = ("SELECT content, old, new, old_verdict, old_cause, new_verdict, new_cause, accounts FROM pairs"
                 " WHERE is_different")
        for content, old, new, *verdicts, accounts in self.results.rows(query):
            facts = [self._facts(database, names, rehearsal)
                     for database, names, rehearsal in zip(("old", "main"), named, (old, new))]
            losses = [self._losses(database, rehearsal) for database, rehearsal in (("old", old), ("main", new))]
            kind = _kind(_verdict(*verdicts[:2]), _verdict(*verdicts[2:]), losses, facts)
            yield kind, (accounts, sum(facts[1].values())), content

    def _kinds(self, database):
        return {number: " ".join(filter(None, names)) for number, *names in
                self.results.rows(f"SELECT id, stage, action, code FROM {database}.kinds")}

    def _facts(self, database, names, rehearsal):
        return {names[kind]: count for kind, count in
                self.results.rows(f"SELECT kind, count FROM {database}.facts WHERE rehearsal = ?", (rehearsal,))}

    def _losses(self, database, rehearsal):
        return {code for code, in self.results.rows(f"SELECT code FROM {database}.losses WHERE rehearsal = ?", (rehearsal,))}

    def _count(self, what):
        return self.results.row(f"SELECT count(*) FROM {what}")[0]


def _verdict(verdict, cause):
    return f"{verdict} ({cause})" if cause else verdict


def _kind(before, after, losses, facts):
    return Kind(
        verdicts=(before, after) if before != after else (),
        lost_more=tuple(sorted(losses[1] - losses[0])), lost_less=tuple(sorted(losses[0] - losses[1])),
        facts_more=tuple(sorted(facts[1].keys() - facts[0].keys())), facts_less=tuple(sorted(facts[0].keys() - facts[1].keys())),
        is_by_numbers=facts[0] != facts[1],
    )


def rules_of(text):
    """The rules of a gate, by name, with their numbers. Raises WrongRule."""
    rules = {}
    for word in filter(None, text.replace(" ", ",").split(",")):
        name, equals, number = word.partition("=")
        if name not in RULES or bool(equals) != (name == "none-slower"):
            raise WrongRule(f"{word} is no rule; there are {', '.join(RULES)}")
        rules[name] = _factor(number) if equals else None
    if not rules:
        raise WrongRule(f"no rule is given; there are {', '.join(RULES)}")
    return rules


def _factor(text):
    try:
        factor = float(text)
    except ValueError:
        factor = 0
    if not 0 < factor < math.inf:
        raise WrongRule(f"{text} is no number above 0")
    return factor


def broken(comparison, rules):
    """The rules that are broken: each with what breaks it."""
    found = {name: comparison.breaking(name, number) for name, number in rules.items()}
    return {name: breaking for name, breaking in found.items() if breaking.devices}


def complaints(comparison, failed):
    """Why a gate with these broken rules does not pass; nothing where it does."""
    told = [f"{breaking.devices:,} devices break {name}, such as {breaking.example} ({RULES[name][0]})"
            for name, breaking in failed.items()]
    return told if comparison.compared else [*told, "no device was compared, so none can pass"]


def write_devices(comparison, rules, path):
    """Which devices they are that differ or break a rule, a JSON document a line."""
    with open(path, "w", encoding="utf-8") as file:
        file.writelines(json.dumps(device) + "\n" for device in comparison.each(rules))


def in_words(comparison):
    """What differs, for people."""
    before, after = comparison.processor_seconds()
    lines = [f"{comparison.compared:,} devices under release {comparison.earlier} and under {comparison.release}:",
             f"  {comparison.compared - comparison.different:>9,}  end the same"]
    for kind, group in comparison.ordered()[:MOST_KINDS]:
        lines += [f"  {group.devices:>9,}  {kind.in_words()}", f"             such as {comparison.path(group.example)}"]
    rest = comparison.ordered()[MOST_KINDS:]
    lines += [f"  {sum(group.devices for _, group in rest):>9,}  in {len(rest):,} more ways"] if rest else []
    lines += [f"{count:,} devices are in the {which} results only." for count, which in
              zip(comparison.alone, ("earlier", "later")) if count]
    lines += [f"Processor time: {after / before:.2f} times that of before."] if before else []
    return "\n".join(lines)


def as_json(comparison, failed):
    """The same for machines."""
    return {
        "schema": 2, "earlier": str(comparison.earlier), "later": str(comparison.release), "compared": comparison.compared,
        "different": comparison.different, "onlyEarlier": comparison.alone[0], "onlyLater": comparison.alone[1],
        "differences": [{**kind._asdict(), "devices": group.devices, "example": comparison.path(group.example)}
                        for kind, group in comparison.ordered()],
        "broken": {rule: breaking._asdict() for rule, breaking in failed.items()},
    }


def comparison_of(old, new, earlier, later):
    """Of two open result files, which may be the same one, under the releases that begin so. Raises ResultFault."""
    releases = old.chosen_release(earlier), new.chosen_release(later)
    if releases[0].digest == releases[1].digest and os.path.samefile(old.path, new.path):
        raise ResultFault(f"{new.path}: the two releases are one; name them with --earlier and --later")
    return Comparison(new, releases[1], old, releases[0])
