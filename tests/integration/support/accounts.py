"""The accounts of the private root, and what all of them may read."""

import stat

from conftest import ROOT


def account(name):
    """An account of the private root: its user and group id."""
    for line in (ROOT / "etc" / "passwd").read_text().splitlines():
        fields = line.split(":")
        if fields[0] == name:
            return int(fields[2]), int(fields[3])
    raise KeyError(name)


def reachable(path):
    """Whether everybody may look up and read a file."""
    folders = all(folder.stat().st_mode & stat.S_IXOTH for folder in path.parents)
    return folders and bool(path.stat().st_mode & stat.S_IROTH)
