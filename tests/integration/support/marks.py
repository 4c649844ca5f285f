"""A file in which late work leaves its mark."""

import os
import time

import pytest


def wait_for(condition, seconds):
    deadline = time.monotonic() + seconds
    while time.monotonic() < deadline:
        if condition():
            return True
        time.sleep(0.05)
    return False


@pytest.fixture
def mark(tmp_path_factory):
    """A file that the account "system" can write, too."""
    directory = tmp_path_factory.mktemp("mark")
    for folder in (directory, *directory.parents[:2]):
        if os.stat(folder).st_uid == os.geteuid() and str(folder) != "/tmp":
            folder.chmod(0o711)
    file = directory / "mark"
    file.touch()
    file.chmod(0o666)
    return file
