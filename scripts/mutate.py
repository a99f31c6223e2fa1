#!/usr/bin/env python3
"""Says what part of the mutants of accountsettings/ and migrator/ the unit tests notice.

    scripts/mutate.py --build DIRECTORY [--jobs N] [--left] [SOURCE...]

Builds the target `mutants` of a build tree (tests/mutation): one program of tests in which each mutant stands behind a
switch of its own. Every test runs once alone and tells which mutants it reaches; then each mutant runs the tests that
reach it until one fails, dies or does not end. A mutant that none of them notices is named, with its reason from
tests/mutation/survivors.txt. Fails where one has none there, where one that is listed is noticed or no more there, and
where less than 95 % are noticed.

What was found stays in the build tree: a run that was stopped goes on where it was, until a program is built again. With
SOURCEs only the mutants of these are tried, with --left only those that no earlier run found noticed.
"""

import argparse
import hashlib
import itertools
import json
import math
import os
import re
import subprocess
import sys
import tempfile
from collections import defaultdict
from concurrent.futures import ThreadPoolExecutor
from dataclasses import dataclass, field
from pathlib import Path

TREE = Path(__file__).resolve().parent.parent
SURVIVORS = TREE / "tests" / "mutation" / "survivors.txt"
PROGRAMS = ("accountsettings_mutant_tests", "migrator_mutant_tests", "run_sequence_mutant_tests")
LEAST = 0.95
MEMORY = 4 << 30
LONGEST = 1.0  # seconds of processor time; a test that takes longer is not among those that are tried
SLOW = 0.1  # seconds of processor time; a test that takes longer is tried after all others
SAME = "Equivalent: "  # begins the reason of a mutant that nothing could notice
LATE = "Noticed late: "  # and of one that a test notices which takes too long, unless the machine is fast


@dataclass
class Test:
    program: Path
    name: str
    seconds: float = 0.0  # of processor time
    reached: list = field(default_factory=list)


@dataclass
class Mutant:
    name: str  # what the switch knows it by
    source: str
    line: int
    function: str
    change: str
    tests: list = field(default_factory=list)

    @property
    def key(self):
        return f"{self.source} {self.function}: {self.change}"


def mutants_of(directory):
    for listing in sorted(directory.glob("*/*.json")):
        source = f"{listing.parent.name}/{listing.stem}"
        for each in json.loads(listing.read_text()):
            again = f" #{each['place']}" if each["place"] > 1 else ""
            yield Mutant(f"{source}:{each['number']}", source, each["line"], each["function"],
                         f"{each['old']} -> {each['new']}{again}")


class Runner:
    """Runs tests with the mutated library in the place of the other one."""

    def __init__(self, directory):
        self.environment = os.environ | {"LD_LIBRARY_PATH": str(directory / "lib")}

    def first_failure(self, tests, mutant):
        """The name of the first of some tests of one program that fails with the mutant, or None."""
        seconds = math.ceil(2 + 10 * max(test.seconds for test in tests))
        command = [tests[0].program, str(seconds), *(test.name for test in tests)]
        return self.run(command, MUTANT=mutant.name)[1]

    def run(self, command, **variables):
        """The processor time that the command took, and the last line that it wrote where it failed."""
        with tempfile.TemporaryFile() as said:
            process = subprocess.Popen(["prlimit", f"--as={MEMORY}", "--core=0", *command], env=self.environment | variables,
                                       stdin=subprocess.DEVNULL, stdout=subprocess.DEVNULL, stderr=said)
            _, process.returncode, used = os.wait4(process.pid, 0)
            said.seek(0)
            lines = said.read().decode(errors="replace").splitlines() or [""]
        return used.ru_utime + used.ru_stime, lines[-1] if process.returncode else None

    def tests_of(self, program):
        listing = subprocess.run([program, "--gtest_list_tests"], env=self.environment, check=True, capture_output=True,
                                 text=True).stdout
        suite = ""
        for line in listing.splitlines():
            name = line.split("#")[0].strip()
            if line.startswith(" "):
                yield Test(program, suite + name)
            else:
                suite = name

    def learn(self, test):
        """Fills in what the test reaches, and how long it takes without any mutant."""
        with tempfile.TemporaryDirectory() as place:
            reached = Path(place) / "reached"
            command = [test.program, str(math.ceil(LONGEST) + 1), test.name]
            test.seconds, failed = self.run(command, MUTANTS_REACHED=str(reached))
            if failed is not None and test.seconds < LONGEST:
                raise SystemExit(f"{test.name} fails without any mutant")
            if reached.exists():
                test.reached = reached.read_text().split()


