"""Sixteen programs change the accounts of one device at once, and are killed at random: what was answered as saved stays."""

import os
import random
import statistics
import subprocess
import threading
import time
import unittest

from device import CURRENT_VERSION, SETTINGS, plain_environment
from device_case import PLUGINS, DeviceTest

CLIENT = PLUGINS / "changing_client"
PROGRAMS = 16
CHANGES = int(os.environ.get("CHANGES", "1000"))
ADDED = min(CHANGES, 3_000)  # the file grows with each
FEWER = 160
# A program of a short run is killed about once; one of a long run again and again, until its end.
SHARE_THAT_LIVES, LONGEST_LIFE = (0.5, 1) if CHANGES <= 1000 else (0, 20)
SEED = int(os.environ.get("SEED", "20261"))
PATIENCE = 600
SHARED = {"Type": "LDAP", "Class": "LDAPAccount", "Identifier": "Shared"}


class Program:
    """One of the programs: whenever it is killed, another goes on where it was."""

    def __init__(self, root, manner, name, changes):
        self.name, self.answered, self.unknown, self.intervals = name, [], [], {}
        self._command = [CLIENT, manner, root, name]
        self._changes = changes
        self._counts = manner == "count"
        self._random = random.Random(f"{SEED} {name}")
        self.failure = None

    def run(self):
        following = 0
        while following < self._changes and not self.failure:
            lives = self._random.random() < SHARE_THAT_LIVES
            following = self._run_from(following, None if lives else self._random.uniform(0.05, LONGEST_LIFE))

    def _run_from(self, first, killed_after):
        process = subprocess.Popen(
            [*self._command, str(first), str(self._changes)], env=plain_environment(),
            stdin=subprocess.DEVNULL, stdout=subprocess.PIPE, stderr=subprocess.PIPE, text=True,
        )
        try:
            output, errors = process.communicate(timeout=killed_after or PATIENCE)
        except subprocess.TimeoutExpired:
            process.kill()
            output, errors = process.communicate()
        if process.returncode not in (0, -9):
            self.failure = f"{self.name}: {process.returncode} {errors}"
        for line in output.splitlines():
            began, ended, number = map(int, line.split())
            self.answered.append(number)
            self.intervals[number] = (began, ended)
            first = number + 1
        if process.returncode == -9:
            self.unknown.append(first)
            first += not self._counts
        return first


def of(name, numbers):
    return {f"{name}-{number}" for number in numbers}


