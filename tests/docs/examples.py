#!/usr/bin/python3
"""Runs the commands that pages show, and holds what they print against what is shown.

  examples.py marked PAGE...                     names what is shown as a command, is not run, and does not say why
  examples.py named PROGRAMS PAGE...             tells commands and options in backticks that the programs do not have
  examples.py run SOURCES PROGRAMS PAGE [SETUP]  runs the commands of a page in their order, in an empty folder

A block ```console holds commands, each behind "$ ", its further lines behind "> ", and below it all that it prints. PROGRAMS
are the folders of the built programs, as in PATH. SETUP is a program that makes ready what the page takes for granted: it
prints NAME=VALUE for variables of the shell, then an empty line, and lasts until its input ends; without that line the page
is skipped. With UPDATE_GOLDEN=1 in the environment what is printed is written into the page instead; read what that changes
before you keep it.

A comment right above a block tells more:
  <!-- file: NAME -->          the block, of whatever kind, is written into that file
  <!-- not run: WHY -->        it shows commands that a test cannot run
  <!-- exit status: N -->      its last command ends with that status; otherwise all end with 0, or echo $? shows it
  <!-- runs on -->             its command runs until the page ends; the next one comes when it has printed what is shown
  <!-- until it is so -->      its last command is run anew until it prints what is shown

What varies (VARYING below) is shown as it was once, and is held against what is printed by its form. Ids and addresses keep who
they are: where a command names one that was printed before, it gets the one that this run printed. Pages call the folder
/home/ada, the installed examples stand for those of the sources, and what runs as another account is its client of PostgreSQL.
"""
import contextlib
import os
import re
import select
import shutil
import signal
import subprocess
import sys
import tempfile
import time
from collections import namedtuple

PATIENCE = 120
SKIPPED = 77

# Name, form, and whether one that comes again is the same one.
VARYING = [
    ("mailing", r"\b\d{8}T\d{6}Z-[0-9a-f]{8}\b", True),
    ("state when it was sent", r"(?<=Z-[0-9a-f]{8}, )(?:submitted|queued|delivering|lodged)\b", False),
    ("address", r"\b127\.0\.0\.1:\d+", True),
    ("secret", r"\b[0-9a-f]{64}\b", True),
    ("time", r"\b\d{4}[/-]\d\d[/-]\d\d[ T]\d\d:\d\d(?::\d\d)?Z?", False),
    ("rows", r"\b\d+ rows of \d+ tables\b", False),
    ("process", r"\(process \d+\)", False),
    ("free space", r"\b\d+ MiB\b", False),
]
FORMS = re.compile("|".join("(%s)" % form for _, form, _ in VARYING))

# In commands: what a page says, what is run.
HOME = "/home/ada"
INSTALLED = "/usr/share/doc/vlservice-doc"
AS_ACCOUNT = re.compile(r"\brunuser -u (\w+) -- ")

REMARK = re.compile(r"<!-- (.*) -->$")
FENCE = re.compile(r"^( *)```(.*)$")
# What begins a line that somebody would type.
TYPED = re.compile(
    r"^\s*(\$ \S|(# )?(sudo |/usr/\S*/)?(vlmail|vlserviced|apt|apt-get|systemctl|runuser|cmake|ctest|scripts/\w+|\.ci/run)( |$))"
)
REMARKS = re.compile(r"(file: \S.*|not run: \S.*|exit status: \d+|runs on|until it is so)$")

Block = namedtuple("Block", "line kind remark lines")
Example = namedtuple("Example", "line command shown")


class Wrong(Exception):
    pass


def blocks_of(text):
    """The blocks between fences, with the numbers of their first lines from 0."""
    blocks, lines, begin = [], text.split("\n"), None
    for number, line in enumerate(lines):
        fence = FENCE.match(line)
        if fence and begin is None:
            begin = number + 1
        elif fence:
            opening = FENCE.match(lines[begin - 1])
            remark = REMARK.match(lines[begin - 2].strip()) if begin > 1 else None
            inner = [one[len(opening[1]) :] for one in lines[begin:number]]
            blocks.append(Block(begin, opening[2], remark[1] if remark else "", inner))
            begin = None
    return blocks