class Findings:
    """Which test noticed each mutant (None: none did), kept from run to run."""

    def __init__(self, path, stamp):
        self.path, self.stamp = path, stamp
        kept = json.loads(path.read_text()) if path.exists() else {"stamp": None, "settled": {}, "earlier": {}}
        self.settled = kept["settled"] if kept["stamp"] == stamp else {}  # with the programs as they are
        self.earlier = kept["earlier"] | kept["settled"]

    def keep(self):
        written = self.path.with_suffix(".new")
        written.write_text(json.dumps({"stamp": self.stamp, "settled": dict(self.settled), "earlier": self.earlier}))
        written.replace(self.path)


class Trial:
    """Finds for each mutant a test that notices it: tries first what noticed it, or its neighbours, before."""

    def __init__(self, runner, findings):
        self.runner, self.findings = runner, findings
        self.by_function = defaultdict(list)
        self.tried = 0

    def settle(self, mutant):
        self.findings.settled[mutant.key] = self.first_that_notices(mutant)
        self.tried += 1
        if self.tried % 50 == 0:
            print(f"{self.tried} tried", file=sys.stderr, flush=True)
            self.findings.keep()

    def first_that_notices(self, mutant):
        near = self.by_function[mutant.source, mutant.function]
        likely = [self.findings.earlier.get(mutant.key), *near[::-1]]
        tests = sorted(mutant.tests, key=lambda test: likely.index(test.name) if test.name in likely else len(likely))
        for _, batch in itertools.groupby(tests, key=lambda test: test.program):
            name = self.runner.first_failure(list(batch), mutant)
            if name is not None:
                if name not in near:
                    near.append(name)
                return name
        return None


def kept_reasons():
    """By key; each entry is a line with the key and indented lines with the reason."""
    reasons, key = {}, None
    for line in SURVIVORS.read_text().splitlines():
        if line.startswith("#") or not line.strip():
            continue
        if line.startswith(" "):
            reasons[key] += [line.strip()]
        else:
            key = line
            reasons[key] = []
    return {key: " ".join(reason) for key, reason in reasons.items()}


def in_parallel(jobs, work, items):
    with ThreadPoolExecutor(jobs) as pool:
        return list(pool.map(work, items))


def prepare(options):
    subprocess.run(["cmake", "--build", options.build, "--target", "mutants"], check=True, stdin=subprocess.DEVNULL)
    directory = options.build / "tests" / "mutation"
    runner = Runner(directory)
    places = {path.name: path for path in (options.build / "tests").glob("**/*_tests")}
    tests = [test for program in PROGRAMS for test in runner.tests_of(places[program])]
    library = directory / "lib" / "libaccountsettings.so.1"
    stamp = [hashlib.sha256(path.read_bytes()).hexdigest() for path in [library, *(places[program] for program in PROGRAMS)]]
    learn_all(runner, tests, options.jobs, stamp, directory / "reached.json")
    mutants = {mutant.name: mutant for mutant in mutants_of(directory / "copies")}
    # A test that reaches little is the likeliest to notice what becomes different there.
    for test in sorted(tests, key=lambda test: (test.seconds >= SLOW, test.program, len(test.reached))):
        for name in test.reached:
            mutants[name].tests.append(test)
    return Trial(runner, Findings(directory / "found.json", stamp)), list(mutants.values())


