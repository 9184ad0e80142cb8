#!/usr/bin/python3
"""Makes the book of the pages as they are, and of pages and headers in which something is wrong."""
import glob
import os
import shutil
import subprocess
import sys
import tempfile
import unittest

SOURCES = os.path.abspath(os.path.join(os.path.dirname(__file__), "..", ".."))

RECORD = """#pragma once
// Records.
// And more of them.

/// A record.
class Record {
public:
    Record(Record const&) = default;
    /// Takes a text,
    /// as it stands.
    void take(std::string text);
    void take(char const* text);
    void leave(char const* text);
    bool duplex() const { return duplex_; }
    void setDuplex(bool duplex) { duplex_ = duplex; }
    bool simplex() const { return !duplex_; } ///< one side
    struct Inner {
        bool duplex() const { return duplex_; }
    };
    bool isDuplex() const { return duplex_; }

private:
    bool duplex_;
};
"""
COPIED = "/** What a copy shares with this one is told at the class. */"
RECORD_AS_DOXYGEN_WANTS_IT = (
    RECORD.replace("#pragma once\n// Records.\n// And", "/// \\file\n/// Records.\n/// And")
    .replace("    Record(R", COPIED + "    Record(R")
    .replace("    void take(char", "/** Takes a text, as it stands. */    void take(char")
    .replace("    bool duplex() const { return duplex_; }\n    void", '/** What the key "duplex" holds. */    bool duplex() const { return duplex_; }\n    void')
    .replace("    void setD", '/** Sets what the key "duplex" holds. */    void setD')
    .replace("    bool isD", '/** What the key "duplex" holds. */    bool isD')
    .replace("    bool duplex_;", '/** What the key "duplex" holds. */    bool duplex_;')
    + "\n"
)


def make(sources, folder):
    return subprocess.run(
        [os.path.join(sources, "scripts/book"), "--as-it-is", folder], stdout=subprocess.PIPE, stderr=subprocess.STDOUT, text=True)


def read(*parts):
    with open(os.path.join(*parts), encoding="utf-8") as file:
        return file.read()


class Book(unittest.TestCase):
    def setUp(self):
        self.folder = tempfile.mkdtemp(prefix="vlservice.")
        self.addCleanup(shutil.rmtree, self.folder)

    def test_is_made_of_every_page_without_a_warning(self):
        book = os.path.join(self.folder, "book")
        made = make(SOURCES, book)
        if made.returncode == 77:
            print(made.stdout)
            sys.exit(77)
        self.assertEqual((made.returncode, made.stdout), (0, "book: %s/index.html\n" % book))
        for page in glob.glob("docs/**/*.md", root_dir=SOURCES, recursive=True) + ["README.md"]:
            self.assertTrue(os.path.exists(os.path.join(book, page[:-3] + ".html")), page)
        self.assertIn("url=docs/index.html", read(book, "index.html"))
        self.assertIn('"docs/how-to/window-envelopes"', read(book, "searchindex.js"))
        self.assertIn("Cuts this field", read(book, "library/classCfg_1_1ExtractField.html"))
        self.assertNotRegex(read(book, "docs/index.html"), r'(src|stylesheet"[^>]*href)="https?:')

    def test_is_not_made_where_something_is_wrong(self):
        for name in ["docs", "vlservice", "scripts"]:
            shutil.copytree(os.path.join(SOURCES, name), os.path.join(self.folder, name))
        for page in glob.glob(SOURCES + "/*.md") + [SOURCES + "/CMakeLists.txt"]:
            shutil.copy(page, self.folder)
        self.add("docs/lost.md", "# A page that no list names\n")
        self.add("docs/report.md", "\n[a](no-such-page.md) [b](check.md#no-such-heading)\n")
        self.add("vlservice/vlservice.h", "/// See <nothing>.\nstruct Wrong {};\n\nstruct Undocumented { int member; };\n")
        made = make(self.folder, os.path.join(self.folder, "book"))
        self.assertEqual(made.returncode, 1)
        self.assertRegex(made.stdout, r"docs/lost.md: WARNING: document isn't included in any toctree")
        self.assertRegex(made.stdout, r"docs/report.md:\d+: WARNING: .*no-such-page.md")
        self.assertRegex(made.stdout, r"docs/report.md:\d+: WARNING: .*no-such-heading")
        self.assertRegex(made.stdout, r"vlservice/vlservice.h:\d+: error: Compound Undocumented is not documented")
        self.assertRegex(made.stdout, r"vlservice/vlservice.h:\d+: error: Unsupported xml/html tag <nothing> found")
        self.assertTrue(made.stdout.endswith("book: not all is well: correct what stands above\n"))

    def test_has_in_the_reference_what_stands_once_in_the_sources(self):
        self.write("record.cpp", 'json::Key{"duplex", &Record::duplex_},\n')
        self.write("record.h", RECORD)
        made = subprocess.run(
            [os.path.join(SOURCES, "docs/book/reference.py"), os.path.join(self.folder, "record.h")], capture_output=True, text=True)
        self.assertEqual((made.returncode, made.stdout, made.stderr), (0, RECORD_AS_DOXYGEN_WANTS_IT, ""))

    def write(self, name, text):
        with open(os.path.join(self.folder, name), "w", encoding="utf-8") as file:
            file.write(text)

    def add(self, name, text):
        with open(os.path.join(self.folder, name), "a", encoding="utf-8") as file:
            file.write(text)


if __name__ == "__main__":
    unittest.main()