def is_run(block):
    return block.kind == "console" and not block.remark.startswith("not run: ")


def shows_commands(block):
    return block.kind in ("console", "sh", "bash") or any(TYPED.match(line) for line in block.lines)


def fault_of(block):
    """What is wrong with how a block is marked, or None."""
    is_excused = block.remark.startswith(("not run: ", "file: "))
    if block.remark and not REMARKS.match(block.remark) and is_run(block):
        return 'no such remark: "%s"' % block.remark
    if shows_commands(block) and not is_run(block) and not is_excused:
        return "shows commands: make it ```console, or say <!-- not run: WHY --> above it"
    if is_run(block) and not (block.lines and block.lines[0].startswith("$ ")):
        return 'has to begin with a command behind "$ "'
    return None


def typed_in_text(text):
    """The lines outside of blocks that show commands: a fence is what tests look into."""
    inside = set()
    for block in blocks_of(text):
        inside.update(range(block.line - 1, block.line + len(block.lines) + 1))
    for number, line in enumerate(text.split("\n")):
        if number not in inside and line.startswith("    ") and TYPED.match(line):
            yield number


def faults_of(text):
    """(line from 1, what is wrong)."""
    faults = [(block.line, fault_of(block)) for block in blocks_of(text)]
    faults += [(number + 1, "shows a command outside of a block") for number in typed_in_text(text)]
    return sorted(fault for fault in faults if fault[1])


def examples_of(block):
    examples = []
    for number, line in enumerate(block.lines, block.line):
        if line.startswith("$ "):
            examples.append(Example(number, [line[2:]], []))
        elif line.startswith("> ") and not examples[-1].shown:
            examples[-1].command.append(line[2:])
        else:
            examples[-1].shown.append(line)
    return examples


class Varying:
    """What was printed under which showing, and the other way round."""

    def __init__(self):
        self.printed, self.shown = {}, {}

    def in_command(self, command):
        return FORMS.sub(lambda match: self.printed.get(match[0], match[0]), command)

    def as_shown(self, printed, shown):
        """`printed` with what varies as it is shown, in the order in which it is."""
        candidates = [(match.lastindex, match[0]) for match in FORMS.finditer(shown)]
        return FORMS.sub(lambda match: self.one(match, candidates), printed)

    def one(self, match, candidates):
        is_same = VARYING[match.lastindex - 1][2]
        wanted = candidates.pop(0) if candidates else (None, None)
        if is_same and match[0] in self.shown:
            return self.shown[match[0]]
        if wanted[0] != match.lastindex or (is_same and wanted[1] in self.printed):
            return match[0]
        if is_same:
            self.printed[wanted[1]], self.shown[match[0]] = match[0], wanted[1]
        return wanted[1]


