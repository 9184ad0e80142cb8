#!/usr/bin/python3
"""Tries what holds pages against their commands on pages that are made for it."""
import contextlib
import io
import os
import sys
import tempfile
import unittest

sys.dont_write_bytecode = True
sys.path.insert(0, os.path.dirname(__file__))
import examples

SOURCES = os.path.join(os.path.dirname(os.path.abspath(__file__)), "..", "..")
FENCE = "```"


class MadePage(unittest.TestCase):
    def setUp(self):
        handle, self.page = tempfile.mkstemp(suffix=".md")
        os.close(handle)
        self.addCleanup(os.unlink, self.page)
        self.addCleanup(os.environ.pop, "UPDATE_GOLDEN", None)
        os.environ.pop("UPDATE_GOLDEN", None)

    def write(self, *lines):
        with open(self.page, "w", encoding="utf-8") as file:
            file.write("\n".join(lines) + "\n")

    def run_page(self, setup=None):
        """The status, and what was told."""
        told = io.StringIO()
        with contextlib.redirect_stdout(told):
            status = examples.run(SOURCES, "/nowhere", self.page, setup)
        return status, told.getvalue()

    def faults(self, *lines):
        self.write(*lines)
        return examples.faults_of(examples.read(self.page))


class Running(MadePage):
    def test_takes_what_is_printed_as_it_is_shown(self):
        self.write(FENCE + "console", "$ echo one; echo two >&2", "one", "two", "$ cat <<END", "> three", "> END", "three", FENCE)
        self.assertEqual(self.run_page(), (0, ""))

    def test_tells_page_line_command_and_both_texts(self):
        self.write("# Page", "", FENCE + "console", "$ true", "$ echo one", "two", FENCE)
        self.assertEqual(
            self.run_page(),
            (1, self.page + ":5: $ echo one\n--- shown\ntwo\n--- printed, with exit status 0\none\n\n"))

    def test_refuses_output_that_is_left_out_or_goes_on(self):
        for shown in [[], ["one"], ["one", "two", "three"], ["one", "", "two"], ["..."]]:
            self.write(FENCE + "console", "$ printf 'one\\ntwo\\n'", *shown, FENCE)
            self.assertEqual(self.run_page()[0], 1, shown)

    def test_refuses_a_status_that_is_not_told(self):
        self.write(FENCE + "console", "$ false", FENCE)
        self.assertEqual(self.run_page()[0], 1)
        self.write("<!-- exit status: 2 -->", FENCE + "console", "$ false", FENCE)
        self.assertEqual(self.run_page()[0], 1)
        self.write("<!-- exit status: 1 -->", FENCE + "console", "$ false", "$ false", FENCE)
        self.assertEqual(self.run_page()[0], 1)

    def test_takes_a_status_that_is_told(self):
        self.write("<!-- exit status: 1 -->", FENCE + "console", "$ true", "$ false", FENCE)
        self.assertEqual(self.run_page(), (0, ""))
        self.write(FENCE + "console", "$ (exit 7)", "$ echo $?", "7", FENCE)
        self.assertEqual(self.run_page(), (0, ""))

    def test_goes_on_in_the_same_shell(self):
        self.write(FENCE + "console", "$ name=ada; mkdir in; cd in", FENCE, "", FENCE + "console", "$ echo $name; pwd", "ada", "/home/ada/in", FENCE)
        self.assertEqual(self.run_page(), (0, ""))

    def test_writes_files_that_a_page_shows(self):
        self.write("<!-- file: a.json -->", FENCE + "json", '{"in": "/home/ada"}', FENCE, FENCE + "console", "$ cat a.json", '{"in": "/home/ada"}', FENCE)
        self.assertEqual(self.run_page(), (0, ""))

    def test_begins_in_a_folder_with_nothing_but_the_examples(self):
        self.write(FENCE + "console", "$ ls -A", "examples", "$ ls examples/letters/post-in-english/presets.json", "examples/letters/post-in-english/presets.json", FENCE)
        self.assertEqual(self.run_page(), (0, ""))

    def test_leaves_alone_what_is_not_run(self):
        self.write("<!-- not run: it takes root -->", FENCE + "console", "$ false", FENCE)
        self.assertEqual(self.run_page(), (0, ""))

    def test_has_a_command_run_on_and_ends_it_with_the_page(self):
        self.write("<!-- runs on -->", FENCE + "console", "$ bash -c 'echo $$ >id; echo ready; exec tail -f /dev/null'", "ready", FENCE,
                   FENCE + "console", "$ kill -0 $(cat id) && cp id " + self.page + ".id", FENCE)
        self.assertEqual(self.run_page(), (0, ""))
        with open(self.page + ".id") as file:
            process = int(file.read())
        os.unlink(self.page + ".id")
        self.assertRaises(ProcessLookupError, os.kill, process, 0)

    def test_refuses_a_command_that_does_not_run_on(self):
        self.write("<!-- runs on -->", FENCE + "console", "$ echo other", "ready", "steady", FENCE)
        self.assertEqual(self.run_page()[0], 1)

    def test_runs_a_command_anew_until_it_is_so(self):
        self.write("<!-- until it is so -->", FENCE + "console", "$ echo >>count; wc -l <count", "5", FENCE)
        self.assertEqual(self.run_page(), (0, ""))

    def test_writes_the_page_anew_when_it_is_told_to(self):
        self.write("# Page", FENCE + "console", "$ echo one", "two", "$ echo three", FENCE, "", "  " + FENCE + "console", "  $ echo four", "  " + FENCE, "end")
        os.environ["UPDATE_GOLDEN"] = "1"
        self.assertEqual(self.run_page(), (0, ""))
        self.assertEqual(
            examples.read(self.page),
            "\n".join(["# Page", FENCE + "console", "$ echo one", "one", "$ echo three", "three", FENCE, "", "  " + FENCE + "console", "  $ echo four", "  four", "  " + FENCE, "end", ""]))


