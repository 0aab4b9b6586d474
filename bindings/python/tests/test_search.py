"""A findex built from SQLite through APICommand, searched, paged and ordered
through APISearch, and the errors both objects raise."""

import re
import unittest

import quillmere
from support import DataDirectoryTest

ROWS = 20


def body(i):
    # "river" i % 4 times, so a search for it ranks rows by that count; every
    # fifth row has the accented word.
    return " ".join(["river"] * (i % 4) + [f"word{i}"] + (["café"] if i % 5 == 0 else []))


RIVER_KEYS = [i for i in range(1, ROWS + 1) if i % 4]
CAFE_KEYS = [i for i in range(1, ROWS + 1) if i % 5 == 0]


def keys_text(keys):
    return "(" + ",".join(map(str, keys)) + ")"


class FindexSearchTest(DataDirectoryTest):
    def setUp(self):
        super().setUp()
        self.create_table("books", "id integer primary key, title text, body text",
                          [(i, f"title {i}", body(i)) for i in range(1, ROWS + 1)])
        self.command = self.command()
        # Scores on; accents kept, so the words come back as written.
        self.command.SetIndexGeneralOptions(True, True, False, "", True, True)
        self.command.SetIndexLanguageOptions(2, False, False, False, False, False)
        self.command.ExecuteEx("CREATE FINDEX Books ON TABLE books COLUMNS title,body KEY id", True)
        self.search = self.search()

    def test_the_built_findex_holds_every_row(self):
        self.assertTrue(self.command.FindexExist("Books", "PUBLIC"))
        self.assertFalse(self.command.FindexExist("Nope", "PUBLIC"))
        self.command.SetCurrentObjectName("Books")
        self.assertEqual(self.command.GetFindexInfo(7), str(ROWS))  # idxKeyCount
        self.assertEqual(self.command.GetFindexInfo(3), "id")  # idxKeyName

    def test_search_finds_the_rows_with_the_word(self):
        self.search.Execute("SELECT id FROM books WHERE [Books='river']")
        self.assertEqual(self.search.GetTotal(), len(RIVER_KEYS))
        self.assertEqual(self.search.GetRawKeyString(0, 0), keys_text(RIVER_KEYS))
        self.assertEqual(self.search.GetSqlKeyName(), "id")

    def test_text_outside_ascii_goes_in_and_comes_back(self):
        self.search.Execute("SELECT id FROM books WHERE [Books='café']")
        self.assertEqual(self.search.GetRawKeyString(0, 0), keys_text(CAFE_KEYS))
        words = self.search.GetFindexWords("Books", 0, 1000).split(";")
        self.assertIn("CAFÉ", words)
        self.assertIn("RIVER", words)

    def test_windows_page_through_the_result(self):
        self.search.Execute("SELECT id FROM books WHERE [Books='river']")
        total = len(RIVER_KEYS)
        # (start, count): rows are numbered from 1; a window past the end is cut.
        for start, count in [(1, 5), (6, 5), (11, 5), (total - 1, 5), (1, total), (3, 1)]:
            with self.subTest(start=start, count=count):
                expected = RIVER_KEYS[start - 1:start - 1 + count]
                self.assertEqual(self.search.GetRawKeyString(start, count), keys_text(expected))
                self.assertEqual(self.search.GetNum(), len(expected))
                self.search.SetLimits(start, count)
                self.assertEqual(self.search.GetRawKeyString(0, 0), keys_text(expected))

    def test_order_by_key_descending(self):
        self.search.Execute("SELECT id FROM books WHERE [Books='river']")
        self.search.OrderBy("KEY DESC")
        self.assertEqual(self.search.GetRawKeyString(1, 100), keys_text(sorted(RIVER_KEYS, reverse=True)))
        self.search.SetLimits(2, 3)
        self.assertEqual(self.search.GetRawKeyString(0, 0),
                         keys_text(sorted(RIVER_KEYS, reverse=True)[1:4]))

    def test_order_by_score_groups_keys_by_falling_score(self):
        self.search.Execute("SELECT id FROM books WHERE [Books='river']")
        self.search.OrderBy("SCORE")
        text = self.search.GetRawKeyString(1, 100)
        groups = re.findall(r"(\d+);\(([\d,]+)\);", text)
        self.assertEqual("".join(f"{s};({k});" for s, k in groups), text, "unparsed rest")
        scores = [int(score) for score, _ in groups]
        self.assertEqual(scores, sorted(scores, reverse=True))
        self.assertEqual(len(set(scores)), len(scores))
        # More occurrences score higher: three, then two, then one.
        by_count = [[int(k) for k in keys.split(",")] for _, keys in groups]
        self.assertEqual([sorted(keys) for keys in by_count],
                         [[i for i in RIVER_KEYS if i % 4 == n] for n in (3, 2, 1)])
        self.assertEqual(self.search.GetMaxScore(), scores[0])

    def test_adding_to_the_result_set_takes_true_not_one(self):
        # ExecuteEx adds only for -1: True passes -1, the integer 1 stays 1
        # and asks for a new result set while one is open.
        self.search.Execute("SELECT id FROM books WHERE [Books='word3']")
        self.search.ExecuteEx("SELECT id FROM books WHERE [Books='word5']", True)
        self.assertEqual(self.search.GetRawKeyStringEx(0, 0, 1), "(3)")
        self.assertEqual(self.search.GetRawKeyStringEx(0, 0, 2), "(5)")
        self.search.Close()
        self.search.Execute("SELECT id FROM books WHERE [Books='word3']")
        with self.assertRaises(quillmere.Error) as raised:
            self.search.ExecuteEx("SELECT id FROM books WHERE [Books='word5']", 1)
        self.assertIn("result set is already open", raised.exception.description)
        self.assertEqual(self.search.GetRawKeyStringEx(0, 0, 1), "(3)")

    def test_failures_raise_with_the_engines_text_and_source(self):
        search_source = "QuillmereAPI.APISearch.1"
        command_source = "QuillmereAPI.APICommand.1"
        open_one = lambda: self.search.Execute("SELECT id FROM books WHERE [Books='word3']")
        cases = [
            # (what, the call before, the failing call, part of the text, source)
            ("unknown findex", None,
             lambda: self.search.Execute("SELECT id FROM books WHERE [Nope='x']"),
             "NOPE.sdx", search_source),
            ("no result set", None, self.search.Close, "No open result set", search_source),
            ("command number", open_one, lambda: self.search.GetRawKeyStringEx(0, 0, 2),
             "Command number not executed", search_source),
            ("second result set", None, open_one, "result set is already open", search_source),
            ("remote server", self.search.Close, lambda: self.search.ConnectToServer("elsewhere"),
             "not available in this build", search_source),
            ("missing table", None,
             lambda: self.command.ExecuteEx("CREATE FINDEX X ON TABLE nope COLUMNS a KEY id", True),
             "no such table: nope", command_source),
        ]
        for name, before, call, text, source in cases:
            with self.subTest(name):
                if before:
                    before()
                with self.assertRaises(quillmere.Error) as raised:
                    call()
                error = raised.exception
                self.assertIn(text, error.description)
                self.assertEqual(error.source, source)
                self.assertEqual(error.code & 0xFFFFFFFF, 0x80020009)
                self.assertEqual(str(error), error.description)
        # A failure leaves the object usable.
        self.search.Execute("SELECT id FROM books WHERE [Books='word3']")
        self.assertEqual(self.search.GetTotal(), 1)


if __name__ == "__main__":
    unittest.main()
