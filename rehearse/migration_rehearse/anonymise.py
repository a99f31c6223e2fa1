"""An archive of what a run reads of a device, for sharing: names, addresses, hosts, identifiers and secrets are replaced,
and whatever the migration looks at stays, so that it does with the archive what it does with the device."""

import contextlib
import datetime
import functools
import io
import os
import plistlib
import secrets
import stat
import tarfile
from typing import NamedTuple

from migration_rehearse import host, rehearsal, unpacker, unpacking
from migration_rehearse.faults import CAUSES, Fault
from migration_rehearse.footprint import DIRECTORIES, FILES, GROUPS, USERS, read_file, resolved, target_of
from migration_rehearse.replacing import CannotAnonymise, Replacer, words_of
from migration_rehearse.scratch import Scratch
from migration_rehearse.vocabulary import FRAGMENTS, KEYS

KEY_SIZE = 32
SHORTEST_KEY = 16
DEVICE_INFO = "etc/vorlix/device-info.plist"
LISTS = tuple(path for path in FILES if path.endswith(".plist") and "CrashReporter" not in path)
PLACEHOLDER = b"anonymised"  # where only its being there counts
SHORTEST_WORD = 6  # that is looked for in any part of the result: a shorter one is found by chance
SHORTEST_NAME = 4  # that is looked for among its words
EXPLAINED = ("kept", "lost", "not saved", "failed")  # verdicts of a migration that was gone through
SAME = ("verdict", "cause", "status", "stored_version", "accounts", "counts", "losses", "facts")


class Piece(NamedTuple):
    """What stands at a path of the device; without contents, a directory."""

    path: str
    mode: int
    content: bytes | None


def key_of(path):
    """The campaign's key; made where there is none. Raises CannotAnonymise."""
    try:
        with open(os.open(path, os.O_WRONLY | os.O_CREAT | os.O_EXCL, 0o600), "wb") as file:
            file.write(secrets.token_bytes(KEY_SIZE))
    except FileExistsError:
        pass
    except OSError as failure:
        raise CannotAnonymise(f"{path}: {failure.strerror}") from failure
    with open(path, "rb") as file:
        key = file.read()
    if len(key) < SHORTEST_KEY:
        raise CannotAnonymise(f"{path}: this is no key: it has less than {SHORTEST_KEY} bytes")
    return key


def anonymise(image, key, output, program, limits=host.Limits(), bounds=unpacking.Bounds()):
    """Writes the archive, and proves it: the host does the same with both, and no word that was replaced is in it.
    Raises CannotAnonymise; then nothing is written."""
    with Scratch(os.path.dirname(os.path.abspath(output))) as scratch:
        replacer = Replacer(key, product_texts(program))
        try:
            root = image if os.path.isdir(image) else unpacker.unpack(image, _made(scratch, "original"), bounds)
        except Fault as fault:
            raise CannotAnonymise(f"{image}: {fault}") from fault
        pieces = list(pieces_of(root, replacer))
        archive = os.path.join(scratch, "anonymised.tar.gz")
        write(pieces, archive)
        check_words(pieces, replacer)
        check_facts(image, archive, functools.partial(_rehearsed, program, limits, bounds))
        os.replace(archive, output)
    return len(replacer.words)


def product_texts(program):
    """What accounts are called by the product itself, in each of its languages: the migration puts it there anew."""
    tables = (plistlib.loads(path.read_bytes()) for path in program.resource_directory().glob("strings/*/*.strings"))
    return {text for table in tables for text in table.values()}


def _made(scratch, name):
    path = os.path.join(scratch, name)
    os.mkdir(path)
    return path


def pieces_of(root, replacer):
    """What a run reads of the device, replaced."""
    target = target_of(root)
    for path in (*DIRECTORIES, *FILES):
        place = resolved(path, target)
        if place is None:
            raise CannotAnonymise(f"{path}: a link leads out of the device, or round in circles")
        try:
            status = os.lstat(os.path.join(root, place))
        except (FileNotFoundError, NotADirectoryError):
            continue
        mode = stat.S_IMODE(status.st_mode) & 0o777
        if stat.S_ISDIR(status.st_mode):
            yield Piece(path, mode | stat.S_IRWXU, None)
        elif stat.S_ISREG(status.st_mode):
            yield Piece(path, mode | stat.S_IRUSR | stat.S_IWUSR, _replaced(root, path, replacer))
        else:
            raise CannotAnonymise(f"{path}: it is neither a file nor a directory")


def _replaced(root, path, replacer):
    content = read_file(root, path)
    if content is None:
        raise CannotAnonymise(f"{path}: it cannot be read")
    if path in (USERS, GROUPS):
        return _accounts_table(content, ":/var/mobile:/bin/sh" if path == USERS else "")
    return _property_list(content, path, replacer) if path in LISTS else PLACEHOLDER


