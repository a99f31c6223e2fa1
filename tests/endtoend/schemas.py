"""What the programs print for machines is as the installed schemas say: held against them for every run of every test."""

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
ACCOUNTCTL = json.loads((SCHEMAS / "accountctl.schema.json").read_text(encoding="utf-8"))

COMMANDS = [name for name in ACCOUNTCTL["$defs"] if name != "account"]


def check_accountctl(words, output):
    """Holds the output of a command of accountctl against that command's part of the schema."""
    command = next(word for word in words if word in COMMANDS)
    if any(str(word).startswith("--file") for word in words):
        command += " --file"
    schema = {**ACCOUNTCTL, "$ref": f"#/$defs/{command}".replace(" ", "%20")}
    jsonschema.Draft202012Validator.check_schema(schema)
    jsonschema.Draft202012Validator(schema).validate(json.loads("\n".join(output)))


def check(run):
    for event in run.events:
        TRACE.validate(event)
    text = "\n".join(run.output)
    if text.startswith("{") and '"stages"' in text:
        EXPLANATION.validate(json.loads(text))


device.run_checks.append(check)