def learn_all(runner, tests, jobs, stamp, memory):
    """What each test reaches; asked again only once the programs are others."""
    known = json.loads(memory.read_text()) if memory.exists() else {}
    if known.get("stamp") != stamp:
        in_parallel(jobs, runner.learn, tests)
        known = {"stamp": stamp, "tests": {f"{test.program.name} {test.name}": [test.seconds, test.reached] for test in tests}}
        memory.write_text(json.dumps(known))
    left_out = [name for name, (seconds, _) in known["tests"].items() if seconds >= LONGEST]
    print(f"{len(tests)} tests, {len(left_out)} of them left out, since they take long: {', '.join(left_out)}")
    for test in tests:
        test.seconds, reached = known["tests"][f"{test.program.name} {test.name}"]
        test.reached = reached if test.seconds < LONGEST else []


def tell_score(mutants, survivors):
    reasons = kept_reasons()
    for folder in [*sorted({re.sub("/.*", "/", mutant.source) for mutant in mutants}), ""]:
        tried = [mutant for mutant in mutants if mutant.source.startswith(folder)]
        left = [mutant for mutant in survivors if mutant.source.startswith(folder)]
        unreached = sum(not mutant.tests for mutant in left)
        noticed = len(tried) - len(left)
        same = sum(reasons.get(mutant.key, "").startswith(SAME) for mutant in left)
        print(f"{folder or 'both'}: {len(tried)} mutants, {noticed} noticed ({noticed / len(tried):.2%}), {len(left)} not, "
              f"{unreached} of them reached by no test; {noticed / max(1, len(tried) - same):.2%} without the {same} that "
              f"change nothing")


def complaints(mutants, survivors, everything):
    reasons = kept_reasons()
    keys = {mutant.key for mutant in survivors}
    sources = {mutant.source for mutant in mutants}
    for mutant in survivors:
        if not reasons.get(mutant.key):
            yield f"no reason for {mutant.key} (line {mutant.line}, reached by {len(mutant.tests)} tests)"
    for key, reason in reasons.items():
        if key not in keys and not reason.startswith(LATE) and (everything or key.split()[0] in sources):
            yield f"noticed, or no more there: {key}"
    if 1 - len(survivors) / len(mutants) < LEAST:
        yield f"less than {LEAST:.0%} are noticed"


def main():
    parser = argparse.ArgumentParser(description=__doc__, formatter_class=argparse.RawDescriptionHelpFormatter)
    parser.add_argument("--build", type=Path, required=True, help="the build tree")
    parser.add_argument("--jobs", type=int, default=os.cpu_count())
    parser.add_argument("--left", action="store_true", help="tries only what no earlier run found noticed")
    parser.add_argument("sources", nargs="*", metavar="SOURCE", help="as in accountsettings/basic_account.cpp")
    options = parser.parse_args()
    options.build = options.build.absolute()
    os.nice(max(0, 10 - os.nice(0)))
    trial, mutants = prepare(options)
    mutants = [mutant for mutant in mutants if not options.sources or mutant.source in options.sources]
    findings = trial.findings
    noticed_earlier = {key for key, name in findings.earlier.items() if options.left and name}
    left = [mutant for mutant in mutants if mutant.key not in findings.settled and mutant.key not in noticed_earlier]
    print(f"{len(mutants)} mutants, {len(left)} of them to be tried", flush=True)
    # The quickest first.
    left.sort(key=lambda mutant: (findings.earlier.get(mutant.key) is None, sum(test.seconds for test in mutant.tests)))
    in_parallel(options.jobs, trial.settle, left)
    findings.keep()
    known = findings.earlier | findings.settled
    survivors = [mutant for mutant in mutants if known[mutant.key] is None]
    tell_score(mutants, survivors)
    complained = list(complaints(mutants, survivors, not options.sources))
    print(*complained, sep="\n", end="\n" if complained else "")
    return 1 if complained else 0


if __name__ == "__main__":
    sys.exit(main())
