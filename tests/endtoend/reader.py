"""What a reader of a device's files before and after a run counts itself, to be held against the run's verdict.

Every record that the files have before gets a mark of its own, under a key that no rule knows. A mark that stands in no
file after the run is a record that went. It is named where the verdict names a loss for it, or the explanation what it was
folded into or replaced by; a reader cannot tell those apart and counts them.
"""

import plistlib

from device import LEGACY_EXCHANGE, LEGACY_MAIL, SETTINGS

KEY = "Mark of the Reader"
ARRAYS = {SETTINGS: ["Accounts"], LEGACY_MAIL: ["MailAccounts", "DeliveryAccounts"], LEGACY_EXCHANGE: ["DAAccountsKey"]}
CHILDREN = "ChildAccounts"


def read(device, file):
    try:
        root = plistlib.loads(device.read(file))
    except (OSError, plistlib.InvalidFileException, ValueError):
        return {}
    return root if isinstance(root, dict) else {}


def elements(root, file):
    return [each for key in ARRAYS[file] if isinstance(root.get(key), list) for each in root[key]]


def children(record):
    return record[CHILDREN] if isinstance(record.get(CHILDREN), list) else []


class Reader:
    """Marks the records of a device, and reads what became of them."""

    def __init__(self, device):
        self.device = device
        self.within = {}  # each mark: that of the record that it lies in
        self.unmarked = 0  # elements that are no records
        for file in ARRAYS:
            root = read(device, file)
            self.mark(elements(root, file), None)
            if root:
                device.write_plist(file, root)

    def mark(self, records, parent):
        for record in records:
            if not isinstance(record, dict):
                self.unmarked += parent is None
                continue
            record[KEY] = f"mark {len(self.within) + 1}"
            self.within[record[KEY]] = parent
            self.mark(children(record), record[KEY])

    def standing(self):
        marks, left = set(), [each for file in ARRAYS for each in elements(read(self.device, file), file)]
        while left:
            record = left.pop()
            if isinstance(record, dict):
                marks.add(record.get(KEY))
                left += children(record)
        return marks

    def gone(self):
        """The marks that stand nowhere any more, but for those that went with the record that they lay in."""
        missing = set(self.within) - self.standing()
        return {mark for mark in missing if self.within[mark] not in missing}

    def count_named(self, explanation):
        facts = [fact for stage in explanation["stages"] for fact in stage["facts"]]
        changes = [change for fact in facts for change in fact.get("changes", [])]
        replaced = {change["from"] for change in changes if change["key"] == KEY and isinstance(change.get("from"), str)}
        folded = sum(fact["fact"] == "folded" for fact in facts)
        return len(explanation["result"].get("lost", [])) + folded + len(replaced)

    def check(self, test, explanation):
        """Nothing went that is not named, and where nothing went nothing is said to be lost."""
        gone, result = self.gone(), explanation["result"]
        test.assertLessEqual(len(gone), self.count_named(explanation), (gone, result))
        single = [lost for lost in result.get("lost", []) if "identifier" in lost]
        if not gone and not self.unmarked:
            test.assertEqual([], single)
