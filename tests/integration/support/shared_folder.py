"""A folder that links share."""

import os
import shutil

import pytest

from accounts import account


@pytest.fixture
def folder(root):
    """A folder of alice's with a file, beside one that is not shared."""
    home = root / "home" / "alice"
    made = []
    for path, text in (("shared/a.txt", "shared"), ("shared/deep/b.txt", "deep"),
                       ("shared-not/c.txt", "secret"), ("d.txt", "secret")):
        file = home / path
        file.parent.mkdir(parents=True, exist_ok=True)
        file.write_text(text)
        made.append(home / path.split("/")[0])
    (home / "shared" / "out").symlink_to(home / "d.txt")
    for path in (path for name in made for path in [name, *name.rglob("*")]):
        os.chown(path, *account("alice"), follow_symlinks=False)
    yield "/own/shared"
    for path in set(made):
        if path.is_dir():
            shutil.rmtree(path)
        else:
            path.unlink()
