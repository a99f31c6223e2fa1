"""What people are told: the line of progress, and the summary in words."""

import sys
import time

from migration_rehearse.faults import CAUSES

SECONDS_BETWEEN_LINES = 0.5
SECONDS_BEFORE_THE_FIRST = 1.0
MOST_CODES = 5
OUTCOMES = {
    "kept": "nothing lost",
    "lost": "accounts lost",
    "not saved": "not saved",
    "failed": "the migration failed",
    "refused": "refused before the migration",
}


class Progress:
    """One line on a terminal, which goes when the work ends. Elsewhere nothing is shown."""

    def __init__(self, total, stream=sys.stderr):
        self.total = total
        self.stream = stream if stream.isatty() else None
        self.begun = time.monotonic()
        self.next = self.begun + SECONDS_BEFORE_THE_FIRST

    def show(self, tally):
        now = time.monotonic()
        if self.stream and now >= self.next:
            self.next = now + SECONDS_BETWEEN_LINES
            self.stream.write("\r\x1b[K" + progress_line(tally, self.total, now - self.begun))
            self.stream.flush()

    def clear(self):
        if self.stream:
            self.stream.write("\r\x1b[K")
            self.stream.flush()


def progress_line(tally, total, seconds):
    rate = tally.rehearsed / seconds if seconds else 0
    left = (total - tally.images) / rate if rate else None
    parts = [f"{tally.images:,} of {total:,} ({100 * tally.images // max(total, 1)} %)"]
    parts += [f"{rate:.0f} a second", f"{duration(left)} left"] if left is not None else []
    parts += [f"{tally.losing:,} with losses"] if tally.losing else []
    parts += [f"{tally.unrehearsed:,} not rehearsed"] if tally.unrehearsed else []
    return ", ".join(parts)


def duration(seconds):
    seconds = int(seconds + 0.5)
    if seconds < 60:
        return f"{seconds} s"
    if seconds < 3600:
        return f"{seconds // 60} min {seconds % 60:02} s"
    return f"{seconds // 3600} h {seconds % 3600 // 60:02} min"


def images(count):
    return f"{count:,} image" + ("" if count == 1 else "s")


def summary(tally, release, seconds, path):
    """What came of all images, in words."""
    lines = [f"{images(tally.images)} under release {release}:"]
    lines += [f"  {tally.verdicts[verdict]:>9,}  {words}" for verdict, words in OUTCOMES.items()
              if tally.verdicts[verdict]]
    lines += [f"  {tally.unrehearsed:>9,}  could not be rehearsed"] if tally.unrehearsed else []
    lines += [f"  {count:>11,}  {cause}: {CAUSES[cause]}" for cause, count in tally.causes.most_common()]
    if tally.losses:
        codes = ", ".join(f"{code} {count:,}" for code, count in tally.losses.most_common(MOST_CODES))
        lines += [f"Accounts lost by reason: {codes}{', …' if len(tally.losses) > MOST_CODES else ''}"]
    lines += [_effort(tally, seconds), f"Results: {path}"]
    return "\n".join(lines)


def _effort(tally, seconds):
    if not tally.rehearsed:
        return "Nothing was left to rehearse."
    rate = tally.rehearsed / max(seconds, 1e-3)
    return f"Rehearsed {tally.rehearsed:,} now, in {duration(seconds)}: {rate:.1f} a second."
