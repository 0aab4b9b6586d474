"""The package's side of a call: methods read from the library, arguments
converted by parameter type, objects released, the library found."""

import gc
import inspect
import json
import os
import subprocess
import sys
import unittest

import quillmere
from support import SOURCE_DATA, DataDirectoryTest

IGO_SEPARATORS = -3
OGO_IGNORE_CHARS = -1


class MethodTableTest(unittest.TestCase):
    def test_methods_match_the_installed_description(self):
        # quillmere-api.json, which ships with the library, describes every
        # method; the package reads its methods from the library instead, and
        # both must agree.
        with open(os.path.join(SOURCE_DATA, "quillmere-api.json"), encoding="utf-8") as file:
            description = json.load(file)
        types = {"long": int, "double": float, "VARIANT_BOOL": bool, "BSTR": str}
        classes = {"APICommand": quillmere.APICommand, "APISearch": quillmere.APISearch}
        self.assertEqual(sorted(c["name"] for c in description["classes"]), sorted(classes))
        for described in description["classes"]:
            cls = classes[described["name"]]
            self.assertEqual(cls().prog_id, described["progId"])
            for method in described["interface"]["methods"]:
                with self.subTest(cls=cls.__name__, method=method["name"]):
                    function = getattr(cls, method["name"])
                    self.assertEqual(function.dispid, method["dispid"])
                    signature = inspect.signature(function)
                    ins = [p for p in method["parameters"] if p["direction"] == "in"]
                    outs = [p for p in method["parameters"] if p["direction"] != "in"]
                    self.assertEqual([(p.name, p.annotation)
                                      for p in list(signature.parameters.values())[1:]],
                                     [(p["name"], types[p["type"]]) for p in ins])
                    self.assertEqual(signature.return_annotation,
                                     types[outs[0]["type"]] if outs else None)

    def test_names_match_without_regard_to_case(self):
        with quillmere.APISearch() as search:
            self.assertEqual(search.getversion(), "6.14")
            self.assertEqual(search.GETVERSION(), quillmere.version())
            with self.assertRaises(AttributeError):
                search.NoSuchMethod()

    def test_create_by_progid(self):
        cases = [("QuillmereAPI.APISearch", quillmere.APISearch),
                 ("quillmereapi.apicommand.1", quillmere.APICommand)]
        for prog_id, cls in cases:
            with self.subTest(prog_id), quillmere.create(prog_id) as made:
                self.assertIs(type(made), cls)
                self.assertEqual(made.GetVersion(), "6.14")
        with self.assertRaises(quillmere.Error) as raised:
            quillmere.create("QuillmereAPI.Nothing")
        self.assertIn("QuillmereAPI.Nothing", raised.exception.description)
        self.assertEqual(raised.exception.source, "QuillmereAPI")
        self.assertEqual(raised.exception.code & 0xFFFFFFFF, 0x80040154)


class ArgumentTest(DataDirectoryTest):
    def test_texts_reach_the_engine_as_given(self):
        command = self.command()
        # None is the null text, which leaves these settings as they are;
        # "" empties them.
        for value, expected in [("#;", "#;"), (None, "#;"), ("", ""), ("a\0b", "a\0b"),
                                ("é€𝄞", "é€𝄞")]:
            with self.subTest(value=value):
                command.SetIndexGeneralOptions(True, True, False, value, True, False)
                self.assertEqual(command.GetIndexGeneralOption(IGO_SEPARATORS, True), expected)
                command.SetOrderGeneralOptions(False, True, value)
                self.assertEqual(command.GetOrderGeneralOption(OGO_IGNORE_CHARS, True), expected)

    def test_numbers_convert_by_parameter_type(self):
        command = self.command()
        # Integral floats pass for integers; keywords name parameters.
        command.SetIndexLanguageOptions(Language=7.0, UseStemming=True, UsePhonetics=0,
                                        UseStopWords=0, StripAccents=0,
                                        UseCharacterTranslation=0)
        self.assertEqual(command.GetIndexLanguageOption(-1, True), "7")  # iloLanguage
        self.assertEqual(command.GetIndexLanguageOption(1, True), "1")  # iloUseStemming

    def test_arguments_of_the_wrong_kind_are_refused_before_the_call(self):
        search = self.search()
        cases = [
            (lambda: search.GetRawKeyString("1", 2), TypeError),
            (lambda: search.GetRawKeyString(1.5, 2), TypeError),
            (lambda: search.GetRawKeyString(None, 2), TypeError),
            (lambda: search.GetRawKeyString(2**31, 1), OverflowError),
            (lambda: search.GetRawKeyString(-(2**31) - 1, 1), OverflowError),
            (lambda: search.Execute(5), TypeError),
            (lambda: search.Execute(b"bytes"), TypeError),
            (lambda: search.ExecuteEx("x", 2**15), OverflowError),
            (lambda: search.ExecuteEx("x", None), TypeError),
            (lambda: search.AdjustScore("1", 1), TypeError),
            (lambda: search.GetRawKeyString(1), TypeError),
            (lambda: search.GetVersion(1), TypeError),
            (lambda: search.SetLimits(1, 2, Start=1), TypeError),
        ]
        before = quillmere.object_count()
        for index, (call, error) in enumerate(cases):
            with self.subTest(index=index):
                self.assertRaises(error, call)
        # The object is still there and answers.
        self.assertEqual(quillmere.object_count(), before)
        self.assertEqual(search.GetVersion(), "6.14")