class Shell:
    """Takes one command after the other, as a person types them, in an empty folder that has the examples."""

    def __init__(self, sources, programs, variables):
        self.folder = tempfile.mkdtemp(prefix="vlservice.")
        self.own = tempfile.mkdtemp(prefix="vlservice.")
        self.outputs = []
        shutil.copytree(os.path.join(sources, "examples"), os.path.join(self.folder, "examples"))
        environment = {"HOME": self.folder, "PATH": programs + ":/usr/sbin:/usr/bin:/sbin:/bin", "LC_ALL": "C.UTF-8", "TZ": "UTC"}
        status, self.ends = os.pipe()
        self.statuses = os.fdopen(status, "rb", 0)
        self.process = subprocess.Popen(
            ["bash", "--noprofile", "--norc"], cwd=self.folder, env={**environment, **variables}, text=True,
            stdin=subprocess.PIPE, pass_fds=[self.ends], start_new_session=True)
        # What runs on ends with the shell.
        self.type("trap 'kill $(jobs -p) 2>/dev/null; wait' EXIT")

    def type(self, line):
        self.process.stdin.write(line + "\n")
        self.process.stdin.flush()

    def put(self, name, command):
        """What has the shell run it, in itself."""
        path = os.path.join(self.own, name)
        with open(path, "w") as file:
            file.write(command + "\n")
        return "source '%s' </dev/null >'%s.output' 2>&1" % (path, path), path + ".output"

    def run(self, command):
        """Its exit status, and what it printed."""
        line, output = self.put("command", command)
        self.type("%s; status=$?; echo $status >&%d; (exit $status)" % (line, self.ends))
        if not select.select([self.statuses], [], [], PATIENCE)[0]:
            raise Wrong("takes more than %d seconds: %s" % (PATIENCE, command))
        status = int(self.statuses.readline())
        with open(output, errors="replace") as file:
            return status, file.read()

    def start(self, command, lines):
        """What it prints up to so many lines, while it runs on."""
        line, output = self.put("command%d" % len(self.outputs), "exec " + command)
        os.mkfifo(output)
        self.outputs.append(os.open(output, os.O_RDONLY | os.O_NONBLOCK))
        self.type(line + " &")
        text, end = b"", time.monotonic() + PATIENCE
        while text.count(b"\n") < lines and select.select([self.outputs[-1]], [], [], max(0, end - time.monotonic()))[0]:
            piece = os.read(self.outputs[-1], 65536)
            if not piece:
                break
            text += piece
        return text.decode(errors="replace")

    def end(self):
        self.process.stdin.close()
        try:
            self.process.wait(10)
        except subprocess.TimeoutExpired:
            os.killpg(self.process.pid, signal.SIGKILL)
            self.process.wait()
        self.statuses.close()
        for end in [self.ends, *self.outputs]:
            os.close(end)
        shutil.rmtree(self.folder, ignore_errors=True)
        shutil.rmtree(self.own, ignore_errors=True)


class Walk:
    def __init__(self, shell, sources):
        self.shell, self.sources, self.varying = shell, sources, Varying()
        self.faults = []

    def block(self, block):
        """Its lines as they would be right."""
        if block.remark.startswith("file: "):
            with open(os.path.join(self.shell.folder, block.remark[6:]), "w") as file:
                file.write(self.command(block.lines) + "\n")
        if not is_run(block) or block.remark.startswith("file: "):
            return block.lines
        examples, lines = examples_of(block), []
        for position, example in enumerate(examples):
            lines += ["$ " + example.command[0]] + ["> " + line for line in example.command[1:]]
            lines += self.example(example, block.remark, examples[position + 1 :])
        return lines

    def command(self, lines):
        text = AS_ACCOUNT.sub(r"env PGUSER=\1 ", "\n".join(lines)).replace(INSTALLED + "/", self.sources + "/")
        return self.varying.in_command(text.replace(HOME, self.shell.folder))

    def printed(self, text, shown):
        text = text.replace(self.shell.folder, HOME)
        return self.varying.as_shown(text, shown).rstrip("\n")

    def example(self, example, remark, behind):
        shown, end = "\n".join(example.shown), time.monotonic() + (3 if is_updating() else PATIENCE)
        while True:
            status, printed = self.run(example, remark)
            printed = self.printed(printed, shown)
            if printed == shown or behind or remark != "until it is so" or time.monotonic() > end:
                break
        wanted = int(remark[13:]) if remark.startswith("exit status: ") and not behind else 0
        is_told = behind and behind[0].command == ["echo $?"]
        if printed != shown or (status != wanted and not is_told):
            self.faults.append((example, status, printed))
        return printed.split("\n") if printed else []

    def run(self, example, remark):
        command = self.command(example.command)
        if remark == "runs on":
            return 0, self.shell.start(command, len(example.shown))
        return self.shell.run(command)


