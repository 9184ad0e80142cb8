"""How the pages become a book of HTML: scripts/book runs sphinx-build with it, over the folder of the sources."""
import pathlib
import re

import furo
from pygments.lexers.special import TextLexer

SOURCES = pathlib.Path(__file__).resolve().parents[2]

project = "VLService"
author = "VLService maintainers"
copyright = author
version = re.search(r"project\(\S+ VERSION (\S+)", (SOURCES / "CMakeLists.txt").read_text())[1]

extensions = ["myst_parser"]
include_patterns = ["*.md", "docs/*.md", "docs/*/*.md"]
root_doc = "docs/index"
source_suffix = {".md": "markdown"}

myst_heading_anchors = 6
# What is no program's text: bytes, proofs, examples with parts left out.
suppress_warnings = ["misc.highlighting_failure"]

html_theme = "furo"
html_title = "VLService " + version
html_extra_path = ["index.html"]
html_static_path = ["book.css"]
html_css_files = ["book.css"]
html_copy_source = False
html_show_sphinx = False
html_last_updated_fmt = None
# Where the screen is dark the theme goes by these of its colours. Of its own rules for that not every version has them all.
STYLE = (pathlib.Path(furo.__file__).parent / "theme/furo/static/styles/furo.css").read_text()
DARK = re.search(r'body\[data-theme="?dark"?\]\s*{([^}]*)}', STYLE)[1]
html_theme_options = {"navigation_with_keys": True, "dark_css_variables": dict(re.findall(r"--([\w-]+):\s*([^;]+)", DARK))}

SECTION = re.compile(r"^## (.*)\n((?:(?!^## ).*\n)*)", re.MULTILINE)
PAGE = re.compile(r"^- \[.*\]\((.*)\.md\)$", re.MULTILINE)

# Doxygen writes it behind the pages.
LIBRARY = '''
## The library

<a href="../library/index.html">Every class and function of libVLService</a>, out of its public headers.

'''


def contents(text):
    """The lists of the first page as the tables of contents that the navigation goes by."""
    tables = []
    for section in SECTION.finditer(text):
        pages = PAGE.findall(section[2])
        tables.append("```{toctree}\n:hidden:\n:caption: %s\n%s\n```\n" % (section[1], "\n".join(pages)))
    return text + LIBRARY + "\n".join(tables)


def read(app, name, text):
    if name == root_doc:
        text[0] = contents(text[0])


def setup(app):
    for name in ("proof", "proofs"):
        app.add_lexer(name, TextLexer)
    app.connect("source-read", read)
