"""All images of one call, rehearsed under one release: what was done before is not done again."""

import zlib
from collections import Counter
from itertools import islice
from typing import NamedTuple

from migration_rehearse.engines import DIED
from migration_rehearse.faults import NO_CONTENTS
from migration_rehearse.host import Host, Limits
from migration_rehearse.rehearsal import Identified, Image, Task, identify, rehearse, unrehearsed
from migration_rehearse.results import Release, shown
from migration_rehearse.unpacking import Bounds

CHUNK = 16  # images that one worker identifies at a time
PATIENCE = 0.25  # seconds after which what came is kept, though nothing else comes
LOSING = ("lost", "not saved", "failed", "refused")


class Campaign(NamedTuple):
    """How images are rehearsed, whichever they are. With `again`, those that could not be are tried once more."""

    release: Release
    host: Host
    limits: Limits = Limits()
    bounds: Bounds = Bounds()
    again: bool = False


class Tally:
    """What came of the images so far, by verdict; of those that could not be rehearsed, by cause."""

    def __init__(self):
        self.images = 0
        self.rehearsed = 0  # of them, those that were rehearsed now, and were not known already
        self.verdicts = Counter()
        self.causes = Counter()
        self.losses = Counter()

    def add(self, verdict, cause):
        self.images += 1
        self.verdicts[verdict] += 1
        if cause:
            self.causes[cause] += 1

    @property
    def unrehearsed(self):
        return self.verdicts["unrehearsed"]

    @property
    def losing(self):
        return sum(self.verdicts[verdict] for verdict in LOSING)


def in_shard(path, shard):
    """Whether the image is of this shard, a number from 1 and how many there are: the same for a path in every list."""
    number, shards = shard
    return zlib.crc32(shown(path).encode()) % shards == number - 1


def run(paths, campaign, engine, results):
    """Rehearses the images at these paths, an iterator, and keeps each result as it comes; yields a Tally that grows."""
    return _Run(campaign, engine, results).over(paths)


class _Run:
    def __init__(self, campaign, engine, results):
        self.campaign = campaign
        self.engine = engine
        self.results = results
        self.tally = Tally()
        self.under_way = {}  # contents that are being rehearsed: how many images have them

    def over(self, paths):
        for given in self.engine.map(rehearse, self._tasks(paths), PATIENCE):
            if given:
                self._keep(*given)
            self.results.commit_if_due()
            yield self.tally
        self.results.commit()
        yield self.tally

    def _tasks(self, paths):
        for given in self.engine.map(identify, self._chunks(paths), PATIENCE):
            for image in self._identified(*given) if given else ():
                self.results.add_image(image)
                if self._is_new(image):
                    yield self._task(image)
            yield None  # what is known of these is kept, whatever the next are like

    def _task(self, image):
        how = self.campaign
        return Task(image.path, image.kind, image.content, how.host, how.release.digest, how.limits, how.bounds,
                    image.identifiers)

    def _chunks(self, paths):
        paths = iter(paths)
        while chunk := list(islice(paths, CHUNK)):
            yield [Image(path, *self.results.remembered(shown(path))) for path in chunk]

    def _identified(self, chunk, answer):
        if answer is not DIED:
            return answer
        return [Identified(image.path, "", "", NO_CONTENTS + shown(image.path), ("worker-died", "")) for image in chunk]

    def _is_new(self, image):
        """Whether there is something left to do for it."""
        if image.fault:
            self._end(image.content, 1, unrehearsed(*image.fault))
            return False
        if image.content in self.under_way:
            self.under_way[image.content] += 1
            return False
        known = self.results.verdict(image.content, self.campaign.release)
        if known and not (self.campaign.again and known[0] == "unrehearsed"):
            self.tally.add(*known)
            return False
        self.under_way[image.content] = 1
        return True

    def _keep(self, task, answer):
        rehearsed = unrehearsed("worker-died") if answer is DIED else answer
        self.tally.rehearsed += 1
        self._end(task.content, self.under_way.pop(task.content), rehearsed)

    def _end(self, content, images, rehearsed):
        self.results.add(content, self.campaign.release, rehearsed)
        self.tally.losses.update(rehearsed.losses)
        for _ in range(images):
            self.tally.add(rehearsed.verdict, rehearsed.cause)
