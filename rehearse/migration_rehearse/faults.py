"""Why an image could not be rehearsed: each cause has a code, which stands in the results, and a sentence."""

NO_CONTENTS = "none:"  # what the contents of an image are called that is not there, before something of its path
CAUSES = {
    "missing": "there is no such directory or file",
    "unreadable": "it cannot be read",
    "not-an-image": "it is neither a directory nor a file",
    "no-device": "nothing of a device is in it",
    "several-devices": "the archive holds more than one device",
    "damaged-archive": "the archive is damaged, or none at all",
    "too-many-entries": "the archive has more entries than --max-entries allows",
    "too-large": "the archive unpacks to more than --max-size allows",
    "bomb": "the archive unpacks to so much more than it is that it must be a bomb (--max-ratio)",
    "path-out": "a path leads out of the archive",
    "link-out": "a link on the way to a file that a run reads leads out of the archive, or round in circles",
    "hard-link": "a file that a run reads is a second name of another file in the archive",
    "special-file": "a file that a run reads is a device, a pipe or a socket",
    "unpacking-failed": "the archive could not be unpacked into the temporary directory",
    "locked": "another program holds the image's lock",
    "timeout": "the rehearsal took longer than --timeout allows",
    "memory": "the rehearsal needed more memory than --memory allows",
    "crashed": "the host was ended by a signal",
    "too-much-output": "the rehearsal said more than --max-output allows",
    "no-explanation": "the host ended without an explanation",
    "worker-died": "the process that worked on it died, each time",
}

# Those that are the run's, and not the image's: a release that brings one about would do harm to the device.
OF_THE_RUN = ("timeout", "memory", "crashed", "too-much-output", "no-explanation", "worker-died")


class Fault(Exception):
    """An image that cannot be rehearsed. `cause` is one of CAUSES; `detail` is for people and may be empty."""

    def __init__(self, cause, detail=""):
        super().__init__(f"{CAUSES[cause]}{': ' if detail else ''}{detail}")
        self.cause = cause
        self.detail = detail

    def __reduce__(self):
        return (Fault, (self.cause, self.detail))