class VaryingOnes(MadePage):
    def test_are_held_against_what_is_shown_by_their_form(self):
        self.write(FENCE + "console", "$ echo at 2026/11/22 15:57:38, 59229 MiB left", "at 2021/01/01 00:00:00, 17 MiB left", FENCE)
        self.assertEqual(self.run_page(), (0, ""))
        self.write(FENCE + "console", "$ echo at 2026/11/22 15:57:38", "at 17 MiB left", FENCE)
        self.assertEqual(self.run_page()[0], 1)

    def test_are_the_same_where_they_come_again(self):
        first, second = "20261122T155738Z-a98448a0", "20261122T155738Z-e4814077"
        shown, other = "20200101T000000Z-00000000", "20200101T000000Z-11111111"
        page = [FENCE + "console", "$ echo %s %s" % (first, second), "%s %s" % (shown, other), "$ echo is %s" % shown, "is " + shown, FENCE]
        self.write(*page)
        self.assertEqual(self.run_page(), (0, ""))
        page[4] = "is " + other
        self.write(*page)
        self.assertEqual(self.run_page()[0], 1)

    def test_of_two_are_never_shown_as_one(self):
        self.write(FENCE + "console", "$ echo 127.0.0.1:1 127.0.0.1:2", "127.0.0.1:9 127.0.0.1:9", FENCE)
        self.assertEqual(self.run_page()[0], 1)

    def test_stand_in_commands_for_those_that_were_printed(self):
        self.write(FENCE + "console", "$ echo 127.0.0.1:1; true", "127.0.0.1:9", "$ echo 127.0.0.1:9 | tr 1 x", "x27.0.0.x:x", FENCE)
        self.assertEqual(self.run_page(), (0, ""))


class NamedCommands(MadePage):
    HELP = """#!/bin/sh
case "$*" in
"--help") printf 'Options:\\n  --version  Tells it\\nSubcommands:\\n  pack  Looks in\\n  send  Sends\\n' ;;
"pack --help") printf 'Subcommands:\\n  list  Lists\\n  verify  Compares\\n' ;;
*) printf 'Options:\\n  -o,--output FILE  Where to\\n  --json  As JSON\\n' ;;
esac
"""

    def named(self, *commands):
        with tempfile.TemporaryDirectory() as programs:
            for name in ("vlmail", "vlserviced"):
                with open(os.path.join(programs, name), "w") as file:
                    file.write(self.HELP)
                os.chmod(os.path.join(programs, name), 0o755)
            self.write(*["Say `%s`." % command for command in commands])
            told = io.StringIO()
            with contextlib.redirect_stdout(told):
                return examples.named(programs, self.page), told.getvalue().replace(self.page + ": ", "")

    def test_are_those_of_the_programs(self):
        self.assertEqual(
            self.named("vlmail pack list FILE", "vlmail pack list|verify [--json] FILE...", "vlmail send -o X", "vlmail --version", "vlmail pack"), (0, ""))

    def test_that_there_are_not_are_told_with_their_page(self):
        self.assertEqual(
            self.named("vlmail pac list", "vlmail pack list|look", "vlserviced send --jsn FILE", "vlmail --json"),
            (1, "`vlmail pac list`: no command pac\n`vlmail pack list|look`: no command look\n"
                "`vlserviced send --jsn FILE`: no option --jsn\n`vlmail --json`: no option --json\n"))


class Marks(MadePage):
    def test_are_wanted_of_whatever_shows_commands(self):
        for lines in [["vlmail status"], ["$ ls"], ["# apt install x"], ["sudo systemctl start vlserviced"], ["  scripts/test asan"]]:
            self.assertEqual(
                self.faults(FENCE, *lines, FENCE),
                [(1, "shows commands: make it ```console, or say <!-- not run: WHY --> above it")], lines)
        self.assertEqual(len(self.faults(FENCE + "sh", "ls", FENCE)), 1)
        self.assertEqual(len(self.faults("<!-- not run: -->", FENCE + "sh", "ls", FENCE)), 1)

    def test_of_commands_outside_of_blocks_do_not_count(self):
        self.assertEqual(self.faults("Do:", "", "    vlserviced --data x"), [(3, "shows a command outside of a block")])

    def test_are_not_wanted_of_anything_else(self):
        self.assertEqual(self.faults(FENCE, "programs/vlmail", "vlmail.conf", FENCE, "Say vlmail status.", "    an item that goes on"), [])
        self.assertEqual(self.faults("<!-- not run: it takes root -->", FENCE + "sh", "apt install x", FENCE), [])
        self.assertEqual(self.faults("<!-- file: send -->", FENCE + "sh", "#!/bin/sh", FENCE), [])

    def test_that_nobody_knows_are_refused(self):
        self.assertEqual(self.faults("<!-- run on -->", FENCE + "console", "$ ls", FENCE), [(2, 'no such remark: "run on"')])

    def test_stand_above_blocks_that_begin_with_a_command(self):
        self.assertEqual(self.faults(FENCE + "console", "ls", FENCE), [(1, 'has to begin with a command behind "$ "')])


if __name__ == "__main__":
    unittest.main()
