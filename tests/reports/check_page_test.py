#!/usr/bin/python3
"""Breaks a good page in one way after another: the page check must say what is wrong.

check_page_test.py GOOD.html
"""

import pathlib
import sys
import tempfile

sys.path.insert(0, str(pathlib.Path(__file__).resolve().parents[2] / "tools"))
import check_page

# What to replace, by what, and what the check must say of it.
BROKEN = [
    ("<h1>", "<h1>other</h1><h1>", "there must be one h1"),
    ("<h3 ", "<h6 ", "a heading of level 6 follows"),
    ("</caption>", "</caption></table><table>", "a table lacks its caption or head"),
    ('<th scope="col"', "<th", "a head cell has no scope"),
    ("<main ", "<div ", "there is no <main>"),
    ("</main>", "<script></script></main>", "there is a script"),
    ("<main ", '<main onclick="f()" ', "a script in onclick"),
    ("</main>", '<img src="http://example.org/x.png"></main>', "<img> refers to http://example.org"),
    ("</style>", "a { background: url(x.png) }</style>", "the style sheet loads something"),
    ("</main>", '<nav aria-label="Sections of FaultDiagnostic"></nav></main>',
     "two landmarks <nav> have the name Sections of FaultDiagnostic"),
    ('id="run-1-2"', 'id="run-1-1"', "the id run-1-1 is there twice"),
    ('id="results"', "", "the id results is referred to and missing"),
    ('role="img" aria-labelledby', "aria-labelledby", "no name for screen readers"),
    ("<desc ", "<text ", "a figure lacks its caption, title or description"),
    ("</main>", "</section>", "closes nothing"),
    ("How this was made", "", 'the text "How this was made" is missing'),
    ("PASS", "NEVER", "the verdict is not at the start"),
]


def main():
    good = pathlib.Path(sys.argv[1]).read_text()
    missed = [f"good page: {problem}" for problem in check_page.problems_of(good, good, [])]
    for old, new, expected in BROKEN:
        bad = good.replace(old, new)
        found = check_page.problems_of(bad, bad, [])
        if not any(expected in problem for problem in found):
            missed.append(f"{old} -> {new}: expected \"{expected}\", found {found}")
    if not check_page.problems_of(good, good.replace("<h2 ", "<h3 "), []):
        missed.append("a page that the browser repaired was accepted")
    with tempfile.NamedTemporaryFile(suffix=".html", mode="w") as wide:
        wide.write(good.replace("</main>", '<p style="width: 30rem">too wide</p></main>'))
        wide.flush()
        if "too wide" not in check_page.cut_off(pathlib.Path(wide.name)):
            missed.append("a paragraph that is cut off was accepted")
    print("\n".join(missed) or f"{len(BROKEN) + 3} pages judged as they should be")
    return 1 if missed else 0


sys.exit(main())
