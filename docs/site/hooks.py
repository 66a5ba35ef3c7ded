"""Which files of the tree are pages of the site, and how they are reached."""

import pathlib
import re

from mkdocs.exceptions import ConfigurationError
from mkdocs.structure.files import File
from mkdocs.structure.nav import Link

ROOT = pathlib.Path(__file__).resolve().parents[2]
DECISIONS = "Decisions"


def name(path):
    return path.relative_to(ROOT).as_posix()


def documents():
    return [*ROOT.glob("*.md"), *(ROOT / "docs").glob("*.md"), *decisions()]


def decisions():
    return sorted((ROOT / "docs" / "decisions").glob("*.md"))


def linked(document):
    """The files that a document leads to, pictures and sources among them."""
    for target in re.findall(r"\]\(([^)#:]+)(?:#[^)]*)?\)", document.read_text("utf-8")):
        path = (document.parent / target).resolve()
        if path.is_file():
            yield path


def on_config(config):
    for entry in config["nav"]:
        if DECISIONS in entry:
            entry[DECISIONS] = [name(path) for path in decisions()]
    return config


def on_files(files, config):
    """Every document lies where it lies in the tree, so that the links between them hold."""
    paths = {path for document in documents() for path in (document, *linked(document))}
    for path in sorted(paths):
        files.append(File(name(path), str(ROOT), config["site_dir"], config["use_directory_urls"]))
    return files


def on_nav(nav, **_):
    """Every document has its place; the reference is not a page of this program's."""
    lost = set(map(name, documents())) - {page.file.src_path for page in nav.pages}
    if lost:
        raise ConfigurationError(f"mkdocs.yml has no place for {', '.join(sorted(lost))}")
    nav.items.insert(2, Link("Reference of the headers", "reference/index.html"))
    return nav
