#!/usr/bin/env python3
"""scripts/check_links.py FILE_OR_FOLDER...

Prints each link in the Markdown and HTML files that leads to no file, or to no heading or anchor of it. Links with a
scheme (https:) are not followed. Fails if there is one, or if there is nothing to read."""
import html.parser
import pathlib
import re
import sys
import urllib.parse


class Page(html.parser.HTMLParser):
    """The links and the anchors of an HTML page."""

    def __init__(self, text):
        super().__init__()
        self.links, self.anchors = [], set()
        self.feed(text)

    def handle_starttag(self, tag, attributes):
        for name, value in attributes:
            if name in ("id", "name"):
                self.anchors.add(value)
            elif name in ("href", "src", "data") and value:
                self.links.append(value)


def read(path, pages={}):
    """The links and the anchors of a file."""
    if path not in pages:
        text = path.read_text(errors="replace")
        if path.suffix == ".md":
            text = re.sub(r"^```.*?^```|`[^`\n]*`", "", text, flags=re.M | re.S)
            headings = [re.sub(r"[^\w\- ]", "", h).strip().lower().replace(" ", "-")
                        for h in re.findall(r"^#+ +(.*)$", text, re.M)]
            pages[path] = re.findall(r"\]\(([^)\s]+)\)", text), set(headings)
        elif path.suffix == ".html":
            page = Page(text)
            pages[path] = page.links, page.anchors
        else:
            pages[path] = [], None  # no anchors are looked for
    return pages[path]


# Doxygen links these lists also where it shows none of their entries, and makes none then: nested classes that are private,
# macros without a comment.
IGNORED = "#nested-classes", "#define-members"


def dead_links(path):
    for link in read(path)[0]:
        if link in IGNORED and path.suffix == ".html":
            continue
        parts = urllib.parse.urlsplit(link)
        if parts.scheme or parts.netloc:
            continue
        target = path.parent / urllib.parse.unquote(parts.path) if parts.path else path
        if not target.exists():
            yield link
        elif parts.fragment and target.is_file():
            anchors = read(target)[1]
            if anchors is not None and urllib.parse.unquote(parts.fragment) not in anchors:
                yield link


def main():
    if len(sys.argv) < 2 or sys.argv[1] in ("-h", "--help"):
        print(__doc__)
        return 0 if len(sys.argv) > 1 else 2
    paths = [path for argument in map(pathlib.Path, sys.argv[1:])
             for path in ([argument] if argument.is_file() else sorted(argument.rglob("*")))
             if path.suffix in (".md", ".html")]
    findings = [f"{path}: {link}" for path in paths for link in sorted(set(dead_links(path)))]
    print(*findings, sep="\n", end="\n" if findings else "")
    return 1 if findings or not paths else 0


sys.exit(main())
