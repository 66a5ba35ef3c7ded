"""A table of documents that do not come out the same twice, because they are encrypted or signed
with random numbers: each is kept for as long as what it is made from does not change."""

import hashlib
import json


class KeptDocuments:
    def __init__(self, folder, member):
        self._folder = folder
        self._member = member
        self._file = folder / "expected.json"
        old = json.loads(self._file.read_text("utf-8")) if self._file.exists() else {}
        self._recipes = {row["file"]: row["recipe"] for row in old.get(member, [])}
        self._rows = []

    def add(self, file, recipe, make, **row):
        """`recipe` is a text of all that decides what `make` returns."""
        recipe = hashlib.sha256(recipe.encode("utf-8", "surrogateescape")).hexdigest()[:16]
        path = self._folder / file
        if self._recipes.get(file) != recipe or not path.exists():
            path.parent.mkdir(exist_ok=True)
            path.write_bytes(make().encode())
        self._rows.append({"file": file, **row, "recipe": recipe})
        return path.read_bytes().decode()

    def set_last(self, **more):
        """Adds to the latest row what could only be read from its document."""
        self._rows[-1].update(more)

    def finish(self, **more):
        files = [row["file"] for row in self._rows]
        if len(files) != len(set(files)):
            raise ValueError("two documents have the same name")
        for path in [*self._folder.glob("accepted/*.xml"), *self._folder.glob("refused/*.xml")]:
            if path.relative_to(self._folder).as_posix() not in files:
                path.unlink()
        self._file.write_text(json.dumps({**more, self._member: self._rows}, indent=1) + "\n")
        refused = sum("refusal" in row for row in self._rows)
        print(f"{len(files) - refused} accepted, {refused} refused")
