"""The report: the template of the explanation page, filled with a fleet."""

import base64
import json
import os
import time
import zlib
from pathlib import Path

from migration_rehearse.fleet import Fleet, causes_of

TEMPLATE = Path(__file__).resolve().parents[2] / "pages" / "page.html"
DEVICES_OF_A_BLOCK = 64  # explanations that are compressed together, and unpacked when one of them is opened
COLUMNS = {
    "name": "path", "verdict": "verdict", "detail": "detail", "version": "stored_version", "accounts": "accounts",
    "changed": "changed", "lost": "lost", "memory": "peak_memory",
}


def write(results, release, path, most):
    """Writes the page of the images under this release; it is there whole, or as it was."""
    page = page_of(results, release, most, TEMPLATE.read_text(encoding="utf-8"))
    temporary = f"{path}.{os.getpid()}"
    try:
        with open(temporary, "w", encoding="utf-8", errors="backslashreplace") as file:
            file.writelines(page)
        os.replace(temporary, path)
    finally:
        Path(temporary).unlink(missing_ok=True)


def page_of(results, release, most, template):
    """The parts of the page, in order."""
    fleet = Fleet(results, release)
    slowest, strangest = fleet.slowest(), fleet.strangest()
    devices = fleet.devices(most, [*fleet.behind_reasons(), *((path, 1) for path, _ in (*slowest, *strangest))])
    blocks, places = _blocks(fleet, devices)
    document = {"fleet": {
        "release": str(release), "made": time.strftime("%Y-%m-%d"), "results": os.path.basename(results.path),
        "images": fleet.images(), "verdicts": fleet.verdicts(), "versions": fleet.versions(), "losses": fleet.losses(),
        "unrehearsed": fleet.unrehearsed(), "causes": causes_of(devices), "steps": fleet.steps(),
        "distributions": {"seconds": fleet.distribution("seconds"), "memory": fleet.distribution("peak_memory"),
                          "accounts": fleet.distribution("accounts")},
        **_devices(fleet, devices, places), **_notable(devices, slowest, strangest),
    }}
    before, between, after = _split(template)
    yield before
    yield embedded(document)
    yield between
    for block in blocks:
        yield f'<script type="text/plain" class="block">{block}</script>\n'
    yield after


def embedded(document):
    """As JSON that ends no element, whatever texts are in it."""
    return json.dumps(document, separators=(",", ":")).replace("<", "\\u003c")


def _split(template):
    before, _, rest = template.partition("@DOCUMENT@")
    between, _, after = rest.partition("@EXPLANATIONS@")
    return before, between, after


def _devices(fleet, devices, places):
    codes = fleet.codes({device.rehearsal for device in devices if device.lost or device.verdict == "lost"})
    told = [codes.get(device.rehearsal, []) + ([device.cause] if device.cause else []) for device in devices]
    names = sorted({code for each in told for code in each})
    numbers = {code: number for number, code in enumerate(names)}
    columns = {name: [getattr(device, field) for device in devices] for name, field in COLUMNS.items()}
    columns["seconds"] = [round(device.seconds, 4) for device in devices]
    columns["codes"] = [[numbers[code] for code in each] for each in told]
    columns["block"] = [places.get(device.fingerprint) for device in devices]
    return {"codes": names, "devices": columns}


def _notable(devices, slowest, strangest):
    places = {device.path: number for number, device in enumerate(devices)}
    return {name: [[places[path], value] for path, value in found if path in places]
            for name, found in (("slowest", slowest), ("strangest", strangest))}


def _blocks(fleet, devices):
    """The explanations of these devices, each once: blocks of some, and for each its block and place in there."""
    fingerprints = list(dict.fromkeys(device.fingerprint for device in devices if device.fingerprint))
    blocks, places = [], {}
    for begin in range(0, len(fingerprints), DEVICES_OF_A_BLOCK):
        chosen = fingerprints[begin : begin + DEVICES_OF_A_BLOCK]
        documents = [zlib.decompress(fleet.document(each)) for each in chosen]
        blocks.append(base64.b64encode(zlib.compress(b"[" + b",".join(documents) + b"]", 9)).decode())
        places |= {each: [begin // DEVICES_OF_A_BLOCK, place] for place, each in enumerate(chosen)}
    return blocks, places
