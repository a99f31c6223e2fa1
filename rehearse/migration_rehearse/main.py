"""The program migration-rehearse: what is asked is done, and told by the exit status."""

import signal
import sys
import time

from migration_rehearse import campaign, engines, host, options, telling
from migration_rehearse.listing import Listing
from migration_rehearse.results import ResultFault, Results

NOTHING_LOST, LOSSES, WRONG_USE, SOME_UNREHEARSED, RESULTS_UNWRITABLE, UNUSABLE, INTERRUPTED = 0, 1, 2, 3, 4, 5, 130


def main(arguments, version):
    """Does what the arguments ask; answers the exit status."""
    for number in (signal.SIGTERM, signal.SIGHUP):
        signal.signal(number, _interrupt)
    command = arguments[0] if arguments and arguments[0] in options.COMMANDS else ""
    try:
        return _command(command)(arguments[1:] if command else arguments, version)
    except ResultFault as fault:
        return say(fault, RESULTS_UNWRITABLE)
    except (host.HostUnusable, engines.EngineFault) as fault:
        return say(fault, UNUSABLE)
    except KeyboardInterrupt:
        return say("interrupted; the same command goes on from here", INTERRUPTED)
    except BrokenPipeError:
        return LOSSES


def _interrupt(*_):
    raise KeyboardInterrupt


def _command(name):
    return {"": run, "merge": merge}[name]


def say(what, status):
    print(f"migration-rehearse: {what}", file=sys.stderr)
    return status


def run(arguments, version):
    asked = options.run_parser(version).parse_args(arguments)
    if not asked.images and not asked.list:
        return say("no images are named (see --help)", WRONG_USE)
    try:
        listing = Listing(asked.images, asked.list, asked.shard, asked.null)
    except OSError as failure:
        return say(f"{failure.filename}: {failure.strerror}", WRONG_USE)
    with Results(asked.results) as results:
        rehearsing = host.Host(asked.host, asked.plugin, asked.resources).found()
        release = results.release(rehearsing.version(), rehearsing.digest())
        how = campaign.Campaign(release, rehearsing, options.limits_of(asked), options.bounds_of(asked), asked.again)
        engine = engines.DaskEngine(asked.scheduler) if asked.scheduler else engines.LocalEngine(asked.workers)
        try:
            return _rehearse_all(listing, how, engine, results)
        finally:
            engine.close()


def _rehearse_all(listing, how, engine, results):
    begun = time.monotonic()
    progress = telling.Progress(listing.count())
    tally = campaign.Tally()
    try:
        for tally in campaign.run(iter(listing), how, engine, results):
            progress.show(tally)
    finally:
        progress.clear()
    print(telling.summary(tally, how.release, time.monotonic() - begun, results.path))
    if tally.unrehearsed:
        return SOME_UNREHEARSED
    return LOSSES if tally.losing else NOTHING_LOST


def merge(arguments, version):
    made = options.parser("merge", version, "Adds the results of the other files to the first, which is made if missing.")
    made.add_argument("target", metavar="FILE", help="the file that gets them")
    made.add_argument("others", metavar="FILE", nargs="+", help="result files")
    asked = made.parse_args(arguments)
    with Results(asked.target) as results:
        for other in asked.others:
            results.merge(other)
        count = results.row("SELECT count(*) FROM rehearsals")[0]
    print(f"{asked.target}: {count:,} rehearsals")
    return NOTHING_LOST
