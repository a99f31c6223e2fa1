"""What the host prints for machines is as the installed schemas say: held against them for every run of every test."""

import json
from pathlib import Path

import device
import jsonschema

SCHEMAS = Path(__file__).resolve().parents[2] / "resources" / "schema"


def validator(name):
    schema = json.loads((SCHEMAS / name).read_text(encoding="utf-8"))
    jsonschema.Draft202012Validator.check_schema(schema)
    return jsonschema.Draft202012Validator(schema)


TRACE = validator("trace.schema.json")
EXPLANATION = validator("explanation.schema.json")


def check(run):
    for event in run.events:
        TRACE.validate(event)
    text = "\n".join(run.output)
    if text.startswith("{") and '"stages"' in text:
        EXPLANATION.validate(json.loads(text))


device.run_checks.append(check)