def tell(page, faults):
    for example, status, printed in faults:
        print("%s:%d: $ %s" % (page, example.line + 1, "\n> ".join(example.command)))
        print("--- shown\n%s\n--- printed, with exit status %d\n%s\n" % ("\n".join(example.shown), status, printed))


def read(page):
    with open(page, encoding="utf-8") as file:
        return file.read()


@contextlib.contextmanager
def made_ready(program):
    """The variables that the program tells, None when it cannot make ready what is wanted."""
    if not program:
        yield {}
        return
    process = subprocess.Popen([program], stdin=subprocess.PIPE, stdout=subprocess.PIPE, text=True)
    lines = []
    while (line := process.stdout.readline()).strip():
        lines.append(line.strip())
    try:
        yield dict(line.split("=", 1) for line in lines) if line else None
    finally:
        process.communicate()


def walk(sources, programs, page, variables):
    shell = Shell(sources, programs, variables)
    try:
        text = read(page)
        walk, lines, done = Walk(shell, sources), [], 0
        source = text.split("\n")
        for block in blocks_of(text):
            indent = FENCE.match(source[block.line - 1])[1]
            lines += source[done : block.line] + [(indent + line).rstrip() if line == "" else indent + line for line in walk.block(block)]
            done = block.line + len(block.lines)
        return walk.faults, "\n".join(lines + source[done:])
    finally:
        shell.end()


def is_updating():
    return os.environ.get("UPDATE_GOLDEN") == "1"


def run(sources, programs, page, setup=None):
    with made_ready(setup) as variables:
        if variables is None:
            print("%s cannot make ready what %s takes for granted" % (setup, page))
            return SKIPPED
        faults, right = walk(sources, programs, page, variables)
    if is_updating():
        with open(page, "w", encoding="utf-8") as file:
            file.write(right)
        return 0
    tell(page, faults)
    return 1 if faults else 0


class Tree:
    """The commands of a program, as its --help tells them. What is above a command may have its options behind it, too."""

    def __init__(self, program, above=frozenset()):
        said = subprocess.run([*program, "--help"], capture_output=True, text=True, check=True).stdout
        below = re.findall(r"^  ([a-z]\S*) {2,}", said.partition("Subcommands:\n")[2], re.MULTILINE)
        self.options = above | set(re.findall(r"(?<![\w-])-{1,2}[a-z][\w-]*", said))
        self.commands = {name: Tree([*program, name], self.options) for name in below}

    def faults_of(self, words):
        """What is not there of "settings show|set NODE [--origin]"."""
        if words and self.commands and not words[0].startswith("-"):
            return [fault for name in words[0].split("|") for fault in self.below(name, words[1:])]
        return ["no option " + word for word in words if word.startswith("-") and word not in self.options]

    def below(self, name, words):
        return self.commands[name].faults_of(words) if name in self.commands else ["no command " + name]


def named(programs, *pages):
    trees = {name: Tree([shutil.which(name, path=programs)]) for name in ("vlmail", "vlserviced")}
    faults = 0
    for page in pages:
        for program, rest in re.findall(r"`(vlmail|vlserviced) ([^`\n]+)`", read(page)):
            for fault in trees[program].faults_of(re.sub(r"[][]|\.\.\.", "", rest).split()):
                print("%s: `%s %s`: %s" % (page, program, rest, fault))
                faults += 1
    return 1 if faults else 0


def marked(*pages):
    faults = [(page, fault) for page in pages for fault in faults_of(read(page))]
    for page, (line, what) in faults:
        print("%s:%d: %s" % (page, line, what))
    blocks = [block for page in pages for block in blocks_of(read(page))]
    print("%d blocks are run, %d are not and say why" % (
        sum(map(is_run, blocks)), sum(block.remark.startswith("not run: ") for block in blocks)))
    return 1 if faults else 0


if __name__ == "__main__":
    sys.exit({"marked": marked, "named": named, "run": run}[sys.argv[1]](*sys.argv[2:]))
