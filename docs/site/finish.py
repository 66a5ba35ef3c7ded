"""Makes one site of the guides and the reference: the search finds the classes too, and every link
leads somewhere. Usage: finish.py SITE TAGFILE"""

import html.parser
import json
import pathlib
import sys
import urllib.parse
import xml.etree.ElementTree

# What makes a browser load something, and what a reader may follow.
LOADED = {"img": "src", "script": "src", "link": "href", "iframe": "src", "source": "src"}


class Page(html.parser.HTMLParser):
    """What a page names, and what it loads or leads to."""

    def __init__(self, path):
        super().__init__()
        self.names = set()
        self.loaded = []
        self.followed = []
        self.feed(path.read_text("utf-8"))

    def handle_starttag(self, tag, attrs):
        values = dict(attrs)
        self.names.update(values[key] for key in ("id", "name") if values.get(key))
        if values.get(LOADED.get(tag)) and values.get("rel") != "canonical":
            self.loaded.append(values[LOADED[tag]])
        if tag == "a" and values.get("href"):
            self.followed.append(values["href"])


def dead_links(site):
    pages = {path: Page(path) for path in sorted(site.rglob("*.html"))}
    for path, page in pages.items():
        for link in {*page.loaded, *page.followed}:
            parts = urllib.parse.urlsplit(link)
            if parts.scheme or parts.netloc:
                if link in page.loaded and parts.netloc:
                    yield f"{path}: loads {link} from elsewhere"
                continue
            target = path.parent / urllib.parse.unquote(parts.path) if parts.path else path
            fragment = urllib.parse.unquote(parts.fragment)
            target = pathlib.Path(target).resolve()
            if not target.is_file():
                yield f"{path}: {link} leads nowhere"
            elif fragment and target in pages and fragment not in pages[target].names:
                yield f"{path}: {link} has no such place"


def classes(tagfile):
    """Of the reference, as the search keeps pages."""
    for compound in xml.etree.ElementTree.parse(tagfile).getroot().iter("compound"):
        if compound.get("kind") not in ("class", "struct", "namespace"):
            continue
        members = sorted({member.findtext("name") for member in compound.iter("member")})
        yield {"location": f"reference/{compound.findtext('filename')}",
               "title": compound.findtext("name"), "text": " ".join(members)}


def extend_search(site, tagfile):
    path = site / "search" / "search_index.json"
    index = json.loads(path.read_text("utf-8"))
    index["docs"] += classes(tagfile)
    text = json.dumps(index)
    path.write_text(text, "utf-8")
    # For pages that are read as files.
    (site / "search" / "search_index.js").write_text(
        f"var __search = {{index: Promise.resolve({text})}};\n", "utf-8")


def main():
    site, tagfile = (pathlib.Path(argument).resolve() for argument in sys.argv[1:])
    (site / "404.html").unlink(missing_ok=True)  # it knows one address only, that of the root
    extend_search(site, tagfile)
    dead = list(dead_links(site))
    print("\n".join(dead))
    return 1 if dead else 0


if __name__ == "__main__":
    sys.exit(main())
