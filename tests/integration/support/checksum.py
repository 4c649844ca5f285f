"""A directory of alice's to take checksums of."""

import os
import shutil

import pytest

from conftest import ROOT


@pytest.fixture
def home(root):
    """A directory that belongs to alice, on her home."""
    directory = root / "home" / "alice" / "checksum"
    shutil.rmtree(directory, ignore_errors=True)
    directory.mkdir()
    give_to_alice(directory)
    yield directory
    shutil.rmtree(directory, ignore_errors=True)


def give_to_alice(path):
    owner = (ROOT / "home" / "alice").stat()
    os.chown(path, owner.st_uid, owner.st_gid, follow_symlinks=False)


def put(path, content, mode=0o644):
    path.parent.mkdir(parents=True, exist_ok=True)
    path.write_bytes(content)
    give_to_alice(path.parent)
    give_to_alice(path)
    path.chmod(mode)
    return path
