#!/usr/bin/env python3
"""Compares a program of the guide with the page that shows it.

A page names what it shows in a comment line above a code block: `<!-- shows NAME.cpp -->` for a whole
file below docs/guide/programs, `<!-- output NAME -->` for what the program prints.

Usage: check.py [--update] NAME.cpp [PROGRAM [ARGUMENT ...]]
"""

import pathlib
import re
import subprocess
import sys

ROOT = pathlib.Path(__file__).resolve().parents[2]
PAGES = [ROOT / "README.md", *sorted((ROOT / "docs" / "guide").glob("*.md"))]


def find_page(marker):
    pages = [page for page in PAGES if f"<!-- {marker} -->" in page.read_text()]
    if len(pages) != 1:
        sys.exit(f"{len(pages)} pages hold <!-- {marker} -->, and one has to")
    return pages[0]


def compare(marker, expected, update):
    page = find_page(marker)
    text = page.read_text()
    block = re.compile(rf"(<!-- {re.escape(marker)} -->\n+```\w*\n)(.*?)(^```$)", re.S | re.M)
    match = block.search(text)
    if match is None:
        sys.exit(f"{page}: no code block below <!-- {marker} -->")
    if match.group(2) == expected:
        return
    if not update:
        sys.exit(f"{page}: the block below <!-- {marker} --> differs. Expected:\n{expected}")
    page.write_text(text[: match.start(2)] + expected + text[match.end(2):])


def main():
    arguments = sys.argv[1:]
    update = "--update" in arguments
    if update:
        arguments.remove("--update")
    name, *command = arguments
    source = ROOT / "docs" / "guide" / "programs" / name
    compare(f"shows {name}", source.read_text(), update)
    if command:
        run = subprocess.run(command, stdout=subprocess.PIPE, text=True)
        if run.returncode != 0:
            sys.exit(f"{command[0]} ended with {run.returncode}")
        compare(f"output {source.stem}", run.stdout, update)


main()
