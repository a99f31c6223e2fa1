"""Processes of this machine that work for the program: each task is answered, whatever becomes of who works on it."""

import os
import signal
import tempfile
import time
import unittest
from itertools import islice

from migration_rehearse.engines import AHEAD, DIED, LocalEngine


def doubled(number):
    return 2 * number


def killed_by_seven(number):
    if number == 7:
        os.kill(os.getpid(), signal.SIGKILL)
    return number


def killed_by_a_seven(number):
    return killed_by_seven(7 if number % 10 == 7 else number)


def asleep(seconds):
    time.sleep(seconds)
    return seconds


def killed_then_asleep(marker):
    if killed_once(marker):
        open(os.path.dirname(marker) + "/again", "w").close()
        time.sleep(60)


def killed_once(marker):
    """Only the first who is given the marker dies of it."""
    if marker and not os.path.exists(marker):
        open(marker, "w").close()
        os.kill(os.getpid(), signal.SIGKILL)
    return bool(marker)


def failing(number):
    raise ValueError(number)


def cores_of(_):
    time.sleep(0.02)  # so that every worker has some
    return os.sched_getaffinity(0)


def place_for_files(_):
    return tempfile.mkdtemp()


class LocalProcesses(unittest.TestCase):
    def setUp(self):
        self.engine = LocalEngine(2)
        self.addCleanup(self.engine.close)

    def results(self, function, tasks):
        return dict(self.engine.map(function, tasks))

    def test_answer_every_task_once(self):
        self.assertEqual([(number, 2 * number) for number in range(500)],
                         sorted(self.engine.map(doubled, range(500))))

    def test_stay_each_on_one_core_of_those_that_the_program_has(self):
        cores = list(self.results(cores_of, range(20)).values())
        self.assertEqual({1}, {len(of_one) for of_one in cores})
        self.assertEqual(set(sorted(os.sched_getaffinity(0))[:2]), set.union(*cores))

    def test_take_tasks_no_further_ahead_than_they_need(self):
        given = []
        endless = (given.append(number) or number for number in iter(lambda: len(given), -1))
        answers = self.engine.map(doubled, endless)
        for _ in range(100):
            next(answers)
        self.assertLessEqual(len(given), 100 + 2 * AHEAD)

    def test_work_for_one_call_while_another_asks_it_for_tasks(self):
        tasks = (result for _, result in self.engine.map(doubled, range(200)))
        self.assertEqual({4 * number for number in range(200)}, {result for _, result in self.engine.map(doubled, tasks)})

    def test_take_tasks_and_give_answers_of_any_size(self):
        large = "x" * (3 << 20)
        self.assertEqual({large: 2 * large}, self.results(doubled, [large]))

    def test_that_die_of_a_task_lose_only_that_one(self):
        expected = {number: number for number in range(100)}
        self.assertEqual({**expected, 7: DIED}, self.results(killed_by_seven, range(100)))

    def test_that_die_once_lose_nothing(self):
        with tempfile.TemporaryDirectory() as scratch:
            self.assertEqual({"": False, scratch + "/marker": True}, self.results(killed_once, ["", scratch + "/marker"]))

    def test_that_die_one_beside_the_other_lose_only_what_kills_them(self):
        self.assertEqual({number: DIED if number % 10 == 7 else number for number in range(30)},
                         self.results(killed_by_a_seven, range(30)))

    def test_let_who_is_patient_for_a_moment_know_that_nothing_came(self):
        answers = self.engine.map(asleep, [0, 60], 0.1)
        begun = time.monotonic()
        self.assertEqual((0, 0), next(each for each in answers if each))
        self.assertEqual([None] * 3, list(islice(answers, 3)))
        self.assertLess(time.monotonic() - begun, 20)

    def test_answer_though_nobody_knows_the_next_task(self):
        tasks = (given and given[0] for given in self.engine.map(asleep, [0, 60], 0.1))
        self.assertEqual((0, 0), next(each for each in self.engine.map(doubled, tasks, 0.1) if each))

    def test_try_a_task_that_kills_alone_without_keeping_others_waiting(self):
        with tempfile.TemporaryDirectory() as scratch:
            answers = self.engine.map(killed_then_asleep, [scratch + "/marker"], 0.1)
            self.assertEqual([None] * 3, list(islice(filter(lambda _: os.path.exists(scratch + "/again"), answers), 3)))

    def test_raise_what_a_task_raises(self):
        with self.assertRaisesRegex(ValueError, "5"):
            self.results(failing, [5])

    def test_leave_no_files_behind(self):
        engine = LocalEngine(1)
        ((_, place),) = engine.map(place_for_files, [0])
        self.assertTrue(os.path.isdir(place))
        engine.close()
        self.assertFalse(os.path.exists(place))


if __name__ == "__main__":
    unittest.main()
