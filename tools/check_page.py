#!/usr/bin/python3
"""Opens HTML reports in headless Chromium and checks what matters to a reader, to a screen reader and on a
machine without a network. Prints the page and the problem; exit status 1 when there is one.

check_page.py [--screenshot FOLDER] [--must-contain TEXT]... PAGE.html...

With --screenshot each page is drawn into the folder: NAME.png, NAME.dark.png and NAME.narrow.png.
"""

import argparse
import html
import html.parser
import pathlib
import re
import subprocess
import sys
import tempfile

CHROMIUM = [
    "/usr/bin/chromium", "--headless", "--no-sandbox", "--disable-gpu", "--disable-quic",
    "--no-first-run", "--disable-background-networking", "--disable-component-update",
    "--disable-sync", "--hide-scrollbars",
]
NARROW = 400  # pixels: a telephone
VIEWS = {
    "": ["--window-size=1280,3400"],
    ".dark": ["--window-size=1280,3400", "--blink-settings=preferredColorScheme=0"],
    ".narrow": [f"--window-size={NARROW},3600"],
}
# Reads the page in a frame as wide as a telephone, and says what reaches beyond it.
NARROW_READER = """<iframe src="{uri}" width="{width}" height="900" style="border: 0"></iframe>
<pre id="found"></pre>
<script>
addEventListener("load", () => {{
  const page = document.querySelector("iframe").contentDocument;
  const cut = [...page.querySelectorAll("h1, h2, h3, p, dd, tbody th, tbody td, figure")]
      .filter(one => one.getBoundingClientRect().right > {width} && one.offsetParent);
  const wide = page.documentElement.scrollWidth > {width} ? ["the page"] : [];
  document.querySelector("#found").textContent =
      "read " + [...wide, ...cut.map(one => one.textContent.slice(0, 60))].join("|");
}});
</script>"""
LANDMARKS = ("header", "main", "footer")
VOID = {"meta", "br", "hr", "img", "input", "link"}


def browse(page, *flags):
    """What Chromium prints for the page; every call has a profile of its own."""
    with tempfile.TemporaryDirectory(prefix="zrlab-chromium-") as profile:
        command = [*CHROMIUM, f"--user-data-dir={profile}", *flags, page.resolve().as_uri()]
        done = subprocess.run(command, capture_output=True, timeout=120, check=False)
    if done.returncode != 0:
        raise RuntimeError(f"chromium ended with {done.returncode}")
    return done.stdout.decode()


def cut_off(page):
    """What does not fit on a narrow screen."""
    with tempfile.NamedTemporaryFile(suffix=".html", mode="w") as reader:
        reader.write(NARROW_READER.format(uri=page.resolve().as_uri(), width=NARROW))
        reader.flush()
        read = browse(pathlib.Path(reader.name), "--allow-file-access-from-files",
                      "--window-size=800,1000", "--virtual-time-budget=10000", "--dump-dom")
    found = re.search(r'<pre id="found">read (.*?)</pre>', read, re.DOTALL)
    if found is None:
        return ["nothing: the page could not be read"]
    return [html.unescape(one) for one in found[1].split("|") if one]


class Page(html.parser.HTMLParser):
    """Collects the structure of a page and the problems with it."""

    def __init__(self):
        super().__init__(convert_charrefs=True)
        self.problems = []
        self.open = []
        self.named = None  # the id of the element that was opened last
        self.headings = []
        self.ids = []
        self.referenced = []
        self.seen = set()
        self.text = []
        self.tables = []
        self.figures = []
        self.landmarks = []  # of each its element, and its name or the id of the element that names it
        self.names = {}  # texts of the elements that have an id

    def handle_starttag(self, tag, attributes):
        attributes = dict(attributes)
        self.seen.add(tag)
        if tag not in VOID:
            self.open.append(tag)
        if "id" in attributes:
            self.ids.append(attributes["id"])
            self.names[attributes["id"]] = ""
            self.named = attributes["id"]
        name = attributes.get("aria-label") or attributes.get("aria-labelledby")
        if tag == "nav" or tag == "section" and name or attributes.get("role") == "region":
            self.landmarks.append((tag, name))
        for name in ("aria-labelledby", "aria-describedby"):
            self.referenced += attributes.get(name, "").split()
        for name in ("src", "href", "xlink:href", "action", "data"):
            target = attributes.get(name, "")
            if target.startswith("#"):
                self.referenced.append(target[1:])
            elif target:
                self.problems.append(f"<{tag}> refers to {target}")
        for name in attributes:
            if name.startswith("on"):
                self.problems.append(f"<{tag}> has a script in {name}")
        if tag == "script":
            self.problems.append("there is a script")
        if re.fullmatch("h[1-6]", tag):
            self.headings.append(int(tag[1]))
        if tag == "table":
            self.tables.append(set())
        if tag == "th" and "scope" not in attributes:
            self.problems.append("a head cell has no scope")
        if tag in ("caption", "thead", "tbody") and self.tables:
            self.tables[-1].add(tag)
        if tag == "figure":
            self.figures.append(set())
        if tag in ("figcaption", "title", "desc") and self.figures:
            self.figures[-1].add(tag)
        if tag == "svg" and attributes.get("aria-hidden") != "true" and "svg" not in self.open[:-1]:
            if attributes.get("role") != "img" or "aria-labelledby" not in attributes:
                self.problems.append("a drawing has no name for screen readers")

    def handle_endtag(self, tag):
        if tag in VOID:
            return
        self.named = None
        if not self.open or self.open.pop() != tag:
            self.problems.append(f"</{tag}> closes nothing")

    def handle_data(self, data):
        if "style" in self.open:
            if re.search(r"@import|url\(", data):
                self.problems.append("the style sheet loads something")
        else:
            self.text.append(data)
            if self.named:
                self.names[self.named] += data


