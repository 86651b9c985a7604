"""The zr7inst module's pure parts: the argument vector built from a task's
parameters, the reading of a plan and of the records, and what counts as a
change. Run with the Python that runs Ansible:
    python3 -m unittest discover -s contrib/ansible/tests -p 'test_*.py'"""

import importlib.util
import json
import os
import unittest

LIBRARY = os.path.join(os.path.dirname(os.path.abspath(__file__)), "..",
                       "roles", "zr7inst", "library", "zr7inst.py")
found = importlib.util.spec_from_file_location("zr7inst_module", LIBRARY)
m = importlib.util.module_from_spec(found)
found.loader.exec_module(m)


def params(**given):
    base = dict(home="/srv/h", image="/img", settings={}, modules=[], copy=True, seed=True,
                state="present", executable=None)
    base.update(given)
    return base


class BuildArguments(unittest.TestCase):
    def test_table(self):
        cases = [
            (params(), False, ["-h", "/srv/h", "/img"]),
            (params(), True, ["-n", "-h", "/srv/h", "/img"]),
            (params(settings={"a": 24, "B": "x y"}), False,
             ["-c", "a=24", "-c", "B=x y", "-h", "/srv/h", "/img"]),
            (params(modules=["kzr", "k zx"]), False, ["-m", "kzr;k zx", "-h", "/srv/h", "/img"]),
            (params(copy=False), False, ["-s", "-h", "/srv/h", "/img"]),
            (params(seed=False), False, ["-e", "-h", "/srv/h", "/img"]),
            (params(state="undone", settings={"a": 1}), False, ["-u", "-h", "/srv/h"]),
            (params(state="undone", image=None), True, ["-n", "-u", "-h", "/srv/h"]),
        ]
        for given, preview, expected in cases:
            with self.subTest(given=given, preview=preview):
                self.assertEqual(m.build_arguments(given, preview), expected)


class ParameterProblem(unittest.TestCase):
    def test_table(self):
        cases = [
            (params(), None),
            (params(state="undone", image=None), None),
            (params(image=None), "image is required"),
            (params(copy=False, seed=False), "nothing to do"),
            (params(settings={"KDC_DEBUG": False}), "boolean"),
            (params(settings={"A": [1]}), "single value"),
            (params(settings={"A=B": "1"}), "not a valid name"),
            (params(modules=["a;b"]), "holds ';'"),
            (params(modules=[" "]), "empty"),
        ]
        for given, problem in cases:
            with self.subTest(given=given):
                found = m.parameter_problem(given)
                if problem is None:
                    self.assertIsNone(found)
                else:
                    self.assertIn(problem, found)


PLAN = """mkdir /h/tables/HUB01/sub
create /h/tables/HUB01/ATTRLIB/kzr.atr
replace /h/a\\\\b\\tc\\x1bd\\xffe
same /h/x
keep /h/tables/HUB01/kzr_site.cfg
vxaenv /h/tables/HUB01/VXAENV
  --- a/VXAENV
  +++ b/VXAENV
  @@ -1,2 +1,3 @@
   KDS_START=1
  -KDS_RUN=A
  +KDS_RUN=A;kzr
  +KZR_HISTORY_HOURS=24
backup /h/tables/HUB01/.archive/VXAENV_1
seed /h/tables/cicatrsq/SQLLIB/kzr_cat.sql
pass /h/tables/cicatrsq/SQLLIB/README.txt
summary: mkdir 1 create 1 replace 1 same 1 keep 1 vxaenv 1 backup 1 seed 1 pass 1 error 0
"""


class ParsePlan(unittest.TestCase):
    def test_actions_diff_and_counts(self):
        plan = m.parse_plan(PLAN)
        self.assertEqual([a["action"] for a in plan["actions"]],
                         ["mkdir", "create", "replace", "same", "keep", "vxaenv", "backup", "seed", "pass"])
        self.assertEqual(plan["actions"][2]["path"],
                         os.fsdecode(b"/h/a\\b\tc\x1bd\xffe"))
        self.assertEqual(plan["vxaenv_diff"][0], "--- a/VXAENV")
        self.assertEqual(plan["vxaenv_diff"][3], " KDS_START=1")
        self.assertEqual(plan["vxaenv_diff"][-1], "+KZR_HISTORY_HOURS=24")
        self.assertEqual(plan["counts"], {"mkdir": 1, "create": 1, "replace": 1, "same": 1, "keep": 1,
                                          "vxaenv": 1, "backup": 1, "seed": 1, "pass": 1, "error": 0})

    def test_error_line(self):
        plan = m.parse_plan("error Bad architecture ../lx8266\nsummary: mkdir 0 error 1\n")
        self.assertEqual(plan["actions"], [{"action": "error", "text": "Bad architecture ../lx8266"}])
        self.assertEqual(plan["counts"], {"mkdir": 0, "error": 1})

    def test_escapes(self):
        cases = [("/a\\\\n", "/a\\n"), ("/a\\n", "/a\n"), ("/a\\r\\t", "/a\r\t"), ("/a\\x7f", "/a\x7f"),
                 ("/a\\xzz", "/a\\xzz"), ("/a\\x4", "/a\\x4"), ("/é", "/é")]
        for text, path in cases:
            with self.subTest(text=text):
                self.assertEqual(m.unescape_path(text), path)

    def test_diff_lists_changes_only(self):
        diffs = m.plan_diff(m.parse_plan(PLAN), "/h")
        self.assertEqual(len(diffs), 2)
        self.assertTrue(diffs[0]["prepared"].startswith("--- a/VXAENV\n+++ b/VXAENV\n"))
        text = diffs[1]["prepared"]
        self.assertIn("files created (1):\n  /h/tables/HUB01/ATTRLIB/kzr.atr\n", text)
        self.assertIn("SQL files seeded (1):", text)
        self.assertNotIn("/h/x", text)
        self.assertNotIn("kzr_site.cfg", text)

    def test_nothing_to_show(self):
        self.assertEqual(m.plan_diff(m.parse_plan("same /h/x\nsummary: same 1\n"), "/h"), [])


