"""The program migration-rehearse: what is asked is done, and told by the exit status.

What rehearsals do not need is brought in by the command that does: there is one process for each call, and none of it is
compiled beforehand."""

import json
import signal
import sys
import time

from migration_rehearse import campaign, engines, host, options, rehearsal, telling
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
    return {"": run, "merge": merge, "report": make_report, "compare": make_comparison, "anonymise": make_anonymous}[name]


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
        release = results.release(rehearsing.version(), rehearsal.digest_here(rehearsing), *rehearsing.digests())
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
        count = results.row("SELECT count(*) FROM rehearsals WHERE content IN (SELECT content FROM images)")[0]
    print(f"{asked.target}: {count:,} rehearsals")
    return NOTHING_LOST


def make_report(arguments, version):
    from migration_rehearse import report

    made = options.parser("report", version, "Makes one HTML page of the results, which needs nothing else to be shown.")
    made.add_argument("results", metavar="FILE", help="a result file")
    made.add_argument("--output", metavar="FILE", default="report.html", help="the page (default: report.html)")
    made.add_argument("--release", metavar="RELEASE", default="",
                      help="a version or the beginning of a digest (default: the release that was first used last)")
    made.add_argument("--devices", metavar="N", type=options.positive, default=10_000,
                      help="how many devices it names (default: %(default)s); it counts all")
    asked = made.parse_args(arguments)
    with Results(asked.results, read_only=True) as results:
        release = results.chosen_release(asked.release)
        try:
            report.write(results, release, asked.output, asked.devices)
        except OSError as failure:
            return say(f"{asked.output}: {failure.strerror}", RESULTS_UNWRITABLE)
    print(f"{asked.output}: release {release}")
    return NOTHING_LOST


def make_comparison(arguments, version):
    from migration_rehearse import compare

    made = options.parser("compare", version, "Tells which devices end differently under another release.",
                          epilog="Rules: " + "; ".join(f"{name} ({words})" for name, (words, _) in compare.RULES.items())
                          + "\n\nExit status: 0 nothing differs, or, with a gate, devices were compared and no rule is broken;\n"
                          "1 otherwise; 2 wrong use; 4 a result file cannot be read, or FILE not written.")
    made.add_argument("old", metavar="OLD", help="the results of the earlier release")
    made.add_argument("new", metavar="NEW", help="those of the later one; the same file where it has both")
    made.add_argument("--earlier", metavar="RELEASE", default="", help="the earlier release, by version or digest")
    made.add_argument("--later", metavar="RELEASE", default="", help="the later release (default: the last)")
    made.add_argument("--gate", metavar="RULES", type=compare.rules_of, help="which differences may not pass, separated by commas")
    made.add_argument("--json", action="store_true", help="print a JSON document")
    made.add_argument("--output", metavar="FILE", help="write which devices differ or break a rule, a line of JSON for each")
    asked = made.parse_args(arguments)
    with Results(asked.old, read_only=True) as old, Results(asked.new, read_only=True) as new:
        comparison = compare.comparison_of(old, new, asked.earlier, asked.later)
        failed = compare.broken(comparison, asked.gate or {})
        try:
            if asked.output:
                compare.write_devices(comparison, asked.gate or {}, asked.output)
        except OSError as failure:
            return say(f"{asked.output}: {failure.strerror}", RESULTS_UNWRITABLE)
        print(json.dumps(compare.as_json(comparison, failed), indent=2) if asked.json else compare.in_words(comparison))
    if asked.gate is None:
        return LOSSES if comparison.different else NOTHING_LOST
    complaints = compare.complaints(comparison, failed)
    for complaint in complaints:
        say(f"gate: {complaint}", LOSSES)
    return LOSSES if complaints else NOTHING_LOST


def make_anonymous(arguments, version):
    from migration_rehearse import anonymise

    made = options.parser("anonymise", version, "Makes an archive of what a run reads, with all that is personal replaced.",
                          epilog="Exit status: 0 the archive is made, and the migration does the same with it as with the image;\n"
                          "2 wrong use; 3 there can be no such archive; 5 the host cannot be used.")
    made.add_argument("image", metavar="IMAGE", help="a device's file tree, or an archive of one")
    made.add_argument("--output", metavar="FILE", default="anonymised.tar.gz",
                      help="the archive (default: anonymised.tar.gz)")
    made.add_argument("--key", metavar="FILE", default="campaign.key",
                      help="the campaign's key, made when it is missing (default: campaign.key)")
    options.add_host_options(made)
    options.add_limits(made)
    asked = made.parse_args(arguments)
    program = host.Host(asked.host, asked.plugin, asked.resources).found()
    try:
        words = anonymise.anonymise(asked.image, anonymise.key_of(asked.key), asked.output, program,
                                    options.limits_of(asked), options.bounds_of(asked))
    except anonymise.CannotAnonymise as why:
        return say(why, SOME_UNREHEARSED)
    except OSError as failure:
        return say(f"{failure.filename}: {failure.strerror}", SOME_UNREHEARSED)
    print(f"{asked.output}: {words:,} words replaced; the migration does the same with it")
    return NOTHING_LOST