def problems_of(written, read, must_contain):
    """What is wrong with a page, given as it is written and as a browser read it."""
    source = Page()
    source.feed(written)
    found = source.problems
    if source.open:
        found.append(f"<{source.open[-1]}> is not closed")
    drawn = Page()
    drawn.feed(read)
    text = re.sub(r"\s+", " ", "".join(drawn.text))
    wanted = [*must_contain, "How this was made"]
    found += [f"the text \"{one}\" is missing" for one in wanted if one not in text]
    if not re.search(r"\b(PASS|FAIL|ERROR|INTERRUPTED|\d+ of \d+ faults? caught)\b", "".join(drawn.text[:40])):
        found.append("the verdict is not at the start")
    found += [f"there is no <{tag}>" for tag in LANDMARKS if tag not in drawn.seen]
    if drawn.headings.count(1) != 1 or drawn.headings[:1] != [1]:
        found.append("there must be one h1, before all other headings")
    for before, after in zip(drawn.headings, drawn.headings[1:]):
        if after > before + 1:
            found.append(f"a heading of level {after} follows one of level {before}")
    found += ["a table lacks its caption or head"
              for table in drawn.tables if table != {"caption", "thead", "tbody"}]
    found += ["a figure lacks its caption, title or description"
              for figure in drawn.figures if figure != {"figcaption", "title", "desc"}]
    landmarks = [(tag, drawn.names.get(name, name)) for tag, name in drawn.landmarks]
    found += [f"two landmarks <{tag}> have the name {name}"
              for tag, name in sorted(set(landmarks), key=str) if landmarks.count((tag, name)) > 1]
    twice = {one for one in drawn.ids if drawn.ids.count(one) > 1}
    found += [f"the id {one} is there twice" for one in sorted(twice)]
    found += [f"the id {one} is referred to and missing"
              for one in sorted(set(drawn.referenced) - set(drawn.ids))]
    # What the browser made of the page must be what is written: nothing was repaired.
    if source.headings != drawn.headings or len(source.tables) != len(drawn.tables):
        found.append("the browser read another structure than was written")
    return found


def main():
    arguments = argparse.ArgumentParser()
    arguments.add_argument("--screenshot", type=pathlib.Path)
    arguments.add_argument("--must-contain", action="append", default=[])
    arguments.add_argument("pages", nargs="+", type=pathlib.Path)
    given = arguments.parse_args()
    failed = False
    for page in given.pages:
        read = browse(page, "--dump-dom")
        for problem in problems_of(page.read_text(), read, given.must_contain):
            print(f"{page}: {problem}")
            failed = True
        for what in cut_off(page):
            print(f"{page}: cut off at a width of {NARROW}: {what}")
            failed = True
        if given.screenshot:
            given.screenshot.mkdir(parents=True, exist_ok=True)
            for view, flags in VIEWS.items():
                picture = given.screenshot / f"{page.stem}{view}.png"
                browse(page, f"--screenshot={picture.resolve()}", *flags)
                if not picture.is_file():
                    print(f"{page}: no screenshot {picture.name}")
                    failed = True
    print(f"{len(given.pages)} pages checked")
    return 1 if failed else 0


if __name__ == "__main__":
    sys.exit(main())