class ManyChanges(DeviceTest):
    def setUp(self):
        super().setUp()
        accounts = [SHARED, *({**SHARED, "Identifier": f"P{number}"} for number in range(PROGRAMS))]
        self.tree = self.device(Version=CURRENT_VERSION, Accounts=accounts)

    def run_programs(self, manner, changes, count=PROGRAMS):
        programs = [Program(self.tree.root, manner, f"P{number}", -(-changes // count)) for number in range(count)]
        threads = [threading.Thread(target=program.run) for program in programs]
        for thread in threads:
            thread.start()
        for thread in threads:
            thread.join()
        self.assertEqual([], [program.failure for program in programs if program.failure])
        return programs

    def named(self):
        """What the programs brought into the file: the accounts that they added, and the keys that they set."""
        first, *others = self.tree.read_plist(SETTINGS)["Accounts"]
        return [each["Identifier"] for each in others if "-" in each["Identifier"]], [key for key in first if "-" in key]

    def test_are_all_in_the_file_and_told_once(self):
        watcher = Watcher(self, self.tree.root)
        programs = self.run_programs("add", ADDED)
        added, keys = self.named()
        answered = set().union(*(of(each.name, each.answered) for each in programs))
        unknown = set().union(*(of(each.name, each.unknown) for each in programs))
        self.assertEqual(set(), answered - {*added, *keys})
        self.assertEqual(set(), {*added, *keys} - answered - unknown)
        self.assertEqual(len(added), len(set(added)))
        self.assertEqual((added, keys), watcher.told_at_last(len(added) + len(keys)))

    def test_follow_each_other_without_a_gap_and_are_told_in_order(self):
        watcher = Watcher(self, self.tree.root)
        programs = self.run_programs("count", CHANGES if CHANGES > 1000 else FEWER)
        accounts = self.tree.read_plist(SETTINGS)["Accounts"]
        stands = {each["Identifier"]: each["Count"] for each in accounts if "Count" in each}
        told = watcher.counts_at_last(stands)
        for program in programs:
            counts = told[program.name]
            self.assertEqual([program.answered[-1]] * 2, [stands[program.name], counts[-1]])
            self.assertEqual(sorted(set(counts)), counts)
            self.assertEqual(set(), set(counts) - {*program.answered, *program.unknown})

    def test_let_each_other_in_though_they_change_without_a_pause(self):
        programs = self.run_programs("count", 40, 2)
        for program, other in (programs, programs[::-1]):
            meanwhile = [
                sum(began <= first and last <= ended for first, last in other.intervals.values())
                for began, ended in program.intervals.values()
            ]
            self.assertLessEqual(statistics.median(meanwhile), 1)

    def test_lose_to_an_editor_without_the_lock_what_was_saved_while_it_edited(self):
        watcher, editor = Watcher(self, self.tree.root), Editor(self.tree)
        with editor:
            programs = self.run_programs("add", ADDED if CHANGES > 1000 else FEWER)
        added, keys = self.named()
        self.assertEqual((len(added), len(keys)), (len(set(added)), len(set(keys))))
        for program in programs:
            for number in program.answered:
                if f"{program.name}-{number}" not in {*added, *keys}:
                    self.assertTrue(editor.was_at_it(*program.intervals[number]), f"{program.name}-{number}")
        self.assertGreater(len(editor.spans), 1)
        self.assertEqual((set(added), set(keys)), watcher.sum_at_last((set(added), set(keys))))


class Watcher:
    def __init__(self, test, root):
        self._process = subprocess.Popen(
            [CLIENT, "watch", root], env=plain_environment(), stdin=subprocess.PIPE, stdout=subprocess.PIPE, text=True
        )
        test.addCleanup(self._end)
        assert self._process.stdout.readline() == "watching\n"
        self._lines = []
        self._reader = threading.Thread(target=self._read)
        self._reader.start()

    def _read(self):
        for line in self._process.stdout:
            self._lines.append(line.split())

    def _end(self):
        if self._process.poll() is None:
            self._process.stdin.close()
            self._process.wait()
        self._reader.join()
        self._process.stdout.close()

    def told_at_last(self, count):
        """The accounts that were told as added and the keys that were told as changed, in the order of telling."""
        self._wait_until(lambda: self._number_told() >= count)
        added = [words[1] for words in self._lines if words[0] == "added"]
        return added, [key for key, _ in self._changes("Shared")]

    def sum_at_last(self, expected):
        """What the added accounts and the keys that were set come to, less those that went again."""
        self._wait_until(lambda: self._sum() == expected)
        return self._sum()

    def counts_at_last(self, expected):
        """The numbers that were told of each account, in the order of telling, once the last ones are as expected."""
        def counts():
            return {name: [number for key, number in self._changes(name) if key == "Count"] for name in expected}

        self._wait_until(lambda: expected == {name: told[-1] for name, told in counts().items() if told})
        return counts()

    def _wait_until(self, is_over):
        deadline = time.monotonic() + 60
        while time.monotonic() < deadline and not is_over():
            time.sleep(0.05)
        self._end()

    def _changes(self, name):
        """The keys of one account that were told as changed, each with its number, or with none where it went."""
        for words in list(self._lines):
            if words[:2] == ["changed", name]:
                for key, _, number in (word.partition("=") for word in words[2:]):
                    yield key, int(number) if number else None

    def _sum(self):
        added, keys = set(), dict(self._changes("Shared"))
        for kind, name, *_ in list(self._lines):
            if kind != "changed":
                (added.add if kind == "added" else added.discard)(name)
        return added, {key for key, number in keys.items() if number is not None}

    def _number_told(self):
        return sum(len(words) - 2 if words[0] == "changed" else 1 for words in list(self._lines))


class Editor:
    """Now and then it reads the file, takes its time, and moves its own version onto it; it takes no lock."""

    def __init__(self, tree):
        self._tree, self.spans, self._over = tree, [], threading.Event()
        self._thread = threading.Thread(target=self._edit)

    def __enter__(self):
        self._thread.start()

    def __exit__(self, *_):
        self._over.set()
        self._thread.join()

    def was_at_it(self, began, ended):
        return any(first <= ended and began <= last for first, last in self.spans)

    def _edit(self):
        while not self._over.wait(0.5) or len(self.spans) < 2:
            first = time.monotonic_ns()
            settings = self._tree.read_plist(SETTINGS)
            settings["Accounts"][1]["Edited"] = len(self.spans)
            self._tree.write_plist("edited", settings)
            os.replace(self._tree.path("edited"), self._tree.path(SETTINGS))
            self.spans.append((first, time.monotonic_ns()))


if __name__ == "__main__":
    unittest.main()