class LifetimeTest(unittest.TestCase):
    def test_objects_release_their_reference(self):
        start = quillmere.object_count()
        search = quillmere.APISearch()
        command = quillmere.APICommand()
        self.assertEqual(quillmere.object_count(), start + 2)
        del search
        self.assertEqual(quillmere.object_count(), start + 1)
        with command:
            pass
        self.assertEqual(quillmere.object_count(), start)
        self.assertIn("released", repr(command))
        with self.assertRaises(ValueError):
            command.GetVersion()
        command.release()  # a second release does nothing
        self.assertEqual(quillmere.object_count(), start)

    def test_an_object_in_a_cycle_goes_with_the_collector(self):
        start = quillmere.object_count()
        holder = {"search": quillmere.APISearch()}
        holder["self"] = holder
        del holder
        gc.collect()
        self.assertEqual(quillmere.object_count(), start)

    def test_an_exception_inside_with_still_releases(self):
        start = quillmere.object_count()
        with self.assertRaises(quillmere.Error):
            with quillmere.APISearch() as search:
                search.Close()  # no result set: fails
        self.assertEqual(quillmere.object_count(), start)


class LibraryLookupTest(unittest.TestCase):
    def run_python(self, code, **environment):
        env = dict(os.environ)
        env.update(environment)
        env = {name: value for name, value in env.items() if value is not None}
        env["PYTHONPATH"] = os.pathsep.join(sys.path)
        return subprocess.run([sys.executable, "-c", code], env=env, capture_output=True,
                              text=True, timeout=120)

    def test_a_named_library_that_is_missing_is_reported(self):
        missing = os.path.join(os.environ.get("QM_TEST_SCRATCH", "/tmp"), "none", "libq.so")
        run = self.run_python("import quillmere; quillmere.version()", QUILLMERE_LIBRARY=missing)
        self.assertNotEqual(run.returncode, 0)
        self.assertIn("OSError", run.stderr)
        self.assertIn(missing, run.stderr)

    def test_without_a_name_the_loader_finds_the_soname(self):
        folder = os.path.dirname(os.path.abspath(os.environ.get("QUILLMERE_LIBRARY", "")))
        if not os.path.exists(os.path.join(folder, "libquillmere.so.6")):
            self.skipTest("QUILLMERE_LIBRARY does not name a built library beside its soname")
        run = self.run_python("import quillmere; print(quillmere.version())",
                              QUILLMERE_LIBRARY=None, LD_LIBRARY_PATH=folder)
        self.assertEqual(run.returncode, 0, run.stderr)
        self.assertEqual(run.stdout.strip(), "6.14")
        run = self.run_python("import quillmere; quillmere.version()",
                              QUILLMERE_LIBRARY=None, LD_LIBRARY_PATH=None)
        self.assertIn("set QUILLMERE_LIBRARY", run.stderr)


if __name__ == "__main__":
    unittest.main()