def _accounts_table(content, rest):
    """Of all users or groups, the one that the settings belong to, by its numbers."""
    lines = [line.split(":") for line in content.decode(errors="replace").splitlines() if line.startswith("mobile:")]
    numbers = [[field for field in fields[2:4] if field.isdigit()] for fields in lines]
    return "".join(f"mobile:*:{':'.join(each)}:{rest}\n" for each in numbers).encode()


def _property_list(content, path, replacer):
    try:
        value = plistlib.loads(content)
    except Exception:  # whatever the reader stumbles over, the migration's own does, too, or it is told of at the end
        return _unreadable(content)
    try:
        made = replaced_value(value, replacer)
        if path == DEVICE_INFO and isinstance(value, dict) and "DeviceClass" in value:
            made["DeviceClass"] = value["DeviceClass"]  # a model's name, by which texts are chosen
        form = plistlib.FMT_BINARY if content.startswith(b"bplist") else plistlib.FMT_XML
        return plistlib.dumps(made, fmt=form, sort_keys=False)
    except (RecursionError, OverflowError) as failure:
        raise CannotAnonymise(f"{path}: {failure}") from failure


def _unreadable(content):
    """Something of the same length that nobody can read either."""
    return (PLACEHOLDER + bytes(len(content)))[: len(content)]


def replaced_value(value, replacer, key=""):
    """The value with every text, key, large number and data in it replaced, in the same order."""
    if isinstance(value, dict):
        return {replacer.key(name): replaced_value(each, replacer, name) for name, each in value.items()}
    if isinstance(value, list):
        return [replaced_value(each, replacer, key) for each in value]
    if isinstance(value, str):
        return replacer.text(value, key)
    if isinstance(value, bytes):
        return replacer.data(value)
    if isinstance(value, bool | datetime.datetime | plistlib.UID):
        return value
    return replacer.integer(value, key) if isinstance(value, int) else replacer.real(value, key)


def write(pieces, path):
    """An archive that says nothing of who made it, or when."""
    with tarfile.open(path, "w:gz") as archive:
        for piece in sorted(pieces):
            entry = tarfile.TarInfo(piece.path)
            entry.mode = piece.mode
            entry.type = tarfile.DIRTYPE if piece.content is None else tarfile.REGTYPE
            entry.size = len(piece.content or b"")
            archive.addfile(entry, io.BytesIO(piece.content or b""))


def check_words(pieces, replacer):
    """That no word that was replaced stands in any file, in whatever way a property list writes it; nor a shorter name as a
    word of its own, but where it stands for another."""
    known = " ".join((*replacer.known, *KEYS, FRAGMENTS.pattern.replace("\\", ""), PLACEHOLDER.decode())).lower()
    content = b"\n".join(piece.content or b"" for piece in pieces)
    words = replacer.words
    names = {word for word in words if len(word) >= SHORTEST_NAME and word.isalpha() and word.lower() not in known}
    if names & names_in(pieces) - replacer.replacements:
        raise CannotAnonymise("a name that was to be replaced is still in it")
    for word in words:
        if len(word) >= SHORTEST_WORD and word.lower() not in known and any(
                form in content for form in (word.encode(errors="replace"), word.encode("utf-16-be", errors="replace"))):
            raise CannotAnonymise("a text that was to be replaced is still in it")


def names_in(pieces):
    """All words of all texts in the property lists."""
    texts = []
    for piece in pieces:
        with contextlib.suppress(Exception):  # what cannot be read is none of the device's any more
            texts += texts_in(plistlib.loads(piece.content or b""))
    return {word for text in texts for word in words_of(text)}


def texts_in(value):
    if isinstance(value, dict):
        return [text for pair in value.items() for each in pair for text in texts_in(each)]
    if isinstance(value, list):
        return [text for each in value for text in texts_in(each)]
    return [value] if isinstance(value, str) else []


def check_facts(image, archive, rehearsed):
    """That the migration does the same with both; `rehearsed` answers what it does with one."""
    before = rehearsed(image)
    if before.verdict not in EXPLAINED:
        raise CannotAnonymise(f"{image}: there is no explanation of what the migration does with it ({_why(before)})")
    after = rehearsed(archive)
    different = [name for name in SAME if getattr(before, name) != getattr(after, name)]
    if different:
        raise CannotAnonymise(f"the migration would do something else with it: its {', '.join(different)} would differ")


def _why(rehearsed):
    return rehearsed.detail or CAUSES.get(rehearsed.cause, rehearsed.verdict)


def _rehearsed(program, limits, bounds, path):
    identified, = rehearsal.identify([rehearsal.Image(str(path))])
    if identified.fault:
        raise CannotAnonymise(f"{path}: {Fault(*identified.fault)}")
    return rehearsal.rehearse(rehearsal.Task(identified.path, identified.kind, identified.content, program,
                                             rehearsal.digest_here(program), limits, bounds, identified.identifiers))
