#!/usr/bin/python3
"""window_test.py PROGRAMS EXAMPLES: opens the example window on a screen that nobody sees, and compares what it shows."""
import glob
import os
import subprocess
import sys

PROGRAMS, EXAMPLES = sys.argv[1:]
OUTSIDE = "the address stands at 25 to 52.84 mm across and 38.37 to 57.49 mm down, the window is 20 to 105 mm across and 45 to 90 mm down"
SHOWN = [
    ("nothing.pdf", "", "", "/nothing.pdf: there is no such file; check the name"),
    ("Invoice 17.pdf", "1", "Ms Ada Brook, 14 Mill Lane, HEBDEN BRIDGE, HX7 8AB", "can go out"),
    ("Invoice 18.pdf", "1", "Mr Owen Pryce, 3 Castle Street, CONWY, LL32 8AY", OUTSIDE),
    ("Invoice 19.pdf", "1", "nadia.rahman@example.org", "can go out"),
    ("Invoices March.pdf", "1", "Ms Ada Brook, 14 Mill Lane, HEBDEN BRIDGE, HX7 8AB", "can go out"),
]


def screen():
    """A screen of its own, and its name."""
    server = subprocess.Popen(["Xvfb", "-displayfd", "1", "-nolisten", "tcp"], stdout=subprocess.PIPE, text=True)
    return server, ":" + server.stdout.readline().strip()


def show():
    sys.dont_write_bytecode = True
    sys.path.insert(0, os.path.join(EXAMPLES, "window"))
    import letters

    root = letters.tkinter.Tk()
    window = letters.Window(root, ["--settings", EXAMPLES + "/office/settings.json"])
    shown = []

    def end(_):
        shown.extend(window.table.item(row, "values") for row in window.table.get_children())
        root.destroy()

    root.bind("<<Read>>", end)
    root.after_idle(window.show, ["/nothing.pdf"] + sorted(glob.glob(EXAMPLES + "/office/*.pdf")))
    root.mainloop()
    return shown


def main():
    os.environ["PATH"] = PROGRAMS + ":" + os.environ["PATH"]
    try:
        import tkinter  # noqa: F401

        server, os.environ["DISPLAY"] = screen()
    except (ImportError, FileNotFoundError) as missing:
        print("no window can be shown here: %s; scripts/setup tests installs what it takes" % missing)
        return 77
    try:
        shown = show()
    finally:
        server.terminate()
        server.wait()
    if shown != SHOWN:
        print("shown:", *shown, "expected:", *SHOWN, sep="\n")
    return int(shown != SHOWN)


sys.exit(main())