class Changes(unittest.TestCase):
    def test_table(self):
        cases = [
            ({"create": 0, "same": 5, "keep": 2, "pass": 1, "error": 0}, False, False),
            ({"mkdir": 1}, False, True),
            ({"create": 1}, False, True),
            ({"replace": 1}, False, True),
            ({"vxaenv": 1}, False, True),
            ({"seed": 4}, False, True),
            ({"seeded": 4, "conflict": 1}, True, False),
            ({"restore": 1}, True, True),
            ({"remove": 1}, True, True),
            ({"rmdir": 1}, True, True),
            ({"vxaenv": 1}, True, True),
        ]
        for counts, undo, changed in cases:
            with self.subTest(counts=counts, undo=undo):
                self.assertEqual(m.plan_changes(counts, undo), changed)


def rec(operation, args=None, **more):
    record = {"operation": operation, "arguments": args or [], "status": "success", "changed": True,
              "manifest": "/m"}
    record.update(more)
    return record


class Records(unittest.TestCase):
    def test_appended_lines_partial_and_foreign_bytes(self):
        data = (json.dumps(rec("install", ["/img"])) + "\n" + '{"operation":"undo","home":"/a\\udcff"}\n'
                + '{"operation": "inst').encode()
        records = m.appended_records(data)
        self.assertEqual(len(records), 2)
        self.assertEqual(os.fsencode(records[1]["home"]), b"/a\xff")

    def test_own_record_is_the_last_with_these_arguments(self):
        mine = rec("install", ["-h", "/h", "/img"], run="2")
        records = [rec("install", ["-h", "/h", "/img"], run="1"), mine,
                   rec("install", ["-h", "/h", "/other"], run="3"), rec("undo", ["-u", "-h", "/h"])]
        self.assertIs(m.own_record(records, "install", ["-h", "/h", "/img"]), mine)
        self.assertIsNone(m.own_record(records, "undo", ["-h", "/h", "/img"]))

    def test_newest_undoable(self):
        j, u = True, True
        cases = [
            ([], None),
            ([("000001-a", j, False)], "000001-a"),
            ([("000001-a", j, False), ("000002-b", j, False)], "000002-b"),
            ([("000002-b", j, u), ("000001-a", j, False)], "000001-a"),
            ([("000001-a", j, False), ("000002-undo", False, False)], "000001-a"),
            ([("000001-a", j, u), ("000002-b", j, u)], None),
            ([("000001-a", j, False), ("scratch", j, False)], "000001-a"),
        ]
        for runs, newest in cases:
            with self.subTest(runs=runs):
                self.assertEqual(m.newest_undoable(runs), newest)

    def test_install_record(self):
        a, b = rec("install", run="000001-a", image="/a"), rec("undo", run="000002-b")
        self.assertIs(m.install_record([a, b], "000001-a"), a)
        self.assertIsNone(m.install_record([a, b], "000002-b"))


class Messages(unittest.TestCase):
    def test_error_lines_and_log(self):
        stderr = ("Invoking cmd <x>\nError: Can't open kmsenv\nError: /h/k: No such file or directory\n"
                  "zr7inst: installation failed with exit status 2; see /h/logs/qsdinst.log\n")
        self.assertEqual(m.error_lines(stderr), ["Error: Can't open kmsenv", "Error: /h/k: No such file or directory"])
        self.assertEqual(m.log_path(stderr, "/other"), "/h/logs/qsdinst.log")
        self.assertEqual(m.log_path("", "/h", exists=lambda path: True), "/h/logs/qsdinst.log")
        self.assertIsNone(m.log_path("Error: Installation directory </h> does not exist\n", "/h",
                                     exists=lambda path: False))

    def test_nothing_to_undo(self):
        self.assertTrue(m.nothing_to_undo(["Error: Nothing to undo in </h/>"]))
        self.assertFalse(m.nothing_to_undo(["Error: Can't open </h/.zr7inst>", "Error: Nothing to undo"]))
        self.assertFalse(m.nothing_to_undo([]))

    def test_without_rc(self):
        result = {"rc": 244, "msg": "x"}
        self.assertEqual(m.without_rc(result), {"exit_status": 244, "msg": "x"})
        self.assertEqual(result["rc"], 244)

    def test_reason(self):
        self.assertEqual(m.reason(["Error: a", "Error: b"], "x\n"), "Error: a; Error: b")
        self.assertEqual(m.reason([], "\nzr7inst: unknown option -n\nUsage: ...\n"), "zr7inst: unknown option -n")
        self.assertEqual(m.reason([], ""), "no message")

    def test_same_directory(self):
        self.assertTrue(m.same_directory("/img/", "/img"))
        self.assertFalse(m.same_directory("/img", "/img2"))
        self.assertFalse(m.same_directory(None, "/img"))


if __name__ == "__main__":
    unittest.main()
