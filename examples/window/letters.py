#!/usr/bin/python3
"""letters.py [FILE...]: a window in which documents are opened, and that says of each letter whether it can go out.

The skeleton of a graphical client: vlmail reads, in a process of its own, and its JSON is all that is known here. A thread waits
for what it says; the window is touched by its own thread alone.
"""
import json
import queue
import subprocess
import sys
import threading
import tkinter
from tkinter import filedialog, ttk

COLUMNS = {"document": 220, "letter": 60, "recipient": 320, "state": 320}


def rows_of(line):
    """What the window shows of a document, out of its line of JSON."""
    document = json.loads(line)
    if "error" in document:
        return [(document["document"], "", "", document["error"])]
    return [row_of(document["document"], number, letter) for number, letter in enumerate(document["letters"] or [], 1)]


def row_of(name, number, letter):
    values = {field["name"]: field["value"] for field in letter["fields"]}
    address = str(values.get(letter["primary_address"], "")).replace("\n", ", ")
    return (name, number, address, hindrance(letter) or "can go out")


def hindrance(letter):
    """What keeps a letter from going out, None when nothing does."""
    if not letter["production_ready"]:
        return letter["message"] or "has no address"
    if "not_separated" in letter:
        return "may be several letters"
    errors = [finding["says"] for finding in letter.get("findings", []) if finding["severity"] == "error"]
    return errors[0] if errors else None


def read(files, rows, options=()):
    """Puts the rows of each document, and None behind the last one."""
    command = ["vlmail", "letter", "--json", *options, *files]
    with subprocess.Popen(command, stdout=subprocess.PIPE, text=True) as process:
        for line in process.stdout:
            rows.put(rows_of(line))
    rows.put(None)


class Window:
    def __init__(self, root, options=()):
        self.root, self.options, self.rows = root, options, queue.Queue()
        root.title("Letters")
        self.open = ttk.Button(root, text="Open...", command=self.choose)
        self.open.pack(anchor="w", padx=8, pady=8)
        self.table = ttk.Treeview(root, columns=list(COLUMNS), show="headings")
        for column, width in COLUMNS.items():
            self.table.heading(column, text=column.capitalize(), anchor="w")
            self.table.column(column, width=width)
        self.table.pack(fill="both", expand=True)

    def choose(self):
        if files := filedialog.askopenfilenames(filetypes=[("Documents", "*.pdf *.txt")]):
            self.show(files)

    def show(self, files):
        self.open["state"] = "disabled"
        threading.Thread(target=read, args=(files, self.rows, self.options), daemon=True).start()
        self.take()

    def take(self):
        """Takes over what has been read so far, and looks again as long as there is more to come."""
        while not self.rows.empty():
            rows = self.rows.get()
            if rows is None:
                self.open["state"] = "normal"
                return self.root.event_generate("<<Read>>")
            for row in rows:
                self.table.insert("", "end", values=row)
        self.root.after(50, self.take)


if __name__ == "__main__":
    window = Window(tkinter.Tk())
    if sys.argv[1:]:
        window.root.after_idle(window.show, sys.argv[1:])
    window.root.mainloop()
