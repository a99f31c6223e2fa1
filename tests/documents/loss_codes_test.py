"""The codes of losses: one table in the source, and the same in the document and in the schemas."""

import json
import re
import unittest
from pathlib import Path

TREE = Path(__file__).resolve().parents[2]
SCHEMAS = TREE / "resources" / "schema"
ROW = re.compile(r'LossMeaning\{LossCode::\w+,\s*"([^"]+)",\s*"([^"]+)"\}')
DOCUMENTED = re.compile(r"^\| `([a-z-]+)` \| (.*) \|$", re.MULTILINE)


class LossCodes(unittest.TestCase):
    def setUp(self):
        source = (TREE / "records" / "loss.h").read_text(encoding="utf-8")
        self.meanings = ROW.findall(source)
        self.assertEqual(source.count("LossMeaning{"), len(self.meanings))

    def test_are_documented_with_their_meanings(self):
        document = (TREE / "docs" / "EXPLAIN.md").read_text(encoding="utf-8")
        table = document[document.index("| Code | Meaning |") : document.index("The host says the verdict")]
        self.assertEqual(self.meanings, DOCUMENTED.findall(table))

    def test_are_those_of_the_schemas(self):
        for schema in ("explanation", "trace"):
            definitions = json.loads((SCHEMAS / f"{schema}.schema.json").read_text(encoding="utf-8"))["$defs"]
            self.assertEqual([code for code, _ in self.meanings], definitions["code"]["enum"])


if __name__ == "__main__":
    unittest.main()
