"""The deliberate breaks of the lab: each edit of a source changes one that exists."""

import pathlib
import sys
import unittest

sys.path.insert(0, str(pathlib.Path(__file__).parents[2] / "lab"))
from host.break_main import edited_sources  # pylint: disable=wrong-import-position
from host.breaks import BREAKS  # pylint: disable=wrong-import-position


class BreaksTest(unittest.TestCase):
    def test_edit_a_source(self):
        for item in BREAKS:
            with self.subTest(item.name):
                self.assertTrue(not item.source or edited_sources(item))


if __name__ == "__main__":
    unittest.main()
