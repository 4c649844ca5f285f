"""The project's own files, as the lints see them."""

import re
import subprocess
from pathlib import Path

SOURCE = Path(__file__).resolve().parents[2]
GENERATED = {"build", ".git", "__pycache__"}


def files(*patterns):
    """All files of the project that match a pattern, built ones left out."""
    found = []
    for pattern in patterns:
        for path in sorted(SOURCE.rglob(pattern)):
            relative = path.relative_to(SOURCE)
            if path.is_file() and not GENERATED & set(relative.parts):
                found.append(path)
    return found


def name(path):
    return str(path.relative_to(SOURCE))


def cpp_files():
    return files("*.cpp", "*.h")


def scripts():
    """Shell scripts, by their first line."""
    shebang = re.compile(rb"^#!/bin/(ba)?sh|^# shellcheck shell=")
    return [path for path in files("*") if shebang.match(path.read_bytes()[:40])]


def includes(path):
    """The project's own headers that a file names, as (line number, path as written)."""
    pattern = re.compile(r'^\s*#\s*include\s+["<]([^">]+)[">]')
    found = []
    for number, line in enumerate(path.read_text().splitlines(), 1):
        match = pattern.match(line)
        if match:
            found.append((number, match.group(1)))
    return found


def run(*command, **options):
    return subprocess.run(command, capture_output=True, text=True, check=False, **options)
